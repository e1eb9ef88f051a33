// A file's modification date: seconds and nanoseconds since 1970-01-01 UTC.
//
// Read and set through `FileDate::Get` / `FileDate::Set` on a FileSpecification.
// The file systems keep dates at their own resolution (100 ns on Windows), so
// a date read back after Set may be rounded down to that resolution.
#pragma once

#include <compare>
#include <cstdint>

namespace tarn {

class FileSpecification;

class FileDate {
 public:
  constexpr FileDate() noexcept = default;
  constexpr FileDate(std::int64_t seconds, std::uint32_t nanoseconds) noexcept
      : fSeconds(seconds), fNanoseconds(nanoseconds) {}

  [[nodiscard]] constexpr std::int64_t GetSeconds() const noexcept { return fSeconds; }
  [[nodiscard]] constexpr std::uint32_t GetNanoseconds() const noexcept { return fNanoseconds; }
  [[nodiscard]] constexpr auto operator<=>(const FileDate&) const noexcept = default;

  // The modification date of the object at `spec`; throws a TarnError with
  // the system's error if it cannot be read (e.g. nothing exists there).
  [[nodiscard]] static FileDate Get(const FileSpecification& spec);
  // Sets the modification date of the object at `spec`; throws likewise.
  static void Set(const FileSpecification& spec, const FileDate& date);
  // The current time, as a FileDate.
  [[nodiscard]] static FileDate Now();

 private:
  std::int64_t fSeconds = 0;
  std::uint32_t fNanoseconds = 0;  // 0..999,999,999
};

}  // namespace tarn
