#pragma once
// Helpers of the sound-file tests: byte images of chunked files (RIFF,
// Wave64, FORM) built chunk by chunk, AIFF payloads spelt out big-endian,
// known sample ramps, the chunk model, and the error a call throws.
// Scratch files and the host's programs come from TestSupport.h.

#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <functional>
#include <initializer_list>
#include <optional>
#include <string>
#include <vector>

#include "TestSupport.h"
#include "tarn/Audio/SoundFileFormats/IEEEExtended.h"
#include "tarn/Audio/SoundFileFormats/RIFFFileEditor.h"
#include "tarn/Audio/SoundFileFormats/RIFFFormatHandlers.h"
#include "tarn/Basics/RCBlobMT.h"
#include "tarn/Errors/TarnError.h"
#include "tarn/FileSystem/FileSpecification.h"

namespace tarn::test {

constexpr RIFFType T(const char (&code)[5]) { return MakeRIFFType(code); }

// `n` bytes of `v`, least significant first.
inline Bytes LE(std::uint64_t v, int n) {
  Bytes out;
  for (int i = 0; i < n; ++i) out.push_back(static_cast<std::uint8_t>(v >> (8 * i)));
  return out;
}
// `n` bytes of `v`, most significant first.
inline Bytes BE(std::uint64_t v, int n) {
  Bytes out;
  for (int i = n - 1; i >= 0; --i) out.push_back(static_cast<std::uint8_t>(v >> (8 * i)));
  return out;
}
inline Bytes Cat(std::initializer_list<Bytes> parts) {
  Bytes out;
  for (const auto& p : parts) out.insert(out.end(), p.begin(), p.end());
  return out;
}
inline Bytes Text(std::string_view text) { return Bytes(text.begin(), text.end()); }
// `count` bytes counting up from `seed`, so moved or mixed-up bytes show.
inline Bytes Pattern(std::size_t count, std::uint8_t seed = 1) {
  Bytes bytes(count);
  for (std::size_t i = 0; i < count; ++i) bytes[i] = static_cast<std::uint8_t>(seed + i * 7);
  return bytes;
}
inline Bytes Slice(const Bytes& b, std::size_t from, std::size_t to) {
  return Bytes(b.begin() + static_cast<std::ptrdiff_t>(from),
               b.begin() + static_cast<std::ptrdiff_t>(to));
}
inline std::uint32_t Get32(const Bytes& b, std::size_t at) {
  return std::uint32_t{b[at]} << 24 | std::uint32_t{b[at + 1]} << 16 |
         std::uint32_t{b[at + 2]} << 8 | b[at + 3];
}
inline Bytes BytesOf(const RCBlobMT& blob) {
  return Bytes(blob.GetPtr(), blob.GetPtr() + blob.GetSize());
}
inline RCBlobMT Blob(const Bytes& bytes) { return RCBlobMT(bytes.data(), bytes.size()); }

enum class Container { kRIFF, kFORM, kWave64 };
constexpr Container kContainers[] = {Container::kRIFF, Container::kFORM, Container::kWave64};

inline bool IsWave64(Container c) { return c == Container::kWave64; }
inline RIFFFileEndian EndianOf(Container c) {
  return c == Container::kFORM ? kRIFFBigEndian : kRIFFLittleEndian;
}
inline RIFFFileEditor::FormatHandler& HandlerOf(Container c) {
  if (c == Container::kFORM) return GetAIFFRIFFFormatHandler();
  return GetWaveRIFFFormatHandler();
}
inline RIFFType AudioTagOf(Container c) { return c == Container::kFORM ? T("SSND") : T("data"); }
inline int HeaderSizeOf(Container c) { return IsWave64(c) ? 24 : 8; }
inline const char* NameOf(Container c) {
  return c == Container::kRIFF ? "RIFF" : c == Container::kFORM ? "FORM" : "Wave64";
}

// One chunk of a built file. `size` overrides the size field (the payload
// length otherwise; in Wave64 the field adds the 24-byte header to either);
// `pad` false leaves out the pad bytes.
struct ChunkSpec {
  RIFFType tag;
  Bytes payload;
  std::optional<std::uint64_t> size = std::nullopt;
  bool pad = true;
};

inline void PutTag(Bytes& out, RIFFType tag, Container c) {
  if (IsWave64(c)) {
    const UUIDObj id = GetWaveRIFFFormatHandler().UUIDForTag(tag, true);
    out.insert(out.end(), id.GetBytes().begin(), id.GetBytes().end());
  } else {
    for (int shift = 24; shift >= 0; shift -= 8)
      out.push_back(static_cast<std::uint8_t>(tag >> shift));
  }
}
inline void PutSize(Bytes& out, std::uint64_t size, Container c) {
  const Bytes field = c == Container::kFORM ? BE(size, 4) : LE(size, IsWave64(c) ? 8 : 4);
  out.insert(out.end(), field.begin(), field.end());
}
inline std::size_t Padded(std::size_t n, Container c) {
  return IsWave64(c) ? (n + 7) / 8 * 8 : n + (n & 1);
}

// The image of one chunk, header and padded payload.
inline Bytes ChunkImage(const ChunkSpec& chunk, Container c) {
  Bytes out;
  PutTag(out, chunk.tag, c);
  PutSize(out, chunk.size.value_or(chunk.payload.size()) + (IsWave64(c) ? 24 : 0), c);
  out.insert(out.end(), chunk.payload.begin(), chunk.payload.end());
  if (chunk.pad) out.resize(out.size() + Padded(chunk.payload.size(), c) - chunk.payload.size());
  return out;
}

// A whole file: the container header with a correct size, then the chunks.
inline Bytes FileImage(const std::vector<ChunkSpec>& chunks, Container c) {
  Bytes body;
  for (const auto& chunk : chunks) {
    const Bytes image = ChunkImage(chunk, c);
    body.insert(body.end(), image.begin(), image.end());
  }
  Bytes out;
  const bool form = c == Container::kFORM;
  PutTag(out, form ? T("FORM") : T("RIFF"), c);
  PutSize(out, IsWave64(c) ? 24 + 16 + body.size() : 4 + body.size(), c);
  PutTag(out, form ? T("AIFF") : T("WAVE"), c);
  return Cat({out, body});
}

// ------------------------------------------------------------ AIFF payloads

// A "COMM" payload; with a compression type (AIFC) the type and an empty
// name follow.
inline Bytes Comm(std::int16_t channels, std::uint32_t frames, std::int16_t bits, double rate,
                  RIFFType compression = 0) {
  std::array<unsigned char, 10> ext{};
  double_to_ieee_80(rate, ext.data());
  Bytes out = Cat({BE(static_cast<std::uint16_t>(channels), 2), BE(frames, 4),
                   BE(static_cast<std::uint16_t>(bits), 2), Bytes(ext.begin(), ext.end())});
  return compression == 0 ? out : Cat({out, BE(compression, 4), BE(0, 2)});
}
// An "SSND" payload: offset, block size, `filler` bytes, then audio.
inline Bytes Ssnd(std::uint32_t offset, const Bytes& audio, std::uint32_t filler = 0) {
  return Cat({BE(offset, 4), BE(0, 4), Bytes(filler, 0xAB), audio});
}
// A whole FORM file of form type `form` with a correct container size.
inline Bytes FormImage(RIFFType form, const std::vector<ChunkSpec>& chunks) {
  Bytes image = FileImage(chunks, Container::kFORM);
  const Bytes type = BE(form, 4);
  std::copy(type.begin(), type.end(), image.begin() + 8);
  return image;
}
// The tag, offset and payload of every chunk of a FORM file, by a walk done
// here (not by the library).
struct WalkedChunk {
  RIFFType tag;
  std::size_t offset;
  Bytes payload;
};
inline std::vector<WalkedChunk> WalkForm(const Bytes& file) {
  std::vector<WalkedChunk> out;
  for (std::size_t pos = 12; pos + 8 <= file.size();) {
    const std::size_t size = Get32(file, pos + 4);
    out.push_back(
        {Get32(file, pos), pos, Slice(file, pos + 8, std::min(file.size(), pos + 8 + size))});
    pos += 8 + size + (size & 1);
  }
  return out;
}
inline std::size_t FindFormChunk(const Bytes& file, RIFFType tag) {
  for (const auto& chunk : WalkForm(file))
    if (chunk.tag == tag) return chunk.offset;
  return 0;
}
inline Bytes FormPayload(const Bytes& file, RIFFType tag) {
  for (auto& chunk : WalkForm(file))
    if (chunk.tag == tag) return chunk.payload;
  return {};
}

// Known samples for a file: the bytes as the file holds them, and each
// sample as a full-scale 32-bit integer (integer encodings) or as a double
// (floating point), in interleaved order.
struct Ramp {
  Bytes bytes;
  std::vector<std::int32_t> ints;
  std::vector<double> reals;
};
inline Ramp MakeRamp(int channels, int frames, int bits, bool lsbFirst, bool floating) {
  Ramp ramp;
  const int bytes = bits / 8;
  for (int k = 0; k < channels * frames; ++k) {
    std::uint64_t word = 0;
    if (floating) {
      // Multiples of 1/256 in [-0.5, 0.5): exact in every format and decoder.
      const double v = ((k * 37 + 11) % 256 - 128) / 256.0;
      ramp.reals.push_back(v);
      const float f = static_cast<float>(v);
      if (bits == 32)
        std::memcpy(&word, &f, 4);
      else
        std::memcpy(&word, &v, 8);
    } else {
      const std::uint32_t spread = static_cast<std::uint32_t>(k) * 2654435761u + 977u;
      const std::uint32_t top = spread & (bits == 32 ? 0xFFFFFFFFu : ~(0xFFFFFFFFu >> bits));
      ramp.ints.push_back(static_cast<std::int32_t>(top));
      word = top >> (32 - bits);
    }
    const Bytes sample = lsbFirst ? LE(word, bytes) : BE(word, bytes);
    ramp.bytes.insert(ramp.bytes.end(), sample.begin(), sample.end());
  }
  return ramp;
}

// ------------------------------------------------------------ chunk model

inline std::uint64_t SizeAt(const Bytes& b, std::size_t at, Container c) {
  std::uint64_t v = 0;
  const int n = IsWave64(c) ? 8 : 4;
  for (int i = 0; i < n; ++i)
    v |= std::uint64_t{b[at + i]} << (c == Container::kFORM ? 8 * (n - 1 - i) : 8 * i);
  return v;
}
inline std::uint64_t ContainerSize(const Bytes& b, Container c) {
  return SizeAt(b, IsWave64(c) ? 16 : 4, c);
}
inline std::size_t TopSize(Container c) { return IsWave64(c) ? 40 : 12; }

// A chunk's tag from its first bytes. Wave64 identifiers carry the tag in
// their first four bytes, lower case for the container's own "junk", "list".
inline RIFFType TagOf(const Bytes& image) {
  const RIFFType tag = Get32(image, 0);
  return tag == T("junk") ? T("JUNK") : tag == T("list") ? T("LIST") : tag;
}

struct RawChunk {
  Bytes image;         // header, payload and pad bytes (zeros where the file ends early)
  std::uint64_t size;  // payload length as its size field says
};
inline Bytes PayloadOf(const RawChunk& chunk, Container c) {
  return Slice(chunk.image, HeaderSizeOf(c), HeaderSizeOf(c) + chunk.size);
}

// The file as the test sees it: container header, chunks, and how many pad
// bytes the last chunk lacks at the end of the file.
struct Layout {
  Container c;
  Bytes top;
  std::vector<RawChunk> chunks;
  std::size_t missingPad = 0;
};

// The chunks of `file` by a walk of their headers done here (not by the
// library).
inline Layout Walk(const Bytes& file, Container c) {
  Layout out{c, Slice(file, 0, TopSize(c)), {}};
  const std::size_t header = HeaderSizeOf(c);
  for (std::size_t pos = TopSize(c); pos + header <= file.size();) {
    const std::uint64_t size =
        SizeAt(file, pos + header - (IsWave64(c) ? 8 : 4), c) - (IsWave64(c) ? 24 : 0);
    const std::size_t end = pos + header + Padded(size, c);
    RawChunk chunk{Slice(file, pos, std::min(end, file.size())), size};
    chunk.image.resize(end - pos);
    out.missingPad = end > file.size() ? end - file.size() : 0;
    out.chunks.push_back(std::move(chunk));
    pos = end;
  }
  return out;
}

// One line per chunk: tag, offset, padded length, and the identifier in Wave64.
inline std::string Describe(const RIFFFileEditor::ChunkList& list) {
  std::string out;
  for (const auto& [info, action] : list) {
    out += RIFFTypeToString(info.tag) + " @" + std::to_string(info.offset) + " +" +
           std::to_string(info.length);
    if (!info.uuid.IsClear()) {
      out += ' ';
      for (std::uint8_t b : info.uuid.GetBytes()) {
        out += "0123456789abcdef"[b >> 4];
        out += "0123456789abcdef"[b & 15];
      }
    }
    out += '\n';
  }
  return out;
}

// What the file must be after each edit, following the editor's rules: a
// chunk of the new tag and the same padded size is overwritten; one of
// another size (or one marked as junk) becomes "JUNK" before the audio and
// is cut after it; otherwise the chunk is appended and the container size
// rewritten. Stripping cuts what follows the audio, container size kept.
class ChunkModel {
 public:
  explicit ChunkModel(Layout layout) : l_(std::move(layout)) {}
  ChunkModel(const Bytes& file, Container c) : l_(Walk(file, c)) {}

