#include "tarn/Basics/TarnCoreLibCallbacks.h"

#include <atomic>
#include <string>

namespace tarn {

namespace {

struct BuiltInText {
  short listID;
  short index;
  const char* utf8;
};

// English texts used when the host supplies none. Keep the list numbers and
// indices in step with the table in TarnCoreLibCallbacks.h.
constexpr BuiltInText kBuiltInTexts[] = {
    {kGeneralLabelsStringList, kErrorTitleLabelIndex, "Error"},
    {kGeneralLabelsStringList, kErrorCodeLabelIndex, "Error %0 (%1)"},
    {kGeneralLabelsStringList, kUnhandledExceptionLabelIndex, "Unhandled exception: "},
    {kGeneralLabelsStringList, kAttachmentLabelIndex, "Files:"},

    {kOSErrorsStringList, 0, "Error"},
    {kOSErrorsStringList, -36, "I/O error"},
    {kOSErrorsStringList, -39, "End of file"},
    {kOSErrorsStringList, -43, "File not found"},
    {kOSErrorsStringList, -48, "Duplicate file name"},
    {kOSErrorsStringList, -50, "Parameter error"},
    {kOSErrorsStringList, -108, "Out of memory"},
    {kOSErrorsStringList, -128, "User cancelled"},
    {kOSErrorsStringList, -192, "Resource not found"},
    {kOSErrorsStringList, -5000, "Access denied"},

    {kSampleFormatNamesStringList, 1, "8-bit offset"},
    {kSampleFormatNamesStringList, 2, "8-bit"},
    {kSampleFormatNamesStringList, 3, "16-bit"},
    {kSampleFormatNamesStringList, 4, "24-bit"},
    {kSampleFormatNamesStringList, 5, "24-bit (32-bit container)"},
    {kSampleFormatNamesStringList, 6, "32-bit float"},
    {kSampleFormatNamesStringList, 7, "64-bit (A)"},
    {kSampleFormatNamesStringList, 8, "64-bit float"},

    {kFailNULLStringList, 0, "Missing object"},
    {kFailNULLStringList, 1, "Out of memory"},
    {kFailNULLStringList, 2, "Resource not found"},
    {kFailNULLStringList, 3, "A required object is missing"},

    {kChannelSuffixesStringList, 1, ".L"},
    {kChannelSuffixesStringList, 2, ".R"},
    {kChannelSuffixesStringList, 3, ".C"},
    {kChannelSuffixesStringList, 4, ".LFE"},
    {kChannelSuffixesStringList, 5, ".Ls"},
    {kChannelSuffixesStringList, 6, ".Rs"},
    {kChannelSuffixesStringList, 7, ".Lc"},
    {kChannelSuffixesStringList, 8, ".Rc"},
    {kChannelSuffixesStringList, 9, ".Cs"},
    {kChannelSuffixesStringList, 10, ".Lsr"},
    {kChannelSuffixesStringList, 11, ".Rsr"},
    {kChannelSuffixesStringList, 12, ".Ts"},
};

class BuiltInCallbacks final : public TarnCoreLibCallbacks {
 public:
  bool GetIndString(short listID, short index, UString& text) override {
    return GetBuiltInIndString(listID, index, text);
  }
};

TarnCoreLibCallbacks* BuiltIn() noexcept {
  static auto* builtIn = new BuiltInCallbacks;  // never destroyed: used until exit
  return builtIn;
}

std::atomic<TarnCoreLibCallbacks*> gInstalled{nullptr};

}  // namespace

TarnCoreLibCallbacks* TarnCoreLibCallbacks::GetCallbackAPI() noexcept {
  TarnCoreLibCallbacks* installed = gInstalled.load(std::memory_order_acquire);
  return installed ? installed : BuiltIn();
}

void TarnCoreLibCallbacks::SetCallbackAPI(TarnCoreLibCallbacks* callbacks) noexcept {
  gInstalled.store(callbacks, std::memory_order_release);
}

bool TarnCoreLibCallbacks::GetBuiltInIndString(short listID, short index, UString& text) {
  for (const BuiltInText& entry : kBuiltInTexts) {
    if (entry.listID == listID && entry.index == index) {
      text = UString(entry.utf8, UString::kUTF8Encoding);
      return true;
    }
  }
  return false;
}

UString GetIndUString(short listID, short index) {
  UString text;
  if (TarnCoreLibCallbacks::GetCallbackAPI()->GetIndString(listID, index, text)) return text;
  text.clear();
  if (TarnCoreLibCallbacks::GetBuiltInIndString(listID, index, text)) return text;
  return UString();
}

}  // namespace tarn
