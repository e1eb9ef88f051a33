#include "tarn/Basics/UUIDObj.h"

#include <gtest/gtest.h>

#include <set>
#include <vector>

#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CHandleStream.h"

namespace {

using namespace tarn;

const UUIDObj kSample(UString("00112233-4455-6677-8899-aabbccddeeff"));

TEST(UUIDObj, BytesEqualityAndText) {
  TarnCOM::UUIDBytes raw{};
  for (int i = 0; i < 16; ++i) raw.bytes[i] = std::uint8_t(i * 17);
  EXPECT_EQ(UUIDObj(raw), kSample);
  EXPECT_EQ(kSample.GetUUIDBytes().bytes[15], 0xff);
  EXPECT_TRUE(UUIDObj().IsClear() && UUIDObj(UString()).IsClear() && !kSample.IsClear());
  for (int i = 0; i < 16; ++i) {  // each byte takes part in equality
    TarnCOM::UUIDBytes one{};
    one.bytes[i] = 1;
    EXPECT_TRUE(!UUIDObj(one).IsClear() && UUIDObj(one) != UUIDObj()) << i;
  }
  EXPECT_EQ(kSample.GetString(), UString("00112233-4455-6677-8899-aabbccddeeff"));
  for (auto [text, ok] : {std::pair{"00112233-4455-6677-8899-aabbccddeeff", true},
                          {"00112233-4455-6677-8899-AABBCCDDEEFF", true},
                          {"{00112233-4455-6677-8899-aabbccddeeff}", true},
                          {"00112233-4455-6677-8899-aabbccddeef", false},
                          {"00112233-4455-6677-8899-aabbccddeeff0", false},
                          {"00112233_4455-6677-8899-aabbccddeeff", false},
                          {"0011223g-4455-6677-8899-aabbccddeeff", false},
                          {"{00112233-4455-6677-8899-aabbccddeeff", false}}) {
    try {
      EXPECT_TRUE(UUIDObj(UString(text)) == kSample && ok) << text;
    } catch (const TarnError& e) {
      EXPECT_TRUE(!ok && e.GetIntErrorCode() == kParamErr) << text;
    }
  }
}

TEST(UUIDObj, NewIdentifiersAreTimeBasedAndDistinct) {
  std::set<std::array<std::uint8_t, 16>> seen;
  for (int i = 0; i < 1000; ++i) {
    const UUIDObj u = UUIDObj::GetNewUUID();
    EXPECT_EQ(u.GetBytes()[6] >> 4, 1);  // version 1: time-based
    EXPECT_TRUE(seen.insert(u.GetBytes()).second);
    EXPECT_EQ(UUIDObj(u.GetString()), u);
  }
}

// Records are a version byte and the sixteen bytes; version 1 records carry
// two more bytes, skipped on reading. A short record throws and leaves the
// identifier unchanged.
TEST(UUIDObj, StreamRecords) {
  CHandleStream s(kTCLReadWriteMode);
  kSample.PutTo(s);
  s.PutLong(0x01020304);
  std::vector<unsigned char> bytes(21);
  s.MoveTo(0);
  s.GetRawDataFromStream(bytes.data(), 21);
  EXPECT_EQ(bytes, (std::vector<unsigned char>{2,    0x00, 0x11, 0x22, 0x33, 0x44, 0x55,
                                               0x66, 0x77, 0x88, 0x99, 0xaa, 0xbb, 0xcc,
                                               0xdd, 0xee, 0xff, 1,    2,    3,    4}));
  for (int version : {0, 1, 2, 3, 255}) {
    CHandleStream r(kTCLReadWriteMode);
    r.PutChar(char(version));
    for (std::uint8_t b : kSample.GetBytes()) r.PutChar(char(b));
    r.PutLong(0x77771234);
    r.MoveTo(0);
    UUIDObj u;
    u.GetFrom(r);
    EXPECT_EQ(u, kSample) << version;
    EXPECT_EQ(r.GetShort(), version == 1 ? 0x1234 : 0x7777) << version;
  }
  s.Truncate(5);
  s.MoveTo(0);
  UUIDObj u;
  EXPECT_THROW(u.GetFrom(s), TarnError);
  EXPECT_TRUE(u.IsClear());
}

}  // namespace
