#include "tarn/FileSystem/File.h"

#include <chrono>

#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/FileSystemImpl.h"

namespace tarn {

namespace {

// The code of a folder found where a file was demanded.
constexpr short kNotAFileErr = -1302;

// Where the resource fork is a stream of the file it moves with the file;
// where it is a file of its own it is moved here. `hadFork` tells whether
// `from` had a fork before the file moved.
void CarryResourceFork(const UString& from, const UString& to, bool hadFork) {
  const UString fromFork = File::ResourceForkPath(from);
  const UString toFork = File::ResourceForkPath(to);
  if (fsimpl::IsExistingFile(fromFork)) {
    fsimpl::RenameReplacing(fromFork, toFork);
  } else if (!hadFork && fsimpl::IsExistingFile(toFork)) {
    fsimpl::RemoveFile(toFork);  // a stale fork of a replaced file
  }
}

// Renames a file and its resource fork.
void RenameWithFork(const UString& from, const UString& to, bool replacing) {
  const bool hadFork = fsimpl::IsExistingFile(File::ResourceForkPath(from));
  if (replacing) {
    fsimpl::RenameReplacing(from, to);
  } else {
    fsimpl::RenameNoReplace(from, to);
  }
  CarryResourceFork(from, to, hadFork);
}

}  // namespace

File File::CreateOnDisk(const FileSpecification& spec, FileTypeClass, FileTypeClass,
                        AdjustName adjust) {
  FileSpecification target = spec;
  if (adjust == kAdjustName) target.MakeUnique(kMakeUniqueAnything);
  fsimpl::CreateNewFile(target.GetFullPath());
  return File(target);
}

File File::CreateResFileOnDisk(const FileSpecification& spec, FileTypeClass type,
                               FileTypeClass creator, AdjustName adjust) {
  File file = CreateOnDisk(spec, type, creator, adjust);
  file.CreateResourceFork();
  return file;
}

File File::DemandOnDisk(const FileSpecification& spec, FileTypeClass type, FileTypeClass creator) {
  switch (fsimpl::GetPathKind(spec.GetFullPath())) {
    case fsimpl::PathKind::kNone:
      return CreateOnDisk(spec, type, creator, kDontAdjustName);
    case fsimpl::PathKind::kFile:
      return File(spec);
    default:
      FailFSErr(kNotAFileErr, spec);
  }
  return File(spec);
}

FileTypeClass File::GetType() const { return FileTypeFromName(fSpec.GetName()); }

std::int64_t File::GetFileDataSize() const {
  return fsimpl::FileSizeOf(fSpec.GetFullPath(), false);
}

std::int64_t File::GetFileResourceSize() const {
  return fsimpl::FileSizeOf(ResourceForkPath(fSpec.GetFullPath()), true);
}

std::int64_t File::GetFileTotalSize() const { return GetFileDataSize() + GetFileResourceSize(); }

bool File::CanWriteToFile() const {
  std::FILE* f = fsimpl::OpenFile(fSpec.GetFullPath(), "r+b", false);
  if (f == nullptr) return false;
  std::fclose(f);
  return true;
}

std::FILE* File::Open(const char* mode) const {
  return fsimpl::OpenFile(fSpec.GetFullPath(), mode, true);
}

namespace {
// Read-only, or read/write without truncation, creating the file if missing.
std::FILE* OpenWithPermission(const UString& path, Permission permission) {
  if (permission == kReadPermission) return fsimpl::OpenFile(path, "rb", true);
  if (std::FILE* f = fsimpl::OpenFile(path, "r+b", false)) return f;
  if (!fsimpl::IsExistingFile(path)) fsimpl::CreateNewFile(path);
  return fsimpl::OpenFile(path, "r+b", true);
}
}  // namespace

std::FILE* File::OpenDataFork(Permission permission) const {
  return OpenWithPermission(fSpec.GetFullPath(), permission);
}

std::FILE* File::OpenResourceFork(Permission permission) const {
  return OpenWithPermission(ResourceForkPath(fSpec.GetFullPath()), permission);
}

void File::CloseFork(std::FILE* fork) noexcept {
  if (fork != nullptr) std::fclose(fork);
}

void File::CreateResourceFork() const {
  const UString fork = ResourceForkPath(fSpec.GetFullPath());
  if (!fsimpl::IsExistingFile(fork)) fsimpl::CreateNewFile(fork);
}

void File::ReplaceContents(const File& source) {
  RenameWithFork(source.fSpec.GetFullPath(), fSpec.GetFullPath(), true);
}

void File::Rename(const UString& newName) {
  FileSpecification target = fSpec;
  target.SetName(newName);
  RenameWithFork(fSpec.GetFullPath(), target.GetFullPath(), false);
  fSpec = target;
}

void File::MoveTo(const FileSpecification& folder, const UString& name) {
  FileSpecification target(folder, name);
  RenameWithFork(fSpec.GetFullPath(), target.GetFullPath(), false);
  fSpec = target;
}

void File::Delete() {
  const UString path = fSpec.GetFullPath();
  fsimpl::RemoveFile(path);
  const UString fork = ResourceForkPath(path);
  if (fsimpl::IsExistingFile(fork)) fsimpl::RemoveFile(fork);
}

UString File::ResourceForkPath(const UString& path) {
  UString fork = path;
  fork += UString(fsimpl::kResourceForkSuffix);
  return fork;
}

FileDate FileDate::Get(const FileSpecification& spec) {
  return fsimpl::GetModificationDate(spec.GetFullPath());
}

void FileDate::Set(const FileSpecification& spec, const FileDate& date) {
  fsimpl::SetModificationDate(spec.GetFullPath(), date);
}

FileDate FileDate::Now() {
  const auto ns = std::chrono::duration_cast<std::chrono::nanoseconds>(
                      std::chrono::system_clock::now().time_since_epoch())
                      .count();
  std::int64_t seconds = ns / 1'000'000'000;
  std::int64_t rest = ns % 1'000'000'000;
  if (rest < 0) {
    rest += 1'000'000'000;
    --seconds;
  }
  return FileDate(seconds, std::uint32_t(rest));
}

}  // namespace tarn
