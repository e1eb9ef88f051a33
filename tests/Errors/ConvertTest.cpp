// Packing errors into the 162-byte record and back, and the throwers.
#include "tarn/Errors/ExceptionThrower.h"

#include <gtest/gtest.h>

#include <cstring>
#include <stdexcept>
#include <string>

#include "ErrorTestUtil.h"

namespace tarn {
namespace {

using testing::ExpectFields;
using testing::Thrown;

// The record's bytes: three 50-byte texts (NUL-padded), then code, kind and
// the detailed-message handle as native 32-bit integers.
std::string Image(const std::string& t1, const std::string& t2, const std::string& t3, int32_t code,
                  int32_t kind, int32_t reserved = 0) {
  std::string image;
  for (const std::string& t : {t1, t2, t3}) image += t + std::string(50 - t.size(), '\0');
  for (int32_t v : {code, kind, reserved}) image.append(reinterpret_cast<const char*>(&v), 4);
  return image;
}

std::string Bytes(const TarnException& r) {
  static_assert(sizeof r == 162);
  return std::string(reinterpret_cast<const char*>(&r), sizeof r);
}

TEST(ConvertPacking, ExactBytesAndCuts) {
  const std::string k39(39, 'k'), s63(63, 's'), u40(40, 'u'), t60(60, 't');
  const struct {
    TarnError error;
    std::string image;
    bool fits = false;
  } rows[] = {
      {TarnError("Windows", "File I/O", "Open", -2147024894, "No such file."),
       Image("TarnError,Windows", "8,File I/OOpen", "No such file.", -2147024894, -1), true},
      {TarnError((k39 + "XY").c_str(), s63.substr(0, 20).c_str(), u40.c_str(), 7, t60.c_str()),
       Image("TarnError," + k39, "20," + s63.substr(0, 20) + u40.substr(0, 26), t60.substr(0, 49),
             7, -1)},
      {TarnError("OS", "12,34", "5,6", 1), Image("TarnError,OS", "5,12,345,6", "", 1, -1), true},
  };
  for (const auto& row : rows) {
    const TarnException r = Convert(row.error);
    EXPECT_EQ(Bytes(r), row.image) << row.error.Describe();
    EXPECT_TRUE(IsPackedTarnError(r));
    if (row.fits) {
      EXPECT_EQ(Convert(r), row.error);
    }
  }
  for (std::size_t n : {46, 47, 63}) {  // "46," and 46 characters fill the 49 bytes
    const TarnException r = Convert(TarnError("OS", s63.substr(0, n).c_str(), "x", 1));
    EXPECT_EQ(Bytes(r), Image("TarnError,OS", "46," + s63.substr(0, 46), "", 1, -1)) << n;
    EXPECT_EQ(Convert(r).GetSystem().str(), s63.substr(0, 46));
  }
}

TEST(ConvertUnpacking, PlainRecordsBecomePavKindsAndComeBackByteForByte) {
  TarnException r{};
  std::memset(&r, 'x', sizeof r);  // unterminated texts are read within bounds
  r.code = -1234;
  r.kind = 1;
  r.reserved = 0;
  const TarnError e = Convert(r);
  const std::string x50(50, 'x');
  ExpectFields(e, "Pav,1", x50.c_str(), x50.c_str(), -1234, x50.c_str());
  EXPECT_TRUE(IsPackedTarnMacOSErr(e) && !IsPackedTarnInternalErr(e));
  r.text1[49] = r.text2[49] = r.text3[49] = '\0';
  const TarnException again = Convert(Convert(r));
  EXPECT_EQ(Bytes(again), Bytes(r));
  r.kind = -7;
  EXPECT_EQ(int32_t{Convert(Convert(r)).kind}, -7);
  r.kind = 0;
  EXPECT_TRUE(IsPackedTarnInternalErr(Convert(r)));
  EXPECT_FALSE(IsPackedTarnException(TarnError(-43)));
}

TEST(ConvertDetailedMessage, AttachmentTravelsAsTheDetailedMessage) {
  const UString paths("/Volumes/Audio/Take 1.wav\n/Volumes/Audio/Take 1 copy.wav \xC3\xA9");
  const TarnException r = Convert(TarnError("OS", "File I/O", "", -48, "ignored", paths));
  char buffer[256];
  ASSERT_TRUE(TPOGetDetailedErrorMessage(&r, buffer, sizeof buffer));
  EXPECT_EQ(std::string(buffer), paths.utf8_str());
  const TarnError back = Convert(r);
  ExpectFields(back, "OS", "File I/O", "", -48);
  EXPECT_EQ(back.GetAttachment()->utf8_str(), paths.utf8_str());

  TarnException sibling{};
  TPOSetDetailedErrorMessage(&sibling, std::string(3000, 'd').c_str());
  EXPECT_EQ(Convert(sibling).GetAttachment()->utf8_str(), std::string(2048, 'd'));
}

TEST(ConvertDeathTest, MalformedPackedRecordsEndTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  auto packed = [](const char* text2) {
    TarnException r{};
    std::strcpy(r.text1, "TarnError,OS");
    std::strcpy(r.text2, text2);
    r.kind = -1;
    return r;
  };
  for (const char* bad : {"no comma here", "0000000000000001,s", "50,s", "4x,sys"}) {
    EXPECT_DEATH((void)Convert(packed(bad)), "malformed") << bad;
  }
  EXPECT_EQ(Convert(packed("000000000000003,sysub")).GetSystem(), "sys");
  EXPECT_EQ(Convert(packed("49,ab")).GetSystem(), "ab");
  EXPECT_EQ(Convert(packed(",sub")).GetSubsystem(), "sub");
}

void SiblingCallThatFails(TarnException* record) {
  std::strcpy(record->text1, "Driver");
  record->code = -9;
  record->kind = 1;
}

TEST(Throwers, ThrowOnlyWhenSetAndNotWhileUnwinding) {
  EXPECT_FALSE(Thrown([] { ExceptionThrower quiet("f.cpp", 3); }));
  EXPECT_FALSE(Thrown([] { TarnExceptionThrower quiet; }));
  ExpectFields(Thrown([] {
                 ExceptionThrower thrower("Streams/CFileStream.cpp", 41);
                 static_cast<TarnError&>(thrower) = -36;  // keeps the source location
               }),
               "OS", "", "", -36, "Streams/CFileStream.cpp 41");
  ExpectFields(Thrown([] {
                 ExceptionThrower first;
                 static_cast<TarnError&>(first) = TarnError("COM", "COM", "COM", -5);
                 ExceptionThrower second(first);
                 static_cast<TarnError&>(first).SetIntErrorCode(0);  // only the copy throws
               }),
               "COM", "COM", "COM", -5);
  ExpectFields(Thrown([] {
                 TarnExceptionThrower thrower;
                 SiblingCallThatFails(thrower);
               }),
               "Pav,1", "Driver", "", -9);
  try {
    TarnExceptionThrower thrower;
    SiblingCallThatFails(thrower);
    throw std::runtime_error("first");
  } catch (const std::runtime_error& first) {
    EXPECT_STREQ(first.what(), "first");
  }
}

}  // namespace
}  // namespace tarn
