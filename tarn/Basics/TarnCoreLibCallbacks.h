// TarnCoreLibCallbacks: the interface through which the host supplies what
// the library cannot know by itself: localised texts, by string-list number
// and index, and a way to run the library's idle chores on its main thread.
//
// The host derives from it, keeps one instance alive while the library runs
// and installs it with SetCallbackAPI. GetCallbackAPI never returns null:
// with nothing installed it returns a built-in object with English texts.
// GetIndUString asks the installed object first and falls back to the
// built-in texts, so a host may localise only some lists.
//
// String lists known to the library (indices in brackets):
//   12593 general labels: [1] "Error" (title), [2] "Error %0 (%1)" (code,
//         kind), [3] "Unhandled exception: ", [11] "Files:" (the label put
//         before an error's attachment)
//   12594 "OS" error codes: [0] title, [code] description, for -36, -39,
//         -43, -48, -50, -108, -128, -192, -5000
//   12595 sample format names, index format + 1: [1] "8-bit offset"
//         [2] "8-bit" [3] "16-bit" [4] "24-bit" [5] "24-bit (32-bit
//         container)" [6] "32-bit float" [7] "64-bit (A)" [8] "64-bit float"
//   12596 "FailNULL" errors: [0] title, [1] out of memory, [2] resource not
//         found, [3] missing object
//   12597 channel-file suffixes, index channel + 1: [1] ".L" [2] ".R"
//         [3] ".C" [4] ".LFE" [5] ".Ls" [6] ".Rs" [7] ".Lc" [8] ".Rc"
//         [9] ".Cs" [10] ".Lsr" [11] ".Rsr" [12] ".Ts"
#pragma once

#include "tarn/String/UString.h"

namespace tarn {

inline constexpr short kGeneralLabelsStringList = 12593;
inline constexpr short kOSErrorsStringList = 12594;
inline constexpr short kSampleFormatNamesStringList = 12595;
inline constexpr short kFailNULLStringList = 12596;
inline constexpr short kChannelSuffixesStringList = 12597;

inline constexpr short kErrorTitleLabelIndex = 1;
inline constexpr short kErrorCodeLabelIndex = 2;
inline constexpr short kUnhandledExceptionLabelIndex = 3;
inline constexpr short kAttachmentLabelIndex = 11;

class TarnCoreLibCallbacks {
 public:
  TarnCoreLibCallbacks() = default;
  TarnCoreLibCallbacks(const TarnCoreLibCallbacks&) = delete;
  TarnCoreLibCallbacks& operator=(const TarnCoreLibCallbacks&) = delete;
  virtual ~TarnCoreLibCallbacks() = default;

  // Sets text and returns true if the host has a text for the list and
  // index; returns false (text unspecified) otherwise. Called from any thread.
  virtual bool GetIndString(short listID, short index, UString& text) = 0;

  // Called from any thread when the library has idle chores waiting; the
  // host should then run the library's idle-chore pump on its main thread.
  // The default does nothing.
  virtual void RequestIdleTime() {}

  // The installed object, or the built-in one; never null.
  [[nodiscard]] static TarnCoreLibCallbacks* GetCallbackAPI() noexcept;
  // Installs callbacks (the host keeps ownership and keeps it alive until it
  // installs another); nullptr restores the built-in object.
  static void SetCallbackAPI(TarnCoreLibCallbacks* callbacks) noexcept;
  // The built-in English text of a list and index, if there is one.
  static bool GetBuiltInIndString(short listID, short index, UString& text);
};

// The text of a list and index from the installed callbacks, else the
// built-in English text, else an empty string.
[[nodiscard]] UString GetIndUString(short listID, short index);

}  // namespace tarn
