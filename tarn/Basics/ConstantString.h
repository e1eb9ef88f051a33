// ConstantString<N>: a fixed-size, NUL-terminated character array held by
// value. It never allocates and never overflows: every assignment copies at
// most N - 1 characters and terminates the copy, cutting longer input. Used
// for the short texts of an error value, which must be copyable without any
// chance of failure.
#pragma once

#include <cstddef>
#include <cstring>
#include <string>
#include <string_view>

namespace tarn {

template <std::size_t N>
class ConstantString {
  static_assert(N > 0, "ConstantString needs room for the terminator");

 public:
  static constexpr std::size_t kCapacity = N - 1;  // characters, excluding the NUL

  constexpr ConstantString() noexcept : text_{} {}
  ConstantString(const char* text) noexcept { assign(text); }  // NOLINT: implicit on purpose
  explicit ConstantString(std::string_view text) noexcept { assign(text); }
  ConstantString(const ConstantString&) noexcept = default;
  ConstantString& operator=(const ConstantString&) noexcept = default;
  ~ConstantString() = default;

  // Copies at most kCapacity characters of text (nullptr is the empty text).
  void assign(const char* text) noexcept {
    assign(text ? std::string_view(text) : std::string_view());
  }
  void assign(std::string_view text) noexcept {
    std::size_t n = text.size() < kCapacity ? text.size() : kCapacity;
    if (n) std::memcpy(text_, text.data(), n);
    std::memset(text_ + n, 0, N - n);
  }
  ConstantString& operator=(const char* text) noexcept {
    assign(text);
    return *this;
  }

  [[nodiscard]] const char* c_str() const noexcept { return text_; }
  [[nodiscard]] std::size_t length() const noexcept { return std::strlen(text_); }
  [[nodiscard]] bool empty() const noexcept { return text_[0] == 0; }
  [[nodiscard]] std::string_view view() const noexcept { return std::string_view(text_); }
  [[nodiscard]] std::string str() const { return std::string(text_); }

  friend bool operator==(const ConstantString& a, const ConstantString& b) noexcept {
    return a.view() == b.view();
  }
  friend bool operator==(const ConstantString& a, const char* b) noexcept {
    return a.view() == (b ? std::string_view(b) : std::string_view());
  }

 private:
  char text_[N];  // always NUL-terminated; bytes after the terminator are 0
};

}  // namespace tarn