  [[nodiscard]] Bytes Image() const {
    Bytes out = l_.top;
    for (const auto& chunk : l_.chunks)
      out.insert(out.end(), chunk.image.begin(), chunk.image.end());
    out.resize(out.size() - l_.missingPad);
    return out;
  }

  [[nodiscard]] RIFFFileEditor::ChunkList Listing() const {
    RIFFFileEditor::ChunkList list;
    auto offset = static_cast<std::int64_t>(TopSize(l_.c));
    for (const auto& chunk : l_.chunks) {
      const auto length = static_cast<std::int64_t>(chunk.image.size()) - HeaderSizeOf(l_.c);
      TarnCOM::UUIDBytes id{};
      if (IsWave64(l_.c)) std::copy_n(chunk.image.begin(), 16, id.bytes);
      list.push_back(
          {{TagOf(chunk.image), UUIDObj(id), offset, length}, RIFFFileEditor::kKeepSegment});
      offset += static_cast<std::int64_t>(chunk.image.size());
    }
    return list;
  }

  // The payload of the audio chunk.
  [[nodiscard]] Bytes Audio() const {
    for (const auto& chunk : l_.chunks)
      if (TagOf(chunk.image) == AudioTagOf(l_.c)) return PayloadOf(chunk, l_.c);
    return {};
  }

