// OutsideDecoder's positioning over a scripted block stream: every frame
// must read the same whether reached by seeking or from the start, for
// every kind of converter behaviour (seekable or not, pre-roll, seeks that
// land late, blocks without positions, failures).
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <stdexcept>
#include <vector>

#include "tarn/Audio/OutsideDecoder.h"
#include "tarn/Audio/OutsideDecoderImpl.h"
#include "tarn/Errors/TarnError.h"

namespace tarn::test {
namespace {

using odimpl::DecodeSource;

// Frame i of the stream holds the 32-bit value i + 1 (one channel, as
// kSampUnpacked24). Blocks follow `sizes` cyclically. After a seek the
// first `settle` frames decoded hold garbage (-1): a codec settling. A seek
// lands on the block start at or before the asked frame, moved `lateBlocks`
// blocks later (a container that misses its target).
struct Script {
  std::int64_t length = 10000;
  std::vector<std::int64_t> sizes = {1152};
  bool canSeek = true;
  std::int64_t preRoll = 0;
  std::int64_t settle = 0;
  int lateBlocks = 0;
  bool unknownStarts = false;
  std::int64_t failAt = -1;  // decoding the block holding this frame throws
};

struct Counters {
  int seeks = 0;
  int restarts = 0;
};

class ScriptedSource final : public DecodeSource {
 public:
  ScriptedSource(Script script, Counters& counters) : s_(std::move(script)), counters_(counters) {
    std::int64_t at = 0;
    for (std::size_t i = 0; at < s_.length; ++i) {
      starts_.push_back(at);
      at += s_.sizes[i % s_.sizes.size()];
    }
    starts_.push_back(s_.length);
  }
  int NumChannels() const noexcept override { return 1; }
  double SampleRate() const noexcept override { return 1000.0; }
  SampleFormat Format() const noexcept override { return kSampUnpacked24; }
  std::optional<std::int64_t> KnownLength() const noexcept override { return s_.length; }
  bool CanSeek() const noexcept override { return s_.canSeek; }
  std::int64_t PreRoll() const noexcept override { return s_.preRoll; }
  void SeekNear(std::int64_t frame) override {
    ++counters_.seeks;
    std::size_t block = 0;
    while (block + 1 < starts_.size() - 1 && starts_[block + 1] <= frame) ++block;
    next_ = std::min(block + s_.lateBlocks, starts_.size() - 1);
    garbage_ = s_.settle;
  }
  void Restart() override {
    ++counters_.restarts;
    next_ = 0;
    garbage_ = 0;
  }
  bool Next(std::int64_t& start, std::int64_t& frames, const std::byte*& data) override {
    if (next_ + 1 >= starts_.size()) return false;
    const std::int64_t first = starts_[next_], end = starts_[next_ + 1];
    ++next_;
    if (s_.failAt >= first && s_.failAt < end) throw std::runtime_error("scripted failure");
    block_.clear();
    for (std::int64_t i = first; i < end; ++i)
      block_.push_back(garbage_ > 0 ? (--garbage_, -1) : static_cast<std::int32_t>(i + 1));
    start = s_.unknownStarts ? odimpl::kUnknownStart : first;
    frames = end - first;
    data = reinterpret_cast<const std::byte*>(block_.data());
    return true;
  }

