#pragma once
// Private: the 64-bit file operations that differ between run-times.

#include <cstdint>
#include <cstdio>

namespace tarn::file_stream_impl {

// Each returns false on failure.
[[nodiscard]] bool Seek(std::FILE* file, std::int64_t position) noexcept;
// The file's length (after flushing the run-time buffer), or -1.
[[nodiscard]] std::int64_t Length(std::FILE* file) noexcept;
[[nodiscard]] bool SetLength(std::FILE* file, std::int64_t length) noexcept;

}  // namespace tarn::file_stream_impl