  // Returns whether the file's length and so its container size changed.
  bool Add(RIFFType tag, const Bytes& payload) {
    const Bytes image = ChunkImage({tag, payload}, l_.c);
    bool written = false, afterAudio = false;
    std::vector<RawChunk> kept;
    for (auto& chunk : l_.chunks) {
      const RIFFType was = TagOf(chunk.image);
      const bool marked =
          std::erase(junk_, static_cast<std::size_t>(&chunk - l_.chunks.data())) > 0;
      if (was == tag && chunk.image.size() == image.size()) {
        chunk = {image, payload.size()};
        written = true;
      } else if (was == tag || marked) {
        if (afterAudio) continue;
        RenameJunk(chunk);
      }
      afterAudio = afterAudio || was == AudioTagOf(l_.c);
      kept.push_back(chunk);
    }
    const bool cut = kept.size() < l_.chunks.size();
    l_.chunks = std::move(kept);
    junk_.clear();
    if (!written) {
      l_.chunks.push_back({image, payload.size()});
      l_.missingPad = 0;
    }
    if (cut || !written) FixContainerSize();
    return cut || !written;
  }

  // JunkChunk: the first chunk of `tag` and every marked chunk retire at
  // once, renamed "JUNK" before the audio and cut after it (the container
  // size rewritten then); false when no chunk has the tag.
  bool Junk(RIFFType tag) {
    const auto first = std::find_if(l_.chunks.begin(), l_.chunks.end(),
                                    [tag](const RawChunk& ch) { return TagOf(ch.image) == tag; });
    if (first == l_.chunks.end()) return false;
    junk_.push_back(static_cast<std::size_t>(first - l_.chunks.begin()));
    bool afterAudio = false;
    std::vector<RawChunk> kept;
    for (std::size_t i = 0; i < l_.chunks.size(); ++i) {
      RawChunk& chunk = l_.chunks[i];
      const bool marked = std::find(junk_.begin(), junk_.end(), i) != junk_.end();
      afterAudio = afterAudio || TagOf(chunk.image) == AudioTagOf(l_.c);
      if (marked && afterAudio) continue;
      if (marked) RenameJunk(chunk);
      kept.push_back(chunk);
    }
    const bool cut = kept.size() < l_.chunks.size();
    l_.chunks = std::move(kept);
    junk_.clear();
    if (cut) FixContainerSize();
    return true;
  }

