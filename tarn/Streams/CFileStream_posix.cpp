#include <sys/stat.h>
#include <unistd.h>

#include "tarn/Streams/CFileStreamImpl.h"

namespace tarn::file_stream_impl {

static_assert(sizeof(off_t) == 8, "64-bit file offsets are required");

bool Seek(std::FILE* file, std::int64_t position) noexcept {
  return fseeko(file, static_cast<off_t>(position), SEEK_SET) == 0;
}

std::int64_t Length(std::FILE* file) noexcept {
  struct stat info {};
  if (std::fflush(file) != 0 || fstat(fileno(file), &info) != 0) return -1;
  return info.st_size;
}

bool SetLength(std::FILE* file, std::int64_t length) noexcept {
  return std::fflush(file) == 0 && ftruncate(fileno(file), static_cast<off_t>(length)) == 0;
}

}  // namespace tarn::file_stream_impl
