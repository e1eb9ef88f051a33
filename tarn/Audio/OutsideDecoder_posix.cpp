// The outside converter on POSIX systems: FFmpeg's demuxers and decoders.
#include <algorithm>
#include <cstring>
#include <mutex>
#include <stdexcept>
#include <string>
#include <vector>

#include "tarn/Audio/AudioChainKernelsImpl.h"
#include "tarn/Audio/OutsideDecoderImpl.h"

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavformat/avformat.h>
#include <libavutil/avutil.h>
#include <libavutil/log.h>
}

namespace tarn::odimpl {

namespace {

// Packets in a row that the decoder refuses before the stream counts as
// undecodable (single bad packets are skipped, as FFmpeg's own tool does).
constexpr int kMaxBadPackets = 64;
constexpr int kMaxChannels = 64;

[[noreturn]] void Throw(const char* what, int code) {
  char text[AV_ERROR_MAX_STRING_SIZE] = {};
  av_strerror(code, text, sizeof text);
  throw std::runtime_error(std::string(what) + ": " + text);
}

// Demuxers whose seek points carry true positions, so that a block's
// reported start can be believed after a seek.
bool DemuxerSeeksExactly(const std::string& names) {
  static const char* const kExact[] = {"mov", "caf", "aiff", "avi", "wav", "w64", "matroska"};
  for (const char* exact : kExact)
    if (names.find(exact) != std::string::npos) return true;
  return false;
}

// Interleaved float samples from a decoder format the library has no
// sample format for (double, 64-bit integer).
template <class Src, class Dst, class Convert>
void Interleave(const AVFrame& frame, bool planar, int channels, std::byte* out, Convert convert) {
  const int n = frame.nb_samples;
  Dst* dst = reinterpret_cast<Dst*>(out);
  if (!planar) {
    const Src* src = reinterpret_cast<const Src*>(frame.extended_data[0]);
    const std::size_t count = static_cast<std::size_t>(n) * static_cast<std::size_t>(channels);
    for (std::size_t i = 0; i < count; ++i) dst[i] = convert(src[i]);
    return;
  }
  for (int c = 0; c < channels; ++c) {
    const Src* src = reinterpret_cast<const Src*>(frame.extended_data[c]);
    Dst* d = dst + c;
    for (int i = 0; i < n; ++i, d += channels) *d = convert(src[i]);
  }
}

class FFmpegSource final : public DecodeSource {
 public:
  explicit FFmpegSource(std::string path) : path_(std::move(path)) { Open(); }
  ~FFmpegSource() override { Close(); }

  [[nodiscard]] int NumChannels() const noexcept override { return channels_; }
  [[nodiscard]] double SampleRate() const noexcept override { return rate_; }
  [[nodiscard]] SampleFormat Format() const noexcept override { return format_; }
  [[nodiscard]] std::optional<std::int64_t> KnownLength() const noexcept override {
    return knownLength_;
  }
  [[nodiscard]] bool CanSeek() const noexcept override { return canSeek_; }
  [[nodiscard]] std::int64_t PreRoll() const noexcept override { return preRoll_; }

  void SeekNear(std::int64_t frame) override {
    const AVStream* st = fmt_->streams[stream_];
    const std::int64_t ts = av_rescale_q(frame, AVRational{1, rate_}, st->time_base) + startTime_;
    if (av_seek_frame(fmt_, stream_, ts, AVSEEK_FLAG_BACKWARD) < 0) {
      Restart();
      return;
    }
    avcodec_flush_buffers(ctx_);
    pending_ = false;
    eofSent_ = false;
  }

  void Restart() override {
    Close();
    Open();
  }

  bool Next(std::int64_t& start, std::int64_t& frames, const std::byte*& data) override {
    if (pending_) {
      pending_ = false;
      start = 0;
    } else {
      if (!DecodeFrame()) return false;
      const std::int64_t ts = frame_->best_effort_timestamp != AV_NOPTS_VALUE
                                  ? frame_->best_effort_timestamp
                                  : frame_->pts;
      start = ts == AV_NOPTS_VALUE
                  ? kUnknownStart
                  : av_rescale_q(ts - startTime_, fmt_->streams[stream_]->time_base,
                                 AVRational{1, rate_});
    }
    frames = frame_->nb_samples;
    data = buffer_.data();
    return true;
  }

