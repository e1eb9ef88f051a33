// A small tour of strings and errors: one text from several encodings, an
// error thrown and described with the built-in texts, and a message template.
#include <cstdio>
#include <string>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/String/ParamUString.h"
#include "tarn/String/UString.h"
#include "tarn/TarnCore.h"

namespace {

void ShowStrings() {
  using tarn::UString;
  // "Café" four ways: UTF-8, Mac Roman bytes, Windows-1252 bytes, UTF-16.
  const UString fromUTF8("Caf\xC3\xA9", UString::kUTF8Encoding);
  const UString fromMacRoman("Caf\x8E", UString::kMacRomanEncoding);
  const UString fromANSI("Caf\xE9", UString::kSystemEncoding);
  const unsigned short utf16[] = {'C', 'a', 'f', 0xE9, 0};
  const UString fromUTF16(utf16);
  for (const UString* s : {&fromUTF8, &fromMacRoman, &fromANSI, &fromUTF16})
    std::printf("  %s (%zu units)%s\n", s->utf8_str().c_str(), s->length(),
                *s == fromUTF8 ? "" : "  <- differs!");
}

void ShowErrors() {
  try {
    tarn::TarnError error(tarn::TarnError::MacOSKind(), "File I/O", "", tarn::kFileNotFoundErr,
                          nullptr, tarn::UString("/Audio/Take 1.wav"));
    throw error;
  } catch (const tarn::TarnError& e) {
    tarn::UString title, description;
    e.GetErrorDescription(tarn::TarnError::DefaultTranslator(), title, description);
    std::printf("  title: %s\n  description: %s\n", title.utf8_str().c_str(),
                description.utf8_str().c_str());
    std::printf("  one line: %s\n", e.Describe().c_str());
  }
  try {
    tarn::FailNIL(nullptr);
  } catch (...) {
    std::printf("  caught: %s\n", tarn::GetCurrentError().Describe().c_str());
  }
}

void ShowMessages() {
  tarn::ParamUString message(tarn::UString("%0 of %1 files converted (100%% %2)"));
  message.SetParameterAtIndex(2, tarn::GetIndUString(tarn::kSampleFormatNamesStringList, 6));
  message.SetParameterAtIndex(0, tarn::UString("3"));
  message.SetParameterAtIndex(1, tarn::UString("4"));
  std::printf("  %s\n", message.GetString().utf8_str().c_str());
}

}  // namespace

int main() {
  std::printf("TarnCore %s\n", tarn::GetTarnCoreVersion());
  std::printf("Strings:\n");
  ShowStrings();
  std::printf("Errors:\n");
  ShowErrors();
  std::printf("Messages:\n");
  ShowMessages();
  return 0;
}
