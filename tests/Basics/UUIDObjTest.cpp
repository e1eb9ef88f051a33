#include "tarn/Basics/UUIDObj.h"

#include <gtest/gtest.h>

#include <set>
#include <vector>

#include "tarn/Errors/Fail.h"
#include "tarn/Streams/CHandleStream.h"

namespace {

using tarn::UString;
using tarn::UUIDObj;

const UUIDObj kSample(0x00, 0x11, 0x22, 0x33, 0x44, 0x55, 0x66, 0x77, 0x88, 0x99, 0xaa, 0xbb, 0xcc,
                      0xdd, 0xee, 0xff);

std::vector<unsigned char> StreamBytes(tarn::CStream& s) {
  const auto size = s.Size();
  std::vector<unsigned char> bytes(static_cast<std::size_t>(size));
  s.MoveTo(0);
  s.GetRawDataFromStream(bytes.data(), int(size));
  return bytes;
}

TEST(UUIDObj, ClearAndConstruction) {
  EXPECT_TRUE(UUIDObj().IsClear());
  EXPECT_FALSE(kSample.IsClear());
  tarn::TarnCOM::UUIDBytes raw{};
  for (int i = 0; i < 16; ++i) raw.bytes[i] = std::uint8_t(i * 17);
  const UUIDObj fromRaw(raw);
  EXPECT_EQ(fromRaw, kSample);
  const tarn::TarnCOM::UUIDBytes back = kSample.GetUUIDBytes();
  for (int i = 0; i < 16; ++i) EXPECT_EQ(back.bytes[i], i * 17);
  UUIDObj copy;
  copy = kSample;
  EXPECT_EQ(copy, kSample);
  // Each byte takes part in equality.
  for (int i = 0; i < 16; ++i) {
    tarn::TarnCOM::UUIDBytes one{};
    one.bytes[i] = 1;
    EXPECT_FALSE(UUIDObj(one).IsClear());
    EXPECT_NE(UUIDObj(one), UUIDObj());
  }
}

TEST(UUIDObj, TextFormMapsFieldsInReadingOrder) {
  const UUIDObj parsed(UString("00112233-4455-6677-8899-aabbccddeeff"));
  EXPECT_EQ(parsed, kSample);
  EXPECT_EQ(kSample.GetString(), UString("00112233-4455-6677-8899-aabbccddeeff"));
  EXPECT_EQ(UUIDObj(UString("00112233-4455-6677-8899-AABBCCDDEEFF")), kSample);
  EXPECT_EQ(UUIDObj(UString("{00112233-4455-6677-8899-aabbccddeeff}")), kSample);
  EXPECT_TRUE(UUIDObj(UString()).IsClear());
  // The Wave64 "riff" chunk identifier: first field 0x66666972 ("riff" little-endian).
  const UUIDObj riff(UString("66666972-912e-11cf-a5d6-28db04c10000"));
  EXPECT_EQ(riff.GetBytes()[0], 0x66);
  EXPECT_EQ(riff.GetBytes()[3], 0x72);
  EXPECT_EQ(riff.GetBytes()[4], 0x91);
  EXPECT_EQ(riff.GetBytes()[6], 0x11);
  EXPECT_EQ(riff.GetBytes()[8], 0xa5);
  EXPECT_EQ(riff.GetBytes()[15], 0x00);
}

TEST(UUIDObj, MalformedTextIsAParameterError) {
  for (const char* bad : {"00112233-4455-6677-8899-aabbccddeef",       // short
                          "00112233-4455-6677-8899-aabbccddeeff0",     // long
                          "00112233_4455-6677-8899-aabbccddeeff",      // no hyphen
                          "0011223g-4455-6677-8899-aabbccddeeff",      // not hex
                          "{00112233-4455-6677-8899-aabbccddeeff"}) {  // one brace
    SCOPED_TRACE(bad);
    try {
      UUIDObj u{UString(bad)};
      ADD_FAILURE() << "no throw";
    } catch (const tarn::TarnError& e) {
      EXPECT_EQ(e.GetIntErrorCode(), tarn::kParamErr);
    }
  }
}

TEST(UUIDObj, NewIdentifiersAreTimeBasedAndDistinct) {
  std::set<std::array<std::uint8_t, 16>> seen;
  for (int i = 0; i < 1000; ++i) {
    const UUIDObj u = UUIDObj::GetNewUUID();
    ASSERT_FALSE(u.IsClear());
    EXPECT_EQ(u.GetBytes()[6] >> 4, 1);  // version 1: time-based
    EXPECT_TRUE(seen.insert(u.GetBytes()).second);
    EXPECT_EQ(UUIDObj(u.GetString()), u);
  }
}

TEST(UUIDObj, StreamFormIsVersionByteAndSixteenBytes) {
  tarn::CHandleStream s(tarn::kTCLReadWriteMode);
  kSample.PutTo(s);
  s.PutLong(0x01020304);
  EXPECT_EQ(s.Size(), 21);
  const std::vector<unsigned char> bytes = StreamBytes(s);
  const std::vector<unsigned char> expected{2,    0x00, 0x11, 0x22, 0x33, 0x44, 0x55,
                                            0x66, 0x77, 0x88, 0x99, 0xaa, 0xbb, 0xcc,
                                            0xdd, 0xee, 0xff, 1,    2,    3,    4};
  EXPECT_EQ(bytes, expected);
  s.MoveTo(0);
  UUIDObj back;
  back.GetFrom(s);
  EXPECT_EQ(back, kSample);
  EXPECT_EQ(s.Position(), 17);
  EXPECT_EQ(s.GetLong(), 0x01020304);
}

TEST(UUIDObj, VersionOneRecordsSkipTwoBytesAndOtherVersionsReadAsTwo) {
  for (int version : {0, 1, 2, 3, 255}) {
    SCOPED_TRACE(version);
    tarn::CHandleStream s(tarn::kTCLReadWriteMode);
    s.PutChar(char(version));
    for (std::uint8_t b : kSample.GetBytes()) s.PutChar(char(b));
    s.PutShort(0x7777);  // a version-1 record's trailing two bytes
    s.PutShort(0x1234);
    s.MoveTo(0);
    UUIDObj u;
    u.GetFrom(s);
    EXPECT_EQ(u, kSample);
    EXPECT_EQ(s.Position(), version == 1 ? 19 : 17);
    if (version == 1) {
      EXPECT_EQ(s.GetShort(), 0x1234);
    }
  }
}

TEST(UUIDObj, TruncatedRecordThrowsAndLeavesTheIdentifier) {
  tarn::CHandleStream s(tarn::kTCLReadWriteMode);
  s.PutChar(2);
  s.PutLong(0);
  s.MoveTo(0);
  UUIDObj u = kSample;
  EXPECT_THROW(u.GetFrom(s), tarn::TarnError);
  EXPECT_EQ(u, kSample);
}

}  // namespace
