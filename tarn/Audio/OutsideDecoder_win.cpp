// The outside converter on Windows: Media Foundation's source reader,
// asked for 32-bit float. Its positions (100 ns units) are not exact
// enough to land on a frame, so every backward or far seek decodes from
// the start, and the length is counted by decoding.
#include <windows.h>
// Media Foundation's headers after <windows.h>.
#include <mfapi.h>
#include <mferror.h>
#include <mfidl.h>
#include <mfreadwrite.h>

#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "tarn/Audio/OutsideDecoderImpl.h"

namespace tarn::odimpl {

namespace {

constexpr DWORD kAudio = static_cast<DWORD>(MF_SOURCE_READER_FIRST_AUDIO_STREAM);
constexpr UINT32 kMaxChannels = 64;
// How long opening a file and decoding its first block may take. Some
// damaged files (chunk offsets beyond the end) leave the source reader
// waiting for ever; such a file is refused and its reader abandoned.
constexpr auto kOpenTimeout = std::chrono::seconds(15);

void Check(HRESULT hr, const char* what) {
  if (SUCCEEDED(hr)) return;
  char text[32];
  std::snprintf(text, sizeof text, " (HRESULT 0x%08lX)", static_cast<unsigned long>(hr));
  throw std::runtime_error(std::string(what) + text);
}

// Releases a COM interface when it goes out of scope.
template <class T>
class ComPtr {
 public:
  ComPtr() = default;
  ComPtr(const ComPtr&) = delete;
  ComPtr& operator=(const ComPtr&) = delete;
  ~ComPtr() { Reset(); }
  T** operator&() noexcept {  // NOLINT: the out-parameter idiom of COM
    Reset();
    return &p_;
  }
  T* operator->() const noexcept { return p_; }
  T* Get() const noexcept { return p_; }
  explicit operator bool() const noexcept { return p_ != nullptr; }
  void Reset() noexcept {
    if (p_) p_->Release();
    p_ = nullptr;
  }

 private:
  T* p_ = nullptr;
};

// Media Foundation for the process (never shut down: format objects may
// live until exit) and COM for the calling thread.
void StartMediaFoundation() {
  const HRESULT com = CoInitializeEx(nullptr, COINIT_MULTITHREADED);
  (void)com;  // S_FALSE or RPC_E_CHANGED_MODE: this thread has COM already
  static std::once_flag once;
  static HRESULT started = E_FAIL;
  std::call_once(once, [] { started = MFStartup(MF_VERSION, MFSTARTUP_LITE); });
  Check(started, "Media Foundation does not start");
}

class MFSource final : public DecodeSource {
 public:
  explicit MFSource(std::wstring path) : path_(std::move(path)) { Open(); }

  [[nodiscard]] int NumChannels() const noexcept override { return static_cast<int>(channels_); }
  [[nodiscard]] double SampleRate() const noexcept override { return rate_; }
  [[nodiscard]] SampleFormat Format() const noexcept override { return kSampFloat32; }
  [[nodiscard]] std::optional<std::int64_t> KnownLength() const noexcept override {
    return std::nullopt;
  }
  [[nodiscard]] bool CanSeek() const noexcept override { return false; }
  [[nodiscard]] std::int64_t PreRoll() const noexcept override { return 0; }
  void SeekNear(std::int64_t) override { Restart(); }
  void Restart() override { Open(); }

  bool Next(std::int64_t& start, std::int64_t& frames, const std::byte*& data) override {
    if (pending_) {
      pending_ = false;
    } else if (!ReadBlock()) {
      return false;
    }
    start = blockStart_;
    frames = static_cast<std::int64_t>(buffer_.size() / (sizeof(float) * channels_));
    data = buffer_.data();
    return true;
  }

 private:
  void Open() {
    StartMediaFoundation();
    reader_.Reset();
    pending_ = false;
    Check(MFCreateSourceReaderFromURL(path_.c_str(), nullptr, &reader_),
          "the file cannot be opened");
    Check(reader_->SetStreamSelection(static_cast<DWORD>(MF_SOURCE_READER_ALL_STREAMS), FALSE),
          "the file's streams cannot be chosen");
    Check(reader_->SetStreamSelection(kAudio, TRUE), "the file holds no audio stream");
    ComPtr<IMFMediaType> wanted;
    Check(MFCreateMediaType(&wanted), "no media type");
    Check(wanted->SetGUID(MF_MT_MAJOR_TYPE, MFMediaType_Audio), "no media type");
    Check(wanted->SetGUID(MF_MT_SUBTYPE, MFAudioFormat_Float), "no media type");
    Check(reader_->SetCurrentMediaType(kAudio, nullptr, wanted.Get()),
          "the audio cannot be decoded to float");
    ReadType();
    if (!ReadBlock()) throw std::runtime_error("the audio stream holds no decodable audio");
    pending_ = true;
  }

