#pragma once
// DSPSoundBiteSpec and FileLength: the small values an AudioInFile is built
// from. A sound bite is one stretch of frames of one sound file, with the
// file's header facts as its format object reported them; FileLength is how
// many frames of audio the file holds (the reader never reads past them).
// Plain values: copy freely, any thread.
//
//   DSPSoundBiteSpec bite{spec, format->GetFileAttributes(), format->GetChannelOrder(),
//                         {SampleCount(0), format->GetLengthInFrames()}};
//   AudioInFile in(bite, FileLength{format->GetLengthInFrames()});

#include "tarn/Audio/SoundFileFormats/HostChannelOrder.h"
#include "tarn/Audio/SoundFileFormats/SoundFileAttributes.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Time/SampleCount.h"
#include "tarn/Time/TimeRegion.h"

namespace tarn {

struct DSPSoundBiteSpec {
  FileSpecification mFile;
  SoundFileAttributes mAttributes;
  HostChannelOrder mChannelOrder;
  // Frames of the file's audio, [start, end); a reader's frame 0 is start.
  TimeRangeOf<SampleCount> mRange;
};

struct FileLength {
  SampleCount mFrames;

  friend bool operator==(const FileLength&, const FileLength&) = default;
};

}  // namespace tarn