 private:
  Script s_;
  Counters& counters_;
  std::vector<std::int64_t> starts_;
  std::size_t next_ = 0;
  std::int64_t garbage_ = 0;
  std::vector<std::int32_t> block_;
};

std::unique_ptr<OutsideDecoder> Make(const Script& script, Counters& counters) {
  return std::make_unique<OutsideDecoder>(FileSpecification(UString("/scripted.mp3")),
                                          std::make_unique<ScriptedSource>(script, counters));
}

// Reads `frames` at `start` and checks every value.
void ExpectFrames(OutsideDecoder& decoder, std::int64_t start, std::int64_t frames,
                  std::int64_t length) {
  decoder.Seek(start);
  std::vector<std::int32_t> got(static_cast<std::size_t>(frames) + 1, 0);
  const std::int64_t n = decoder.Decode(got.data(), frames).AsLongLong();
  ASSERT_EQ(n, std::max<std::int64_t>(0, std::min(frames, length - start))) << "at " << start;
  for (std::int64_t i = 0; i < n; ++i)
    ASSERT_EQ(got[i], start + i + 1) << "frame " << start + i << " read at " << start;
  EXPECT_EQ(decoder.GetPosition(), SampleCount(start + n));
}

struct Case {
  const char* name;
  Script script;
};

const Case kCases[] = {
    {"seekable fixed blocks", {}},
    {"seekable uneven blocks", {.sizes = {1, 4096, 333, 2048, 7}}},
    {"not seekable", {.canSeek = false}},
    {"pre-roll covers settling", {.preRoll = 3000, .settle = 2500}},
    {"seeks land late", {.sizes = {500}, .lateBlocks = 2}},
    {"seeks land far too late", {.sizes = {64}, .lateBlocks = 400}},
    {"blocks without positions", {.unknownStarts = true}},
    {"one-frame blocks", {.length = 300, .sizes = {1}}},
};

TEST(OutsideDecoderPositioning, EveryStartReadsAsFromTheStart) {
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    Counters counters;
    auto decoder = Make(c.script, counters);
    const std::int64_t length = c.script.length;
    ExpectFrames(*decoder, 0, length, length);  // whole, from the start
    // Backwards, forwards, near and far, block edges and the end.
    const std::int64_t starts[] = {length - 1, 0,    1,    1151, 1152,   1153,       5000,
                                   4999,       2,    9000, 300,  length, length + 5, 7,
                                   length / 2, 6000, 6001, 6500, 3};
    for (std::int64_t start : starts) {
      ExpectFrames(*decoder, start, 777, length);
      if (HasFatalFailure()) return;
    }
    if (!c.script.canSeek) {
      EXPECT_EQ(counters.seeks, 0);
    }
  }
}

TEST(OutsideDecoderPositioning, ExhaustiveSmallStream) {
  // Every start and every count in a 40-frame stream of 3-frame blocks,
  // with and without seeking, each read after a read somewhere else.
  for (bool canSeek : {true, false}) {
    Script script{.length = 40, .sizes = {3}, .canSeek = canSeek};
    Counters counters;
    auto decoder = Make(script, counters);
    for (std::int64_t start = 0; start <= 41; ++start)
      for (std::int64_t frames = 0; frames <= 12; ++frames) {
        ExpectFrames(*decoder, (start * 7) % 40, 2, 40);
        ExpectFrames(*decoder, start, frames, 40);
        if (HasFatalFailure()) return;
      }
  }
}

TEST(OutsideDecoderPositioning, ReadingOnNeverSeeks) {
  Counters counters;
  auto decoder = Make({.length = 50000, .sizes = {1000}}, counters);
  std::vector<std::int32_t> block(333);
  std::int64_t at = 0;
  while (std::int64_t n = decoder->Decode(block.data(), 333).AsLongLong()) {
    ASSERT_EQ(block[0], at + 1);
    at += n;
    decoder->Seek(at);  // where it is already: no seek
  }
  EXPECT_EQ(at, 50000);
  EXPECT_EQ(counters.seeks, 0);
  EXPECT_EQ(counters.restarts, 0);
}

TEST(OutsideDecoderPositioning, CountFramesThenReadAgain) {
  Counters counters;
  auto decoder = Make({.length = 12345, .sizes = {1024}}, counters);
  EXPECT_EQ(decoder->CountFrames(), SampleCount(12345));
  EXPECT_EQ(decoder->GetPosition(), SampleCount(12345));
  ExpectFrames(*decoder, 100, 50, 12345);
}

TEST(OutsideDecoderFailures, ConverterErrorsBecomeTarnErrorsNamingTheFile) {
  Counters counters;
  auto decoder = Make({.length = 5000, .sizes = {100}, .failAt = 2500}, counters);
  std::vector<std::int32_t> block(5000);
  try {
    (void)decoder->Decode(block.data(), 5000);
    FAIL() << "no error";
  } catch (const TarnError& error) {
    EXPECT_EQ(error.GetIntErrorCode(), OutsideDecoder::kDecodeErr);
    ASSERT_TRUE(error.GetAttachment().has_value());
    EXPECT_NE(error.GetAttachment()->utf8_str().find("scripted.mp3"), std::string::npos);
  }
  EXPECT_THROW(decoder->Seek(-1), TarnError);
  EXPECT_THROW(OutsideDecoder(FileSpecification(UString("/x.mp3")), nullptr), TarnError);
}

}  // namespace
}  // namespace tarn::test
