// The file-system throw functions, defined beside FileSpecification because
// their attachments are display paths.
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn {

namespace {
[[noreturn]] void ThrowFSErr(short code, const UString& attachment) {
  throw TarnError(TarnError::MacOSKind(), "File I/O", "", code, "", attachment);
}
}  // namespace

void FailFSErr(short code, const FileSpecification& spec) {
  if (code != 0) ThrowFSErr(code, spec.GetDisplayPath());
}

void FailFSErr(short code, const FileSpecification& spec1, const FileSpecification& spec2) {
  if (code == 0) return;
  UString paths = spec1.GetDisplayPath();
  paths += '\n';
  paths += spec2.GetDisplayPath();
  ThrowFSErr(code, paths);
}

}  // namespace tarn
