// Streams: the wire format with exact bytes, the reading rules, chunks and
// length blocks; a record through every kind of stream, cut at every byte,
// piped between threads; and what is particular to files, handles, memory.

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <fstream>
#include <iterator>
#include <memory>
#include <ostream>
#include <string>
#include <thread>
#include <utility>

#include "StreamTestSupport.h"
#include "tarn/FileSystem/File.h"
#include "tarn/Streams/LengthIO.h"
#include "tarn/Streams/StreamChunk.h"
#include "tarn/Streams/UStringIO.h"

namespace tarn {
namespace {

using test::Bytes;
using test::CodeOf;
using test::Hex;

constexpr int kPrefs = 0x50524546;  // 'PREF'

void PutRecord(CStream& s) {
  for (const test::Field& f : test::Record()) test::Run(s, f, false);
}
void CheckRecord(CStream& s) {
  for (const test::Field& f : test::Record()) EXPECT_EQ(test::Run(s, f, true), 0) << f.name;
}
// The error code of reading a record that `s` holds only part of.
int CodeReadingRecord(CStream& s) {
  return CodeOf([&] {
    for (const test::Field& f : test::Record()) (void)test::Run(s, f, true);
  });
}

TEST(CStreamEncoding, ExactBytes) {
  for (const test::Field& f : test::Record())
    EXPECT_EQ(test::ImageOf([&](CStream& s) { test::Run(s, f, false); }), Hex(f.hex)) << f.name;
  auto_handle<char> xyz(NewHandle(3));
  std::memcpy(xyz.data(), "xyz", 3);
  EXPECT_EQ(CodeOf([&] { test::ImageOf([&](CStream& s) { s.PutHandleOfSize(xyz.get(), 4); }); }),
            -50);
  const UString cafe = test::WithChar("caf", 0xE9);  // in the ANSI code page
  EXPECT_EQ(test::ImageOf([&](CStream& s) {
              s.PutStr("ab");
              s.PutStr255AsLine(reinterpret_cast<const unsigned char*>("\3abcX"));
              s.PutHandleOfSize(xyz.get(), 2);
              PutUStringAsCharArray(s, cafe);
              PutUStringAsStr(s, test::WithChar("a", 0x2603));  // not in it
              PutUStringAsStr255(s, cafe);
              PutUStringAsFixedSizeUCharArray(s, 4, cafe);
              PutUStringAsFixedSizeUCharArray(s, 8, cafe);
            }),
            Hex("616200 03616263 0D 7879 636166E9 613F00 04636166E9 02636100 "
                "04636166E9000000"));
  EXPECT_EQ(test::ImageOf([](CStream& s) {
              LengthWriter(s, false).PatchWithNum(-2);
              LengthWriter len(s, false);
              s.PutCharArray("0123", 4);
              len.PatchLength();
              s.PutChar('!');
              LengthWriter own(s, true);
              { StreamChunkWriter w(s, kPrefs, StreamChunkVers(2, 3)); }
              StreamChunkWriter w(s, kPrefs);  // the named default version, 1.1
              s.PutShort(2);
              StreamChunkVers(-1, 258).put(s);
            }),
            Hex("FFFFFFFE 00000004 30313233 21 0000002A 7C970F1A 50524546 0002 0003 00000000 "
                "7C970F1A 50524546 0001 0001 00000006 0002 FFFF 0102"));
}

TEST(CStreamReading, Failures) {
  UString u("x");
  unsigned char buf[256];
  test::TempPath missing("missing");
  const auto missingFile = [&] { return CFileStream(missing.Spec()); };
  const struct {
    const char* name;
    Bytes input;
    test::Action read;
    int code;
  } rows[] = {
      {"text count past the data", Hex("00000005 6162"), [&](CStream& s) { s.GetUString(u); }, -39},
      {"handle past the data", Hex("7FFFFFFF 0102"), [](CStream& s) { (void)s.GetHandle(); }, -39},
      {"negative handle count", Hex("FFFFFFFE"), [](CStream& s) { (void)s.GetHandle(); }, -50},
      {"no number text", {}, [](CStream& s) { (void)s._GetDouble(); }, CStream::kNoNumberText},
      {"any non-zero byte is true", Hex("02"), [](CStream& s) { EXPECT_TRUE(s.GetBoolean()); }, 0},
      {"negative text count", Hex("FFFFFFFF"), [&](CStream& s) { s.GetUString(u); }, 0},
      {"number text, no NUL", test::Text("12."), [](CStream& s) { (void)s._GetDouble(); }, -39},
      {"line too long", test::Text(std::string(300, 'q') + "\r"),
       [&](CStream& s) { s.GetLineAsStr255(buf); }, CStream::kLineTooLong},
      {"move past the end", Hex("0102"), [](CStream& s) { s.MoveTo(3); }, 6},
      {"chunk without magic", Hex("7C970F1B 00000000 00000000 00000000"),
       [](CStream& s) { StreamChunkReader r(s); }, 103},
      {"length including itself below 4", Hex("00000002 61626364"),
       [](CStream& s) { LengthReader len(s, true); }, 6},
      {"length past the data", Hex("00000009 61626364"),
       [](CStream& s) { LengthReader(s, false).SkipRemainingData(); }, 6},
      {"closed handle stream", {}, [](CStream&) { CHandleStream().PutLong(1); }, -38},
      {"closed file stream", {}, [&](CStream&) { (void)missingFile().GetLong(); }, -38},
      {"missing file", {}, [&](CStream&) { missingFile().Open(kTCLReadWriteMode); }, -5000},
  };
  for (const auto& row : rows) {
    test::Reader s(row.input);
    EXPECT_EQ(CodeOf([&] { row.read(s); }), row.code) << row.name;
  }
  EXPECT_TRUE(u.empty()) << "a negative count reads as empty";
}

// What a text reader left: the characters it stored, its error code, and the
// stream's position. Every reader writes into a heap buffer of exactly the
// size its contract names, so the sanitizers see a single byte too many.
struct TextRead {
  std::string text;
  int code = 0;
  std::int64_t position = 0;
  bool operator==(const TextRead&) const = default;
};
std::ostream& operator<<(std::ostream& os, const TextRead& r) {
  return os << "\"" << r.text << "\" code " << r.code << " at " << r.position;
}
using TextReader = std::function<std::string(CStream&)>;

TextRead ReadText(CStream& s, const TextReader& read) {
  TextRead r;
  r.code = CodeOf([&] { r.text = read(s); });
  r.position = s.Position();
  return r;
}
TextRead ReadText(const Bytes& input, const TextReader& read) {
  test::Reader s(input);
  return ReadText(s, read);
}
TextRead Expect(std::string text, int code, std::size_t position) {
  return {std::move(text), code, static_cast<std::int64_t>(position)};
}

std::string Pascal(const unsigned char* p) {
  return std::string(reinterpret_cast<const char*>(p + 1), p[0]);
}
std::string Decoded(const UString& s) { return s.string(UString::kSystemEncoding); }

TextReader Str255() {
  return [](CStream& s) {
    auto buffer = std::make_unique<unsigned char[]>(256);
    s.GetStr255(buffer.get());
    return Pascal(buffer.get());
  };
}
TextReader LimitedStr255(short max) {
  return [max](CStream& s) {
    auto buffer = std::make_unique<unsigned char[]>(max > 0 ? static_cast<std::size_t>(max) : 0);
    s.GetLimitedStr255(buffer.get(), max);
    return max > 0 ? Pascal(buffer.get()) : std::string();
  };
}
TextReader Line() {
  return [](CStream& s) {
    auto buffer = std::make_unique<unsigned char[]>(256);
    s.GetLineAsStr255(buffer.get());
    return Pascal(buffer.get());
  };
}
TextReader Str(int max) {  // what is left of the buffer's '#' fill is part of the text
  return [max](CStream& s) {
    auto buffer = std::make_unique<char[]>(static_cast<std::size_t>(max));
    std::memset(buffer.get(), '#', static_cast<std::size_t>(max));
    s.GetStr(buffer.get(), max);
    return std::string(buffer.get(), std::find(buffer.get(), buffer.get() + max, '\0'));
  };
}
TextReader AsUString(const std::function<void(CStream&, UString&)>& get) {
  return [=](CStream& s) {
    UString u("not read");
    get(s, u);
    return Decoded(u);
  };
}
TextReader AsUString(void (*get)(CStream&, int, UString&), int n) {
  return AsUString([=](CStream& s, UString& u) { get(s, n, u); });
}
TextReader LimitedStr255AsUString(short max) {
  return [max](CStream& s) {
    UString u("not read");
    GetLimitedStr255AsUString(s, u, max);
    return Decoded(u);
  };
}

// "abc...", `n` characters.
std::string Letters(std::size_t n) {
  std::string text(n, ' ');
  for (std::size_t i = 0; i < n; ++i) text[i] = static_cast<char>('a' + i % 26);
  return text;
}
Bytes Concat(const Bytes& a, const std::string& b) {
  Bytes out = a;
  out.insert(out.end(), b.begin(), b.end());
  return out;
}

// Stored lengths against limits below, at and above them; the byte after the
// string tells whether the reader took one too many.
TEST(CStreamTextReaders, PascalStringsAtEveryLimit) {
  const short limits[] = {-1, 0, 1, 2, 3, 4, 5, 6, 254, 255, 256, 257, 300};
  for (std::size_t stored : {0, 1, 2, 3, 4, 5, 253, 254, 255}) {
    SCOPED_TRACE(testing::Message() << "stored " << stored);
    const std::string text = Letters(stored);
    const Bytes input = Concat({static_cast<unsigned char>(stored)}, text + "!");
    EXPECT_EQ(ReadText(input, Str255()), Expect(text, 0, 1 + stored));
    EXPECT_EQ(ReadText(input, AsUString(GetStr255AsUString)), Expect(text, 0, 1 + stored));
    for (short max : limits) {
      SCOPED_TRACE(testing::Message() << "max " << max);
      const std::size_t kept = max <= 0 ? 0 : std::min<std::size_t>(stored, max - 1);
      const std::size_t end = max <= 0 ? 0 : 1 + kept;
      EXPECT_EQ(ReadText(input, LimitedStr255(max)), Expect(text.substr(0, kept), 0, end));
      const std::size_t asUString = std::min<std::size_t>(kept, 255);  // max taken as 256 at most
      EXPECT_EQ(ReadText(input, LimitedStr255AsUString(max)),
                Expect(text.substr(0, asUString), 0, max <= 0 ? 0 : 1 + asUString));
    }
    if (stored == 0) continue;
    const Bytes cut(input.begin(), input.begin() + static_cast<std::ptrdiff_t>(stored));
    EXPECT_EQ(ReadText(cut, Str255()).code, -39) << "one character missing";
    EXPECT_EQ(ReadText(cut, LimitedStr255(256)).code, -39) << "one character missing";
  }
  EXPECT_EQ(ReadText(Bytes{}, Str255()).code, -39);
  EXPECT_EQ(ReadText(Bytes{}, LimitedStr255(1)).code, -39);
  EXPECT_EQ(ReadText(Bytes{}, LimitedStr255(0)), Expect("", 0, 0));
}

// A carriage return at every position of a 300-byte text, and texts that end
// without one: up to 254 characters before it, or the data's end, are a line.
TEST(CStreamTextReaders, LinesWithACarriageReturnAtEveryPosition) {
  for (std::size_t cr = 0; cr <= 300; ++cr) {
    std::string text = Letters(300);
    if (cr < 300) text[cr] = '\r';
    const TextRead expected =
        cr <= 254 ? Expect(text.substr(0, cr), 0, cr + 1) : Expect("", CStream::kLineTooLong, 255);
    EXPECT_EQ(ReadText(test::Text(text), Line()), expected) << "CR at " << cr;
  }
  for (std::size_t n : {0, 1, 2, 253, 254}) {
    const std::string text = Letters(n);
    EXPECT_EQ(ReadText(test::Text(text), Line()), Expect(text, 0, n)) << "no CR, " << n;
  }
  EXPECT_EQ(ReadText(test::Text(Letters(255)), Line()).code, CStream::kLineTooLong);
  EXPECT_EQ(ReadText(test::Text("\r\rab\r"),
                     [](CStream& s) {
                       std::string lines;
                       for (int i = 0; i < 3; ++i) lines += Line()(s) + "|";
                       return lines;
                     }),
            Expect("||ab|", 0, 5));
}

// A NUL at every position (or none) against every limit from 0 to one past
// the data: the text and the NUL when both fit, `max` bytes when they do
// not, -39 when the data end first.
TEST(CStreamTextReaders, NulTerminatedStringsAtEveryLimit) {
  for (std::size_t nul = 0; nul <= 6; ++nul) {
    const std::string text = Letters(nul);
    const Bytes input =
        nul < 6 ? Concat(test::Text(text), std::string(1, '\0') + "XY") : test::Text(text);
    for (int max = 0; max <= 9; ++max) {
      SCOPED_TRACE(testing::Message() << "NUL at " << nul << ", max " << max);
      const auto m = static_cast<std::size_t>(max);
      TextRead expected = Expect(text, 0, nul + 1);
      if (nul >= m) expected = Expect(text.substr(0, m), 0, m);
      if (nul == 6 && m > 6) expected = Expect("", -39, 6);
      EXPECT_EQ(ReadText(input, Str(max)), expected);
    }
  }
  const TextReader str = AsUString(GetStrAsUString);
  for (std::size_t n : {0, 1, 999, 1000, 1001}) {
    const std::string text = Letters(n);
    const std::size_t kept = std::min<std::size_t>(n, 1000);
    EXPECT_EQ(ReadText(Concat(test::Text(text), std::string(2, '\0')), str),
              Expect(text.substr(0, kept), 0, n < 1000 ? n + 1 : 1000))
        << n;
  }
  EXPECT_EQ(ReadText(test::Text("ab"), str).code, -39) << "no NUL";
  EXPECT_EQ(ReadText(Hex("E9 00"), str), Expect("\xE9", 0, 2)) << "decoded from ANSI";
}

// Fields of every small size holding every small stored length: the length
// is cut to the field, the stream always moves by the field's size.
TEST(UStringIO, FixedFieldsAndArraysAtEveryLimit) {
  for (int size = -1; size <= 7; ++size) {
    for (int stored = 0; stored <= 8; ++stored) {
      SCOPED_TRACE(testing::Message() << "size " << size << ", stored " << stored);
      const std::size_t field = size > 0 ? static_cast<std::size_t>(size) : 0;
      const std::size_t kept = field == 0 ? 0 : std::min<std::size_t>(stored, field - 1);
      const Bytes input = Concat({static_cast<unsigned char>(stored)}, Letters(10));
      EXPECT_EQ(ReadText(input, AsUString(GetFixedSizeUCharArrayAsUString, size)),
                Expect(Letters(kept), 0, field));
      if (size < 0 || size == 7) continue;
      // Written for the same field size: at most size - 2 characters survive.
      const std::string text = Letters(static_cast<std::size_t>(stored));
      const Bytes image = test::ImageOf(
          [&](CStream& s) { PutUStringAsFixedSizeUCharArray(s, size, UString(text.c_str())); });
      ASSERT_EQ(image.size(), field);
      const std::size_t fits = size < 2 ? 0 : std::min<std::size_t>(stored, field - 2);
      EXPECT_EQ(ReadText(image, AsUString(GetFixedSizeUCharArrayAsUString, size)),
                Expect(text.substr(0, fits), 0, field));
    }
  }
  const Bytes input = test::Text("\xE9xb");
  for (int count = -1; count <= 3; ++count) {
    SCOPED_TRACE(count);
    const std::size_t n = count > 0 ? static_cast<std::size_t>(count) : 0;
    const TextRead expected = Expect(std::string("\xE9xb", n), 0, n);
    EXPECT_EQ(ReadText(input, AsUString(GetCharArrayAsUString, count)), expected);
    EXPECT_EQ(ReadText(input, AsUString(GetUCharArrayAsUString, count)), expected);
  }
  EXPECT_EQ(ReadText(input, AsUString(GetCharArrayAsUString, 4)).code, -39);
  EXPECT_EQ(ReadText(input, AsUString(GetUCharArrayAsUString, 4)).code, -39);
  EXPECT_EQ(ReadText(test::Text("\x02\xE9"), AsUString(GetFixedSizeUCharArrayAsUString, 3)).code,
            -39);
}

// Pascal strings written from UString: cut to 255 bytes, read back intact.
TEST(UStringIO, Str255RoundTripsCutAt255) {
  for (std::size_t n : {0, 1, 254, 255, 256, 300}) {
    const std::string text = Letters(n);
    const Bytes image = test::ImageOf([&](CStream& s) { PutUStringAsStr255(s, UString(text)); });
    const std::size_t kept = std::min<std::size_t>(n, 255);
    ASSERT_EQ(image.size(), 1 + kept);
    EXPECT_EQ(ReadText(image, AsUString(GetStr255AsUString)),
              Expect(text.substr(0, kept), 0, 1 + kept));
  }
}

// Against a chunk of version 2.3: too old when the reader's major is above 2,
// too new when the reader's version is below 2.3.
TEST(StreamChunk, VersionDecisionsOverAGrid) {
  test::Reader s(Hex("7C970F1A 50524546 0002 0003 00000000"));
  StreamChunkReader r(s);
  EXPECT_EQ(r.GetVers(), StreamChunkVers(2, 3));
  for (short major = 1; major <= 3; ++major) {
    for (short minor = 0; minor <= 9; ++minor) {
      SCOPED_TRACE(testing::Message() << major << "." << minor);
      const StreamChunkVers v(major, minor);
      const bool tooOld = major > 2;
      const bool tooNew = std::pair(major, minor) < std::pair<short, short>(2, 3);
      EXPECT_EQ(v < StreamChunkVers(2, 3), tooNew);
      EXPECT_EQ(std::pair(r.IsTooOld(v), r.IsTooNew(v)), std::pair(tooOld, tooNew));
      bool old = !tooOld, young = !tooNew;
      r.GetAge(v, old, young);
      EXPECT_EQ(std::pair(old, young), std::pair(tooOld, tooNew));
      EXPECT_EQ(r.ShouldRead(v), !tooOld && !tooNew);
      const int code = tooOld ? -1001 : tooNew ? -1002 : 0;
      EXPECT_EQ(CodeOf([&] { r.FailIfCantRead(v, -1001, -1002); }), code);
    }
  }
}

// A newer writer adds a nested chunk, a length block and trailing fields; an
// old reader that reads only the first field still lands on the next record.
TEST(StreamChunk, UnreadDataAndNestedChunksAreSkipped) {
  CHandleStream s(kTCLReadWriteMode);
  for (int record = 0; record < 3; ++record) {
    StreamChunkWriter outer(s, kPrefs, StreamChunkVers(1, 4));
    s.PutLong(record);
    {
      StreamChunkWriter inner(s, kPrefs, StreamChunkVers(7, 0));
      s.PutUString(UString("inner text"));
    }
    LengthWriter len(s, true);
    s.PutLong(1);
    s.PutIEEEDouble(0.5);
  }
  s.PutLong(-7);
  s.MoveTo(0);
  for (int record = 0; record < 3; ++record) {
    ASSERT_TRUE(StreamChunkReader::HasMagic(s));
    StreamChunkReader outer(s);
    EXPECT_EQ(s.GetLong(), record);
  }
  EXPECT_FALSE(StreamChunkReader::HasMagic(s));
  EXPECT_EQ(s.GetLong(), -7);
  s.MoveTo(66 + 50);
  {
    LengthReader len(s, true);
    EXPECT_EQ(len.GetLength(), 16);
    EXPECT_EQ(s.GetLong(), 1);
  }
  EXPECT_EQ(s.Position(), 66 + 66);
}

TEST(StreamChunk, TruncatedChunksFailAndReadersNeverThrowOnExit) {
  const Bytes image = Hex("7C970F1A 50524546 0001 0001 00000004 11223344");
  for (std::size_t cut = 0; cut < image.size(); ++cut) {
    test::Reader s(Bytes(image.begin(), image.begin() + static_cast<std::ptrdiff_t>(cut)));
    EXPECT_EQ(CodeOf([&] {
                StreamChunkReader r(s);  // its destructor runs during the unwinding
                (void)s.GetLong();
              }),
              -39)
        << cut;
  }
}

class EveryStream : public ::testing::TestWithParam<const char*> {};

TEST_P(EveryStream, RecordsLongArraysAndALongTextRoundTrip) {
  test::Channel channel(GetParam());
  std::vector<int> longs(1000);
  for (int i = 0; i < 1000; ++i) longs[static_cast<std::size_t>(i)] = i * 65537 - 7;
  std::string text(70000, 'a');
  for (std::size_t i = 0; i < text.size(); ++i) text[i] = static_cast<char>('a' + i % 26);
  for (int i = 0; i < 100; ++i) PutRecord(channel.Out());
  channel.Out().PutLongArray(longs.data(), 1000);
  channel.Out().PutUString(UString(text));
  channel.Out().PutShort(0x1234);
  CStream& in = channel.In();
  for (int i = 0; i < 100; ++i) CheckRecord(in);
  std::vector<int> back(1000);
  in.GetLongArray(back.data(), 1000);
  EXPECT_EQ(back, longs);
  UString cutText;
  in.GetUString(cutText);
  EXPECT_EQ(cutText.utf8_str(), text.substr(0, 65535)) << "cut, and the rest skipped";
  EXPECT_EQ(in.GetShort(), 0x1234);
  EXPECT_TRUE(in.AtEnd()) << "every byte read, none left";
}

// The readers built on GetThruN, over every kind of stream; a 5-byte file
// buffer puts the terminators on both sides of a buffer boundary.
TEST_P(EveryStream, TextReadersStopAtTheirTerminators) {
  test::Channel channel(GetParam());
  std::string data;
  for (std::size_t n : {0, 1, 3, 4, 5, 6, 9, 254}) data += Letters(n) + '\r';
  for (std::size_t n : {0, 4, 5, 9}) data += Letters(n) + '\0';
  data += Letters(300) + '\r';
  channel.Out().PutCharArray(data.data(), static_cast<int>(data.size()));
  CStream& in = channel.In();
  std::int64_t position = 0;
  for (std::size_t n : {0, 1, 3, 4, 5, 6, 9, 254}) {
    EXPECT_EQ(ReadText(in, Line()), Expect(Letters(n), 0, position += n + 1));
  }
  for (std::size_t n : {0, 4, 5, 9}) {
    EXPECT_EQ(ReadText(in, Str(10)), Expect(Letters(n), 0, position += n + 1));
  }
  EXPECT_EQ(ReadText(in, Line()).code, CStream::kLineTooLong);
}

// Pointers come back within the process; a file keeps 8 zero bytes instead.
TEST_P(EveryStream, PointersComeBackExceptFromFiles) {
  test::Channel channel(GetParam());
  int x = 0;
  channel.Out().PutPointer(&x);
  channel.Out().PutShort(7);
  CStream& in = channel.In();
  EXPECT_EQ(in.GetPointer(), std::string(GetParam()).starts_with("File") ? nullptr : &x);
  EXPECT_EQ(in.GetShort(), 7);
}

INSTANTIATE_TEST_SUITE_P(Kinds, EveryStream, ::testing::ValuesIn(test::kChannelKinds),
                         [](const auto& info) { return std::string(info.param); });

// Every proper prefix of the record, through a handle stream and (every 7th)
// a file stream, fails with end of file; nothing at all where a number text
// starts is "no number text".
TEST(Truncation, EveryCutOfARecordFailsWithEndOfFile) {
  const Bytes image = test::ImageOf(PutRecord);
  std::vector<int> expected(image.size(), -39);
  std::size_t start = 0;
  for (const test::Field& f : test::Record()) {
    if (std::string(f.name).starts_with("number")) expected[start] = CStream::kNoNumberText;
    start += Hex(f.hex).size();
  }
  for (std::size_t cut = 0; cut < image.size(); ++cut) {
    const Bytes part(image.begin(), image.begin() + static_cast<std::ptrdiff_t>(cut));
    test::Reader s(part);
    ASSERT_EQ(CodeReadingRecord(s), expected[cut]) << "cut at " << cut;
    // A memory area reads zeros past its data, never outside (sanitizers check).
    PtrStream p(PtrStream::ReadOnly{}, part.data(), static_cast<std::int64_t>(cut));
    const int code = CodeReadingRecord(p);
    ASSERT_TRUE(code == 0 || code == -39 || code == CStream::kNoNumberText) << code;
    ASSERT_LE(p.Position(), static_cast<std::int64_t>(cut));
  }
}

TEST(PipedStream, TwoThreadsExchangeRecords) {
  PipedStream out;
  PipedStream in(out);
  std::thread writer([&] {
    for (int i = 0; i < 200; ++i) PutRecord(out);
  });
  for (int i = 0; i < 200; ++i) CheckRecord(in);
  writer.join();
}

TEST(PipedStream, ReadAfterTheWriterIsGoneFailsWithEndOfFile) {
  auto out = std::make_unique<PipedStream>();
  PipedStream in(*out);
  out->PutChar('x');
  EXPECT_GT(in.Size(), 1'000'000'000) << "unbounded while the writer lives";
  out.reset();
  EXPECT_EQ(in.Size(), 1);
  EXPECT_EQ(in.GetChar(), 'x');
  EXPECT_EQ(CodeOf([&] { (void)in.GetShort(); }), -39);
}

TEST(CFileStream, EditsInPlaceAcrossBuffersAndTruncates) {
  test::TempPath path("edit");
  CFileStream io(4);
  io.Open(File(path.Spec()).Open("w+b"), kTCLReadWriteMode);  // adopts an open file
  for (int i = 0; i < 10; ++i) io.PutLong(i);
  io.MoveTo(8);
  EXPECT_EQ(io.GetLong(), 2);
  io.PutLong(-3);  // overwrites element 3
  EXPECT_EQ(io.GetLong(), 4) << "a read right after a write";
  io.MoveTo(36);
  io.PutLong(99);
  io.PutShort(0x0102);  // extends the file
  EXPECT_EQ(CodeOf([&] { io.MoveTo(43); }), CStream::kPositionOutOfRange);
  EXPECT_EQ(CodeOf([&] { (void)io.GetLong(); }), -39);
  io.Close();
  std::ifstream file(path.path, std::ios::binary);
  const Bytes bytes((std::istreambuf_iterator<char>(file)), {});
  EXPECT_EQ(Bytes(bytes.begin() + 8, bytes.end()),
            Hex("00000002 FFFFFFFD 00000004 00000005 00000006 00000007 00000008 00000063 0102"));
}

TEST(CFileStream, SixtyFourBitPositions) {
  test::TempPath path("big");
  CFileStream s(path.Spec());
  s.Open(kTCLWriteMode);
  const std::int64_t far = (std::int64_t{1} << 32) + 12;
  s.Truncate(far);  // sparse on most file systems
  s.MoveTo(far);
  s.PutLong(0x0A0B0C0D);
  s.MoveTo(far);
  EXPECT_EQ(s.GetLong(), 0x0A0B0C0D);
  EXPECT_EQ(s.Size(), far + 4);
  s.Truncate(0);
}

// Buffer sizes changed between writes and reads, on a file and on a handle,
// never lose or reorder a byte; reopening starts again at 0.
TEST(CBufferedStream, ResizingTheBufferMidStreamKeepsTheData) {
  test::TempPath path("resize");
  CFileStream file(4);
  file.Open(File(path.Spec()).Open("w+b"), kTCLReadWriteMode);
  CHandleStream handle(kTCLReadWriteMode);
  const int sizes[] = {1, 3, 64, 2, 5};
  for (CBufferedStream* s : std::initializer_list<CBufferedStream*>{&file, &handle}) {
    for (int i = 0; i < 40; ++i) {
      s->PutShort(static_cast<short>(i * 257));
      if (i % 5 == 0) s->SetBufferSize(sizes[i / 5 % 5]);
    }
    EXPECT_EQ(CodeOf([&] { s->SetBufferSize(0); }), s == &file ? -50 : 0);
    s == &file ? file.Open(kTCLReadMode) : (handle.Close(), handle.Open(kTCLReadMode));
    EXPECT_EQ(s->Position(), 0);
    for (int i = 0; i < 40; ++i) {
      ASSERT_EQ(s->GetShort(), static_cast<short>(i * 257)) << i;
      if (i % 5 == 2) s->SetBufferSize(sizes[i / 5 % 5]);
    }
    EXPECT_TRUE(s->AtEnd());
  }
  EXPECT_EQ(CodeOf([&] { handle.SetBlockSize(0); }), -50);
  handle.DisposeAll();
  EXPECT_EQ(CodeOf([&] { (void)handle.GetShort(); }), -38) << "closed";
}

TEST(CHandleStream, GrowsTrimsAndTruncatesWithZerosInTheCallersHandle) {
  auto_handle<char> h(NewHandle(4));
  std::memcpy(h.data(), "\0\0\0\x2A", 4);
  {
    CHandleStream s(h.get(), kTCLReadWriteMode, 2);
    EXPECT_EQ(s.GetLong(), 42);
    for (int i = 0; i < 3000; ++i) s.PutShort(static_cast<short>(i));
    EXPECT_EQ(GetHandleSize(h.get()), 6004u) << "trimmed to the data";
    EXPECT_EQ(CodeOf([&] { (void)s.DetachHandle(); }), -50) << "not the stream's own";
    s.Truncate(6);
    s.Truncate(9);
  }
  EXPECT_EQ(Bytes(h.data(), h.data() + h.size()), Hex("0000002A 0000 000000")) << "zeros";
}

TEST(PtrStream, TruncatesAndReopensAtZero) {
  const unsigned char area[6] = {1, 2, 3, 4, 5, 6};
  PtrStream s(PtrStream::ReadOnly{}, area, 6);
  s.MoveTo(5);
  s.Truncate(8);
  EXPECT_EQ(s.Size(), 6);
  EXPECT_EQ(s.Position(), 5);
  s.Truncate(3);
  EXPECT_EQ(s.Size(), 3);
  EXPECT_EQ(s.Position(), 3);
  s.Open(kTCLReadMode);
  EXPECT_EQ(s.GetShort(), 0x0102);
  EXPECT_EQ(s.GetShort(), 0) << "one byte left";
  EXPECT_EQ(s.GetChar(), 3);
}

TEST(PtrStream, IgnoresWhatDoesNotFit) {
  unsigned char area[4] = {9, 9, 9, 9};
  PtrStream s(area, 4);
  s.PutLong(0x01020304);
  s.MoveTo(2);
  s.PutLong(0x0A0B0C0D);  // would pass the capacity
  EXPECT_EQ(s.Position(), 2);
  EXPECT_EQ(Bytes(area, area + 4), Hex("01020304"));
  s.MoveTo(9);
  EXPECT_EQ(s.Position(), 2) << "a move outside is ignored";
  EXPECT_EQ(s.GetLong(), 0) << "a read past the data yields 0";
  EXPECT_EQ(s.GetShort(), 0x0304);
}

}  // namespace
}  // namespace tarn
