#include "tarn/FileSystem/FileSpecification.h"

#include <string>

#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnAssert.h"
#include "tarn/FileSystem/FileSystemImpl.h"

namespace tarn {

class FileSpecification::Impl {
 public:
  explicit Impl(UString path) : fPath(std::move(path)) {}
  UString fPath;
};

namespace {

using fsimpl::PathKind;

// Separators made uniform; trailing separators dropped, except from a root.
UString NormalisePath(const UString& path) {
  UString p = path;
  const unsigned short sep = fsimpl::PreferredSeparator();
  for (std::size_t i = 0; i < p.length(); ++i)
    if (fsimpl::IsSeparator(p[i])) p[i] = sep;
  const std::size_t root = fsimpl::RootLength(p);
  std::size_t end = p.length();
  while (end > root && end > 1 && fsimpl::IsSeparator(p[end - 1])) --end;
  p.resize(end);
  return p;
}

// Index of the separator before the last component, or npos.
std::size_t LastSeparator(const UString& path) {
  for (std::size_t i = path.length(); i > 0; --i)
    if (fsimpl::IsSeparator(path[i - 1])) return i - 1;
  return UString::npos;
}

UString Join(const UString& folder, const UString& name) {
  UString result = folder;
  if (!result.empty() && !fsimpl::IsSeparator(result[result.length() - 1]))
    result += fsimpl::PreferredSeparator();
  result += name;
  return result;
}

bool NameIsFree(const UString& path, MakeUniqueMode mode) {
  switch (fsimpl::GetPathKind(path)) {
    case PathKind::kNone:
      return true;
    case PathKind::kFile:
      return mode == kMakeUniqueFolder;
    case PathKind::kFolder:
      return mode == kMakeUniqueFile;
    case PathKind::kOther:
      return mode != kMakeUniqueAnything;
  }
  return false;
}

// The first `count` units of `s`, one less if that would split a surrogate pair.
UString CutUnits(const UString& s, std::size_t count) {
  if (count >= s.length()) return s;
  if (count > 0 && s[count - 1] >= 0xD800 && s[count - 1] <= 0xDBFF) --count;
  return s.substr(0, count);
}

}  // namespace

FileSpecification::FileSpecification() : fImpl(std::make_unique<Impl>(UString())) {}

FileSpecification::FileSpecification(const UString& fullPath)
    : fImpl(std::make_unique<Impl>(NormalisePath(fullPath))) {}

FileSpecification::FileSpecification(const UString& fullPath, MissingFileSpec missing)
    : FileSpecification(fullPath) {
  if (missing == kMissingFileSpecFails && !Exists()) FailFSErr(-43, *this);
}

FileSpecification::FileSpecification(const FileSpecification& folder, const UString& name)
    : FileSpecification(Join(folder.Get().fPath, name)) {}

FileSpecification::FileSpecification(const FileSpecification& other)
    : fImpl(std::make_unique<Impl>(other.Get().fPath)) {}

FileSpecification::FileSpecification(FileSpecification&& other) noexcept = default;

FileSpecification& FileSpecification::operator=(const FileSpecification& other) {
  if (this != &other) fImpl = std::make_unique<Impl>(other.Get().fPath);
  return *this;
}

FileSpecification& FileSpecification::operator=(FileSpecification&& other) noexcept = default;

FileSpecification::~FileSpecification() = default;

FileSpecification::Impl& FileSpecification::Get() const {
  TARN_ASSERT_MSG(fImpl != nullptr, "px != 0");
  return *fImpl;
}

bool FileSpecification::operator==(const FileSpecification& other) const {
  return Get().fPath == other.Get().fPath;
}

UString FileSpecification::GetFullPath() const { return Get().fPath; }

void FileSpecification::GetFullPath(UString& path) const { path = Get().fPath; }

UString FileSpecification::GetName() const {
  const UString& path = Get().fPath;
  const std::size_t root = fsimpl::RootLength(path);
  if (path.length() <= root) return path;
  const std::size_t sep = LastSeparator(path);
  if (sep == UString::npos) return path;
  return path.substr(sep + 1);
}

void FileSpecification::SetName(const UString& name) {
  const UString& path = Get().fPath;
  if (path.length() <= fsimpl::RootLength(path) && !path.empty()) {
    Get().fPath = NormalisePath(Join(path, name));
  } else {
    Get().fPath = NormalisePath(Join(GetParentFolder().Get().fPath, name));
  }
}

UString FileSpecification::GetDisplayName() const { return GetName(); }

UString FileSpecification::GetDisplayPath() const { return Get().fPath; }

UString FileSpecification::GetFileURL() const {
  UString path = Get().fPath;
  for (std::size_t i = 0; i < path.length(); ++i)
    if (fsimpl::IsSeparator(path[i])) path[i] = '/';
  const std::string utf8 = path.utf8_str();
  std::string url = "file://";
  if (utf8.empty() || utf8[0] != '/') url += '/';
  static const char kHex[] = "0123456789ABCDEF";
  for (unsigned char c : utf8) {
    const bool plain = (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
                       c == '-' || c == '.' || c == '_' || c == '~' || c == '/' || c == ':';
    if (plain) {
      url += char(c);
    } else {
      url += '%';
      url += kHex[c >> 4];
      url += kHex[c & 15];
    }
  }
  return UString(url.c_str());
}

FileSpecification FileSpecification::GetParentFolder() const {
  const UString& path = Get().fPath;
  const std::size_t root = fsimpl::RootLength(path);
  if (path.length() <= root) return *this;
  const std::size_t sep = LastSeparator(path);
  if (sep == UString::npos) return FileSpecification();
  return FileSpecification(path.substr(0, sep < root ? root : sep));
}

bool FileSpecification::IsValid() const {
  const UString& path = Get().fPath;
  return !path.empty() && fsimpl::RootLength(path) > 0;
}

bool FileSpecification::Exists() const {
  return fsimpl::GetPathKind(Get().fPath) != PathKind::kNone;
}

bool FileSpecification::IsFile() const {
  return fsimpl::GetPathKind(Get().fPath) == PathKind::kFile;
}

bool FileSpecification::IsFolder() const {
  return fsimpl::GetPathKind(Get().fPath) == PathKind::kFolder;
}

bool FileSpecification::IsVolume() const {
  const UString& path = Get().fPath;
  return !path.empty() && path.length() == fsimpl::RootLength(path);
}

bool FileSpecification::IsApplication() const {
  const UString name = GetName();
  const std::size_t dot = name.rfind('.');
  return dot != UString::npos && name.substr(dot + 1).equal(UString("exe"), UString::kIgnoreCase) &&
         IsFile();
}

UString FileSpecification::MakeUniqueCandidate(const UString& base, const UString& extension,
                                               unsigned n) {
  const UString number(std::to_string(n).c_str());
  const std::size_t max = kMaxNameLength;
  UString b = base;
  UString ext = extension;
  if (ext.length() + number.length() + 1 > max) {
    b += ext;
    ext.clear();
  }
  UString candidate = CutUnits(b, max - ext.length() - number.length() - 1);
  candidate += ' ';
  candidate += number;
  candidate += ext;
  return candidate;
}

void FileSpecification::MakeUnique(MakeUniqueMode mode) {
  MakeUniqueAddingExtension(UString(), mode);
}

void FileSpecification::MakeUniqueAddingExtension(const UString& extension, MakeUniqueMode mode) {
  UString base = GetName();
  UString ext = extension;
  if (ext.empty()) {
    const std::size_t dot = base.rfind('.');
    if (dot != UString::npos) {
      ext = base.substr(dot);
      base.resize(dot);
    }
  } else {
    UString name = base;
    name += ext;
    SetName(name);
  }
  if (NameIsFree(Get().fPath, mode)) return;
  const UString folder = GetParentFolder().Get().fPath;
  for (unsigned n = 2;; ++n) {
    UString candidate = MakeUniqueCandidate(base, ext, n);
    if (NameIsFree(Join(folder, candidate), mode)) {
      SetName(candidate);
      return;
    }
  }
}

}  // namespace tarn
