// Private: the platform primitives under FileSpecification, File and FileDate.
// Implemented once per platform (FileSystem_posix.cpp, FileSystem_win.cpp);
// each turns its system errors into TarnErrors here and nowhere else.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>

#include "tarn/Errors/TarnError.h"
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
// Whether a file (or a file's stream) can be opened at the path.
[[nodiscard]] bool IsExistingFile(const UString& path) noexcept;

// The resource fork of the file at a path is at the path plus this suffix:
// an alternate data stream on Windows (which travels with its file), a file of
// its own on POSIX and on file systems without streams (which File carries
// along when it renames or deletes).
inline constexpr char kResourceForkSuffix[] = ":AFP_Resource";

// Throws `error` with the path, or the two paths on two lines, attached.
[[noreturn]] void ThrowWithPaths(TarnError error, const UString& path,
                                 const UString* path2 = nullptr);

// Operations; each throws the system's error as a TarnError (kind "Windows"
// or "POSIX"), with the path as attachment.
void CreateNewFile(const UString& path);  // fails if anything exists there
// With throwOnFailure false a failure returns null instead.
[[nodiscard]] std::FILE* OpenFile(const UString& path, const char* mode, bool throwOnFailure);
// With missingIsZero a missing file has size 0 instead of failing.
[[nodiscard]] std::int64_t FileSizeOf(const UString& path, bool missingIsZero);
void RenameNoReplace(const UString& from, const UString& to);  // fails if `to` exists
void RenameReplacing(const UString& from, const UString& to);
void RemoveFile(const UString& path);
[[nodiscard]] FileDate GetModificationDate(const UString& path);
void SetModificationDate(const UString& path, const FileDate& date);

}  // namespace tarn::fsimpl
