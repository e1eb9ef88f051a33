// A file on disk, named by a FileSpecification.
//
// `File` is a small value: it holds the FileSpecification and does I/O only when
// asked. Every failing operation throws a `TarnError` carrying the system's
// error: kind "Windows" with the Windows error code on Windows, kind "POSIX"
// with errno on POSIX. Paths with characters outside the system code page
// work on both platforms (UTF-16 on Windows, UTF-8 bytes on POSIX).
//
// The type of a file is what its extension says (see FileTypes.h); type and
// creator arguments are accepted for portability and not stored.
//
// The resource fork lives beside the data: in the alternate data stream
// ":AFP_Resource" on Windows, in the file named full path + ":AFP_Resource" on
// POSIX (which Rename, MoveTo and Delete carry along with the file).
//
//   File f = File::CreateOnDisk(spec, "WAVE", 0, kAdjustName);  // new file
//   FILE* fp = f.Open("r+b");
//   ...
//   File::CloseFork(fp);
#pragma once

#include <cstdint>
#include <cstdio>

#include "tarn/FileSystem/FileDate.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/FileSystem/FileTypes.h"

namespace tarn {

enum AdjustName : int {
  kDontAdjustName = 0,  // fail if the name is taken
  kAdjustName = 1,      // first make the name unique (MakeUnique, any kind)
};

enum Permission : int {
  kReadPermission = 1,       // "rb"
  kWritePermission = 2,      // "r+b", created if missing; never truncates
  kReadWritePermission = 3,  // as kWritePermission
};

class File {
 public:
  File() = default;
  explicit File(const FileSpecification& spec) : fSpec(spec) {}
  File(const File&) = default;
  File(File&&) noexcept = default;
  File& operator=(const File&) = default;
  File& operator=(File&&) noexcept = default;
  ~File() = default;

  // Creates a new, empty file (fails if anything exists at the final name).
  // With kAdjustName the name is first made unique; the returned File names
  // the file actually created.
  static File CreateOnDisk(const FileSpecification& spec, FileTypeClass type, FileTypeClass creator,
                           AdjustName adjust = kDontAdjustName);
  // As CreateOnDisk, and creates an empty resource fork.
  static File CreateResFileOnDisk(const FileSpecification& spec, FileTypeClass type,
                                  FileTypeClass creator, AdjustName adjust = kDontAdjustName);
  // The file at `spec`, created empty if nothing exists there; fails if a
  // folder is there.
  static File DemandOnDisk(const FileSpecification& spec, FileTypeClass type,
                           FileTypeClass creator);

  [[nodiscard]] const FileSpecification& GetSpecification() const noexcept { return fSpec; }

  [[nodiscard]] FileTypeClass GetType() const;  // from the name's extension
  [[nodiscard]] FileTypeClass GetCreator() const noexcept { return 0; }
  void SetType(FileTypeClass) noexcept {}
  void SetCreator(FileTypeClass) noexcept {}

  // Sizes in bytes; the resource size is 0 when there is no resource fork.
  [[nodiscard]] std::int64_t GetFileDataSize() const;
  [[nodiscard]] std::int64_t GetFileResourceSize() const;
  [[nodiscard]] std::int64_t GetFileTotalSize() const;
  // Whether the file exists and can be opened for writing (opens and closes it).
  [[nodiscard]] bool CanWriteToFile() const;

  // Opens the data with a C stdio mode ("rb", "wb", "r+b", "w+b", "ab", ...).
  // Never returns null: failure throws. Close with CloseFork (or fclose).
  [[nodiscard]] std::FILE* Open(const char* mode) const;
  [[nodiscard]] std::FILE* OpenDataFork(Permission permission) const;
  [[nodiscard]] std::FILE* OpenResourceFork(Permission permission) const;
  static void CloseFork(std::FILE* fork) noexcept;
  // Creates an empty resource fork if there is none.
  void CreateResourceFork() const;

  // Replaces this file by `source` (which is moved here and ceases to exist
  // under its old name): the last step of saving through a temporary file.
  void ReplaceContents(const File& source);

  // Renames the file within its folder; fails if the new name is taken.
  void Rename(const UString& newName);
  // Moves the file into `folder` under `name`; fails if that name is taken.
  void MoveTo(const FileSpecification& folder, const UString& name);
  // Deletes the file (and its resource fork).
  void Delete();

  [[nodiscard]] FileDate GetModificationDate() const { return FileDate::Get(fSpec); }
  void SetModificationDate(const FileDate& date) const { FileDate::Set(fSpec, date); }

  // The path of the resource fork of the file at `path`.
  [[nodiscard]] static UString ResourceForkPath(const UString& path);

 private:
  FileSpecification fSpec;
};

}  // namespace tarn