 private:
  void Open() {
    std::call_once(logOnce_, [] { av_log_set_level(AV_LOG_QUIET); });
    int err = avformat_open_input(&fmt_, path_.c_str(), nullptr, nullptr);
    if (err < 0) Throw("the file cannot be opened", err);
    try {
      if ((err = avformat_find_stream_info(fmt_, nullptr)) < 0)
        Throw("the file's streams cannot be read", err);
      stream_ = -1;
      for (unsigned i = 0; i < fmt_->nb_streams; ++i) {
        const bool audio = fmt_->streams[i]->codecpar->codec_type == AVMEDIA_TYPE_AUDIO;
        if (audio && stream_ < 0) stream_ = static_cast<int>(i);
        fmt_->streams[i]->discard =
            audio && stream_ == static_cast<int>(i) ? AVDISCARD_DEFAULT : AVDISCARD_ALL;
      }
      if (stream_ < 0) throw std::runtime_error("the file holds no audio stream");
      AVStream* st = fmt_->streams[stream_];
      const AVCodec* codec = avcodec_find_decoder(st->codecpar->codec_id);
      if (!codec) throw std::runtime_error("no decoder for the file's audio");
      ctx_ = avcodec_alloc_context3(codec);
      if (!ctx_) throw std::bad_alloc();
      if ((err = avcodec_parameters_to_context(ctx_, st->codecpar)) < 0)
        Throw("the audio stream's parameters are invalid", err);
      ctx_->pkt_timebase = st->time_base;
      if ((err = avcodec_open2(ctx_, codec, nullptr)) < 0)
        Throw("the audio decoder cannot be opened", err);
      frame_ = av_frame_alloc();
      packet_ = av_packet_alloc();
      if (!frame_ || !packet_) throw std::bad_alloc();
      startTime_ = st->start_time == AV_NOPTS_VALUE ? 0 : st->start_time;
      const bool firstOpen = rate_ == 0;
      if (firstOpen) {
        // The stream's layout is taken from its first decoded block.
        channels_ = 0;
        if (!DecodeFrame()) throw std::runtime_error("the audio stream holds no decodable audio");
        DescribeStream(*st, *codec);
      } else if (!DecodeFrame()) {
        throw std::runtime_error("the audio stream holds no decodable audio");
      }
      pending_ = true;
    } catch (...) {
      Close();
      throw;
    }
  }

  void DescribeStream(const AVStream& st, const AVCodec& codec) {
    const AVCodecDescriptor* desc = avcodec_descriptor_get(codec.id);
    const int props = desc ? desc->props : 0;
    const std::string demuxer = fmt_->iformat->name ? fmt_->iformat->name : "";
    // Lossless codecs and plain PCM (A-law and mu-law included) decode each
    // packet alone. Lossy ones carry state from packet to packet (many are
    // marked intra-only all the same), and some of it never settles after a
    // seek (AAC's noise substitution draws from a generator that runs from
    // the first frame): those decode from the start to stay sample-exact.
    const bool pcm = codec.id >= AV_CODEC_ID_FIRST_AUDIO && codec.id < AV_CODEC_ID_ADPCM_IMA_QT;
    const bool memoryless = pcm || (props & AV_CODEC_PROP_LOSSLESS) != 0;
    // FLAC in CAF: the CAF reader's positions after a seek miss the true
    // ones, so that pair decodes from the start too.
    const bool flacInCAF = demuxer == "caf" && codec.id == AV_CODEC_ID_FLAC;
    canSeek_ = memoryless && DemuxerSeeksExactly(demuxer) && !flacInCAF;
    preRoll_ = 0;
    if (!memoryless) {
      const std::int64_t frameSize = std::max(ctx_->frame_size, 1024);
      preRoll_ = std::max<std::int64_t>(st.codecpar->seek_preroll, 8 * frameSize);
    }
    // Only these containers' durations count the frames a decode gives
    // (AVI's is estimated, CAF's includes the remainder frames).
    const bool exactDuration = demuxer.find("mov") != std::string::npos ||
                               demuxer.find("aiff") != std::string::npos || demuxer == "wav" ||
                               demuxer == "w64";
    if (exactDuration && memoryless && st.duration > 0 && st.duration != AV_NOPTS_VALUE)
      knownLength_ = av_rescale_q(st.duration, st.time_base, AVRational{1, rate_});
  }

  void Close() noexcept {
    av_frame_free(&frame_);
    av_packet_free(&packet_);
    avcodec_free_context(&ctx_);
    avformat_close_input(&fmt_);
    pending_ = eofSent_ = false;
  }

