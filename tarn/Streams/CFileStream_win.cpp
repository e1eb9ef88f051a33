#include <io.h>

#include "tarn/Streams/CFileStreamImpl.h"

namespace tarn::file_stream_impl {

bool Seek(std::FILE* file, std::int64_t position) noexcept {
  return _fseeki64(file, position, SEEK_SET) == 0;
}

std::int64_t Length(std::FILE* file) noexcept {
  if (std::fflush(file) != 0) return -1;
  return _filelengthi64(_fileno(file));
}

bool SetLength(std::FILE* file, std::int64_t length) noexcept {
  return std::fflush(file) == 0 && _chsize_s(_fileno(file), length) == 0;
}

}  // namespace tarn::file_stream_impl