  void ReadType() {
    ComPtr<IMFMediaType> current;
    Check(reader_->GetCurrentMediaType(kAudio, &current), "the audio format is unknown");
    UINT32 channels = 0, rate = 0, bits = 0;
    Check(current->GetUINT32(MF_MT_AUDIO_NUM_CHANNELS, &channels), "no channel count");
    Check(current->GetUINT32(MF_MT_AUDIO_SAMPLES_PER_SECOND, &rate), "no sample rate");
    Check(current->GetUINT32(MF_MT_AUDIO_BITS_PER_SAMPLE, &bits), "no sample size");
    if (channels < 1 || channels > kMaxChannels || rate == 0 || bits != 32)
      throw std::runtime_error("the audio stream has an unusable layout");
    if (channels_ != 0 && (channels != channels_ || rate != rate_))
      throw std::runtime_error("the audio stream changes its layout");
    channels_ = channels;
    rate_ = rate;
  }

  // Reads the next non-empty block into buffer_; false at the end.
  bool ReadBlock() {
    for (;;) {
      DWORD stream = 0, flags = 0;
      LONGLONG time = 0;
      ComPtr<IMFSample> sample;
      Check(reader_->ReadSample(kAudio, 0, &stream, &flags, &time, &sample),
            "the audio cannot be decoded");
      if (flags & MF_SOURCE_READERF_ERROR) throw std::runtime_error("the audio cannot be decoded");
      if (flags & MF_SOURCE_READERF_CURRENTMEDIATYPECHANGED) ReadType();
      if (!sample) {
        if (flags & MF_SOURCE_READERF_ENDOFSTREAM) return false;
        continue;
      }
      ComPtr<IMFMediaBuffer> contiguous;
      Check(sample->ConvertToContiguousBuffer(&contiguous), "the audio cannot be read");
      BYTE* bytes = nullptr;
      DWORD length = 0;
      Check(contiguous->Lock(&bytes, nullptr, &length), "the audio cannot be read");
      const std::size_t frameBytes = sizeof(float) * channels_;
      buffer_.resize(length / frameBytes * frameBytes);
      if (!buffer_.empty()) std::memcpy(buffer_.data(), bytes, buffer_.size());
      contiguous->Unlock();
      blockStart_ = static_cast<std::int64_t>(static_cast<double>(time) * rate_ / 1e7 + 0.5);
      if (!buffer_.empty()) return true;
      if (flags & MF_SOURCE_READERF_ENDOFSTREAM) return false;
    }
  }

  std::wstring path_;
  ComPtr<IMFSourceReader> reader_;
  UINT32 channels_ = 0;
  UINT32 rate_ = 0;
  bool pending_ = false;  // buffer_ holds the first block, not yet handed out
  std::int64_t blockStart_ = 0;
  std::vector<std::byte> buffer_;
};

}  // namespace

std::unique_ptr<DecodeSource> OpenDecodeSource(const FileSpecification& file) {
  const UString fullPath = file.GetFullPath();
  std::wstring path(reinterpret_cast<const wchar_t*>(fullPath.c_str()), fullPath.size());
  // Opened on a thread of its own, so that a reader that never answers
  // cannot hang the caller.
  struct Opening {
    std::mutex lock;
    std::condition_variable done;
    bool finished = false;
    bool abandoned = false;
    std::unique_ptr<MFSource> source;
    std::string error;
  };
  auto opening = std::make_shared<Opening>();
  std::thread([opening, path = std::move(path)] {
    std::unique_ptr<MFSource> source;
    std::string error;
    try {
      source = std::make_unique<MFSource>(path);
    } catch (const std::exception& e) {
      error = e.what();
    } catch (...) {
      error = "the file cannot be decoded";
    }
    std::lock_guard<std::mutex> guard(opening->lock);
    if (opening->abandoned) return;  // the source goes with this thread
    opening->source = std::move(source);
    opening->error = std::move(error);
    opening->finished = true;
    opening->done.notify_all();
  }).detach();
  std::unique_lock<std::mutex> guard(opening->lock);
  if (!opening->done.wait_for(guard, kOpenTimeout, [&] { return opening->finished; })) {
    opening->abandoned = true;
    throw std::runtime_error("the converter does not answer for this file");
  }
  if (!opening->source) throw std::runtime_error(opening->error);
  return std::move(opening->source);
}

}  // namespace tarn::odimpl