  // Decodes the next frame of the stream into frame_ and buffer_; false at
  // the end.
  bool DecodeFrame() {
    int badPackets = 0;
    for (;;) {
      int err = avcodec_receive_frame(ctx_, frame_);
      if (err == 0) {
        if (frame_->nb_samples <= 0) continue;
        Convert();
        return true;
      }
      if (err == AVERROR_EOF) return false;
      if (err != AVERROR(EAGAIN)) Throw("the audio cannot be decoded", err);
      if (eofSent_) return false;
      err = av_read_frame(fmt_, packet_);
      if (err < 0) {
        if (err != AVERROR_EOF && err != AVERROR_INVALIDDATA) Throw("the file cannot be read", err);
        avcodec_send_packet(ctx_, nullptr);
        eofSent_ = true;
        continue;
      }
      if (packet_->stream_index != stream_) {
        av_packet_unref(packet_);
        continue;
      }
      err = avcodec_send_packet(ctx_, packet_);
      av_packet_unref(packet_);
      if (err < 0 && err != AVERROR(EAGAIN)) {
        if (err != AVERROR_INVALIDDATA || ++badPackets > kMaxBadPackets)
          Throw("the audio cannot be decoded", err);
      } else {
        badPackets = 0;
      }
    }
  }

  // Turns frame_ into interleaved samples of format_ in buffer_.
  void Convert() {
    const AVFrame& f = *frame_;
    const int channels = f.ch_layout.nb_channels;
    const auto format = static_cast<AVSampleFormat>(f.format);
    const AVSampleFormat packed = av_get_packed_sample_fmt(format);
    if (channels_ == 0) {
      if (channels < 1 || channels > kMaxChannels || f.sample_rate <= 0)
        throw std::runtime_error("the audio stream has an unusable layout");
      channels_ = channels;
      rate_ = f.sample_rate;
      sourceFormat_ = packed;
      switch (packed) {
        case AV_SAMPLE_FMT_U8:
          format_ = kSamp8Offset;
          break;
        case AV_SAMPLE_FMT_S16:
          format_ = kSamp16;
          break;
        case AV_SAMPLE_FMT_S32:
          format_ = kSampUnpacked24;
          break;
        case AV_SAMPLE_FMT_FLT:
        case AV_SAMPLE_FMT_DBL:
        case AV_SAMPLE_FMT_S64:
          format_ = kSampFloat32;
          break;
        default:
          throw std::runtime_error("the decoder gives an unknown sample format");
      }
    }
    if (channels != channels_ || packed != sourceFormat_ || f.sample_rate != rate_)
      throw std::runtime_error("the audio stream changes its layout");
    const bool planar = av_sample_fmt_is_planar(format) != 0;
    buffer_.resize(static_cast<std::size_t>(f.nb_samples) * static_cast<std::size_t>(channels) *
                   static_cast<std::size_t>(GetBytesPerSample(format_)));
    if (buffer_.empty()) return;
    std::byte* out = buffer_.data();
    if (packed == AV_SAMPLE_FMT_DBL) {
      Interleave<double, float>(f, planar, channels, out,
                                [](double x) { return static_cast<float>(x); });
    } else if (packed == AV_SAMPLE_FMT_S64) {
      Interleave<std::int64_t, float>(f, planar, channels, out, [](std::int64_t x) {
        return static_cast<float>(x) * (1.0f / 9223372036854775808.0f);
      });
    } else if (!planar) {
      // The decoder's own samples, already interleaved.
      std::memcpy(out, f.extended_data[0], buffer_.size());
    } else {
      chainimpl::Interleave(reinterpret_cast<const void* const*>(f.extended_data), 0, out, channels,
                            GetBytesPerSample(format_), static_cast<std::size_t>(f.nb_samples));
    }
  }

  static std::once_flag logOnce_;
  std::string path_;
  AVFormatContext* fmt_ = nullptr;
  AVCodecContext* ctx_ = nullptr;
  AVFrame* frame_ = nullptr;
  AVPacket* packet_ = nullptr;
  int stream_ = -1;
  std::int64_t startTime_ = 0;  // in the stream's time base
  bool pending_ = false;        // frame_ holds the first block, not yet handed out
  bool eofSent_ = false;        // the decoder was told the packets ended
  int channels_ = 0;
  int rate_ = 0;
  AVSampleFormat sourceFormat_ = AV_SAMPLE_FMT_NONE;
  SampleFormat format_ = kSampFloat32;
  bool canSeek_ = false;
  std::int64_t preRoll_ = 0;
  std::optional<std::int64_t> knownLength_;
  std::vector<std::byte> buffer_;
};

std::once_flag FFmpegSource::logOnce_;

}  // namespace

std::unique_ptr<DecodeSource> OpenDecodeSource(const FileSpecification& file) {
  return std::make_unique<FFmpegSource>(file.GetFullPath().utf8_str());
}

}  // namespace tarn::odimpl