  void MarkJunk(RIFFType tag) {
    for (std::size_t i = 0; i < l_.chunks.size(); ++i)
      if (TagOf(l_.chunks[i].image) == tag) return junk_.push_back(i);
  }

  void StripAfterAudio() {
    for (std::size_t i = 0; i + 1 < l_.chunks.size(); ++i)
      if (TagOf(l_.chunks[i].image) == AudioTagOf(l_.c)) {
        l_.chunks.resize(i + 1);
        l_.missingPad = 0;
        return;
      }
  }

  // The container size made right again (stripping leaves it as it was).
  void FixContainerSize() {
    Bytes field;
    PutSize(field, Image().size() - (IsWave64(l_.c) ? 0 : 8), l_.c);
    std::copy(field.begin(), field.end(), l_.top.begin() + (IsWave64(l_.c) ? 16 : 4));
  }

  [[nodiscard]] const Layout& layout() const { return l_; }

 private:
  void RenameJunk(RawChunk& chunk) const {
    // Wave64's published "junk" identifier, spelt out here.
    const Bytes junk = IsWave64(l_.c) ? Bytes{'j',  'u',  'n',  'k',  0xF3, 0xAC, 0xD3, 0x11,
                                              0x8C, 0xD1, 0x00, 0xC0, 0x4F, 0x8E, 0xDB, 0x8A}
                                      : Text("JUNK");
    std::copy(junk.begin(), junk.end(), chunk.image.begin());
  }

  Layout l_;
  std::vector<std::size_t> junk_;  // chunks marked by MaybeJunkSegment
};

// ------------------------------------------------------------ files, errors

// The error `action` throws (nullopt if it returns).
inline std::optional<TarnError> ErrorOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const TarnError& e) {
    return e;
  }
  return std::nullopt;
}
// The code of the error `action` throws; 1 if it returns.
inline int CodeOf(const std::function<void()>& action) {
  const auto error = ErrorOf(action);
  return error ? error->GetIntErrorCode() : 1;
}
// `action` throws an error of class `kind` with `code`.
inline void ExpectError(const std::function<void()>& action, const char* kind, int code) {
  const auto error = ErrorOf(action);
  ASSERT_TRUE(error) << "no error of " << kind;
  EXPECT_STREQ(error->GetKind().c_str(), kind);
  EXPECT_EQ(error->GetIntErrorCode(), code);
}

}  // namespace tarn::test
