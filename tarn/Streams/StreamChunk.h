#pragma once
// Versioned, length-prefixed chunks of serialised data.
//
// A chunk is 16 bytes of envelope and its data, all big-endian:
//   magic 0x7C970F1A (4), identifier (4), major (2), minor (2), length (4), data.
// StreamChunkWriter writes the envelope on construction and the length on
// destruction (not while an exception propagates). StreamChunkReader reads
// the envelope (a missing magic fails with 103) and, on destruction, moves
// past the chunk's data however much of it was read; its destructor never
// throws. Chunks nest: a writer inside another writer's data.
//
//   { StreamChunkWriter w(s, 'PREF', StreamChunkVers(2, 3)); s.PutLong(x); }
//   StreamChunkReader r(s);
//   r.FailIfCantRead(StreamChunkVers(2, 5), kTooOld, kTooNew);
//   if (r.MoreInChunk()) x = s.GetLong();

#include <cstdint>

#include "tarn/Streams/CStream.h"

namespace tarn {

inline constexpr int kStreamChunkMagic = 0x7C970F1A;
inline constexpr short kDefaultMajVers = 1;
inline constexpr short kDefaultMinVers = 1;

// A chunk's version, major then minor. Default-constructed it is 1.0, while
// the named default (kDefaultMajVers, kDefaultMinVers) is 1.1; both are kept
// for the data already written with them.
struct StreamChunkVers {
  short majorVersion = 1;
  short minorVersion = 0;

  constexpr StreamChunkVers() noexcept = default;
  constexpr StreamChunkVers(short major, short minor) noexcept
      : majorVersion(major), minorVersion(minor) {}

  friend constexpr bool operator==(const StreamChunkVers&, const StreamChunkVers&) = default;
  friend constexpr bool operator<(const StreamChunkVers& a, const StreamChunkVers& b) noexcept {
    return a.majorVersion != b.majorVersion ? a.majorVersion < b.majorVersion
                                            : a.minorVersion < b.minorVersion;
  }

  void put(CStream& stream) const;
  void get(CStream& stream);
};

class StreamChunkWriter {
 public:
  StreamChunkWriter(CStream& stream, int identifier,
                    StreamChunkVers version = StreamChunkVers(kDefaultMajVers, kDefaultMinVers));
  StreamChunkWriter(const StreamChunkWriter&) = delete;
  StreamChunkWriter& operator=(const StreamChunkWriter&) = delete;
  ~StreamChunkWriter() noexcept(false);

 private:
  CStream& stream_;
  std::int64_t dataStart_;
  int uncaught_;
};

class StreamChunkReader {
 public:
  explicit StreamChunkReader(CStream& stream);
  StreamChunkReader(const StreamChunkReader&) = delete;
  StreamChunkReader& operator=(const StreamChunkReader&) = delete;
  ~StreamChunkReader();

  // Whether the next 4 bytes are the magic; the position is unchanged.
  [[nodiscard]] static bool HasMagic(CStream& stream);

  [[nodiscard]] int GetID() const noexcept { return id_; }
  [[nodiscard]] StreamChunkVers GetVers() const noexcept { return vers_; }
  // The data length, read as an unsigned 32-bit count.
  [[nodiscard]] std::int64_t GetLen() const noexcept { return length_; }
  [[nodiscard]] bool MoreInChunk();

  // For a reader that understands `v`: too old when v's major version is
  // above the chunk's, too new when v is below the chunk's version.
  void GetAge(const StreamChunkVers& v, bool& tooOld, bool& tooNew) const noexcept;
  [[nodiscard]] bool IsTooOld(const StreamChunkVers& v) const noexcept;
  [[nodiscard]] bool IsTooNew(const StreamChunkVers& v) const noexcept;
  [[nodiscard]] bool ShouldRead(const StreamChunkVers& v) const noexcept;
  // FailOSErr(tooOldCode) when too old, else FailOSErr(tooNewCode) when too new.
  void FailIfCantRead(const StreamChunkVers& v, int tooOldCode, int tooNewCode) const;

 private:
  CStream& stream_;
  int id_ = 0;
  StreamChunkVers vers_;
  std::int64_t length_ = 0;
  std::int64_t dataStart_ = 0;
};

}  // namespace tarn
