// The file-system throw functions, defined beside FileSpecification because
// their attachments are display paths.
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/FileSystem/FileSystemImpl.h"

namespace tarn {

void fsimpl::ThrowWithPaths(TarnError error, const UString& path, const UString* path2) {
  UString attachment = path;
  if (path2 != nullptr) {
    attachment += '\n';
    attachment += *path2;
  }
  error.SetAttachment(attachment);
  throw error;
}

namespace {
TarnError FSErr(short code) { return TarnError(TarnError::MacOSKind(), "File I/O", "", code, ""); }
}  // namespace

void FailFSErr(short code, const FileSpecification& spec) {
  if (code != 0) fsimpl::ThrowWithPaths(FSErr(code), spec.GetDisplayPath());
}

void FailFSErr(short code, const FileSpecification& spec1, const FileSpecification& spec2) {
  const UString path2 = spec2.GetDisplayPath();
  if (code != 0) fsimpl::ThrowWithPaths(FSErr(code), spec1.GetDisplayPath(), &path2);
}

void FailFormatError(const char* className, int code, const FileSpecification& spec) {
  fsimpl::ThrowWithPaths(TarnError(className, className, className, code), spec.GetDisplayPath());
}

}  // namespace tarn
