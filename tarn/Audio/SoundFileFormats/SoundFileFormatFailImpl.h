#pragma once
// Private to the sound-file format classes: one way to report an operation
// that a class cannot carry out, with a readable text.

#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn::sffimpl {

// Throws the error of FailFormatError(className, code, file), with `what`
// as its optional error string.
[[noreturn]] inline void FailWithText(const char* className, int code, const char* what,
                                      const FileSpecification& file) {
  try {
    FailFormatError(className, code, file);
  } catch (TarnError& error) {
    error.SetOptionalErrorString(what);
    throw;
  }
}

}  // namespace tarn::sffimpl
