#pragma once
// Relocatable memory blocks ("handles").
//
// A handle is a pointer to a master pointer: `*h` is the block's current
// address and may change when the block is resized, while `h` itself stays
// valid until `DisposeHandle`. Blocks are zero-filled when created and when
// they grow. Sizes are byte counts. Allocation failure throws the out-of-memory
// `TarnError` (-108) and leaves an existing block unchanged. A handle is owned
// by one thread at a time.
//
//   auto_handle<char> h(NewHandle(16));
//   SetHandleSize(h.get(), 64);   // *h.get() may have moved
//   std::memcpy(*h.get(), src, 64);

#include <cstddef>
#include <utility>

namespace tarn {

using Handle = char**;

// A new block of `size` zero bytes.
[[nodiscard]] Handle NewHandle(std::size_t size);
// Resizes the block, keeping its first min(old, new) bytes; new bytes are 0.
void SetHandleSize(Handle h, std::size_t size);
// The block's size in bytes; 0 for a null handle.
[[nodiscard]] std::size_t GetHandleSize(Handle h) noexcept;
// Releases the block and its master pointer; a null handle is ignored.
void DisposeHandle(Handle h) noexcept;

// Sole owner of one handle, released on destruction. Movable, not copyable.
// `T` is the element type the caller sees through the handle.
template <class T>
class auto_handle {
 public:
  auto_handle() noexcept = default;
  explicit auto_handle(T** h) noexcept : h_(h) {}
  auto_handle(const auto_handle&) = delete;
  auto_handle& operator=(const auto_handle&) = delete;
  auto_handle(auto_handle&& other) noexcept : h_(other.release()) {}
  auto_handle& operator=(auto_handle&& other) noexcept {
    if (this != &other) reset(other.release());
    return *this;
  }
  ~auto_handle() { reset(); }

  [[nodiscard]] T** get() const noexcept { return h_; }
  // The block's current address (null for an empty owner).
  [[nodiscard]] T* data() const noexcept { return h_ ? *h_ : nullptr; }
  [[nodiscard]] std::size_t size() const noexcept {
    return GetHandleSize(reinterpret_cast<Handle>(h_));
  }
  explicit operator bool() const noexcept { return h_ != nullptr; }

  // Gives up ownership without releasing the block.
  [[nodiscard]] T** release() noexcept { return std::exchange(h_, nullptr); }
  void reset(T** h = nullptr) noexcept {
    T** old = std::exchange(h_, h);
    if (old && old != h) DisposeHandle(reinterpret_cast<Handle>(old));
  }

 private:
  T** h_ = nullptr;
};

}  // namespace tarn
