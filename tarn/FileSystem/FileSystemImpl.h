// Private: the platform primitives under FileSpecification, File and FileDate.
// Implemented once per platform (FileSystem_posix.cpp, FileSystem_win.cpp);
// each turns its system errors into TarnErrors here and nowhere else.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>

#include "tarn/String/UString.h"

namespace tarn {
class FileDate;
}

namespace tarn::fsimpl {

enum class PathKind { kNone, kFile, kFolder, kOther };

// Path syntax.
[[nodiscard]] bool IsSeparator(unsigned short unit) noexcept;
[[nodiscard]] unsigned short PreferredSeparator() noexcept;
// Length of the root prefix ("/", "C:\", "\\server\share\"); 0 if relative.
[[nodiscard]] std::size_t RootLength(const UString& path) noexcept;

// Queries; never throw.
[[nodiscard]] PathKind GetPathKind(const UString& path) noexcept;

// Operations; each throws the system's error as a TarnError.
void CreateNewFile(const UString& path);  // fails if anything exists there
[[nodiscard]] std::FILE* OpenFile(const UString& path, const char* mode);
[[nodiscard]] std::int64_t GetFileSize(const UString& path);
void RenameNoReplace(const UString& from, const UString& to);
void RenameReplacing(const UString& from, const UString& to);
void DeleteFile(const UString& path);
[[nodiscard]] FileDate GetModificationDate(const UString& path);
void SetModificationDate(const UString& path, const FileDate& date);
[[nodiscard]] FileDate Now();

}  // namespace tarn::fsimpl
