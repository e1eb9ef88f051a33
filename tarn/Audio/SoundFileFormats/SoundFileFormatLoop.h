#pragma once
// SoundFileFormatLoop: one loop of a sound file, in the terms shared by the
// formats that store loops (WAVE "smpl", AIFF "INST" with its "MARK" points).
//
// Frames are counted from the first frame of the audio. `mEnd` is one past
// the last frame played, as in TimeRangeOf: a loop over frames 100..199
// has mStart 100 and mEnd 200. (WAVE "smpl" stores the last frame itself,
// 199; AIFF markers sit between frames, 200.) Plain value, any thread.

#include <cstdint>

#include "tarn/String/UString.h"
#include "tarn/Time/SampleCount.h"

namespace tarn {

struct SoundFileFormatLoop {
  // How playback moves through the loop; the values are those of WAVE
  // "smpl" (AIFF's play modes 1 and 2 are kForward and kAlternating).
  enum class Type : std::int32_t {
    kForward = 0,
    kAlternating = 1,  // forward, then backward, and so on
    kBackward = 2,
  };

  SampleCount mStart;
  SampleCount mEnd;  // exclusive
  Type mType = Type::kForward;
  // Times the loop plays; 0 means for ever.
  std::uint32_t mPlayCount = 0;
  // The loop's identifier in the file (WAVE cue point id, AIFF marker id of
  // the loop's start); 0 when the file gives none.
  std::uint32_t mID = 0;
  // Fraction of a frame by which the loop end is tuned, as a 32-bit binary
  // fraction (WAVE "smpl"); 0 elsewhere.
  std::uint32_t mFraction = 0;
  // The loop's (or its start marker's) name; empty when there is none.
  UString mName;

  [[nodiscard]] SampleCount GetLength() const noexcept { return mEnd - mStart; }

  friend bool operator==(const SoundFileFormatLoop&, const SoundFileFormatLoop&) = default;
};

}  // namespace tarn
