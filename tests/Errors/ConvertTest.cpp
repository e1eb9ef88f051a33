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

// The 50 bytes of a text field: the text, then NUL up to the end.
std::string Field(const char* text) {
  std::string field(text);
  field.resize(50, '\0');
  return field;
}

std::string Bytes(const TarnException& r, std::size_t offset, std::size_t size) {
  return std::string(reinterpret_cast<const char*>(&r) + offset, size);
}

int32_t Int32At(const TarnException& r, std::size_t offset) {
  int32_t v;
  std::memcpy(&v, reinterpret_cast<const char*>(&r) + offset, 4);
  return v;
}

TEST(ConvertPacking, ExactBytesOfAPackedError) {
  const TarnError e("Windows", "File I/O", "Open", -2147024894, "The system cannot find it.");
  const TarnException r = Convert(e);
  EXPECT_EQ(Bytes(r, 0, 50), Field("TarnError,Windows"));
  EXPECT_EQ(Bytes(r, 50, 50), Field("8,File I/OOpen"));
  EXPECT_EQ(Bytes(r, 100, 50), Field("The system cannot find it."));
  EXPECT_EQ(Int32At(r, 150), -2147024894);
  EXPECT_EQ(Int32At(r, 154), -1);
  EXPECT_EQ(Int32At(r, 158), 0);  // no detailed message
  EXPECT_TRUE(IsPackedTarnError(r));
}

TEST(ConvertPacking, TextsAreCutTo49Bytes) {
  const std::string kind(39, 'k'), system(20, 's'), subsystem(40, 'u'), text(60, 't');
  const TarnException r =
      Convert(TarnError(kind.c_str(), system.c_str(), subsystem.c_str(), 7, text.c_str()));
  EXPECT_EQ(Bytes(r, 0, 50), Field(("TarnError," + kind).c_str()));  // exactly 49
  EXPECT_EQ(Bytes(r, 50, 50), Field(("20," + system + subsystem.substr(0, 26)).c_str()));
  EXPECT_EQ(Bytes(r, 100, 50), Field(text.substr(0, 49).c_str()));

  const TarnException longer = Convert(TarnError((kind + "XY").c_str(), "", "", 7));
  EXPECT_EQ(Bytes(longer, 0, 50), Field(("TarnError," + kind).c_str()));
}

TEST(ConvertPacking, LongSystemsCountOnlyWhatFits) {
  // 63 characters of system: "46," and 46 of them fill the 49 bytes.
  const std::string system(63, 's');
  const TarnException r = Convert(TarnError("OS", system.c_str(), "sub", 1));
  EXPECT_EQ(Bytes(r, 50, 50), Field(("46," + system.substr(0, 46)).c_str()));
  const TarnError back = Convert(r);
  EXPECT_EQ(back.GetSystem().str(), system.substr(0, 46));
  EXPECT_EQ(back.GetSubsystem().str(), "");
  // 47 characters: "47," + 47 would be 50 bytes, so 46 are kept.
  const std::string s47(47, 'q');
  EXPECT_EQ(Bytes(Convert(TarnError("OS", s47.c_str(), "", 1)), 50, 50),
            Field(("46," + s47.substr(0, 46)).c_str()));
  // 46 characters fit exactly.
  const std::string s46(46, 'q');
  EXPECT_EQ(Bytes(Convert(TarnError("OS", s46.c_str(), "x", 1)), 50, 50),
            Field(("46," + s46).c_str()));
}

TEST(ConvertRoundTrip, FieldsThatFitSurvive) {
  const TarnError cases[] = {
      TarnError(),
      TarnError(-43),
      TarnError("Windows", "File I/O", "Open", 2, "not found"),
      TarnError("COM", "", "Sub,With,Commas", -1, ""),
      TarnError("A,B", "Sys,tem", "9,x", 123, "text, with comma"),
      TarnError(std::string(39, 'k').c_str(), std::string(22, 's').c_str(),
                std::string(24, 'u').c_str(), 0x7FFFFFFF, std::string(49, 'e').c_str()),
  };
  for (const TarnError& e : cases) {
    const TarnError back = Convert(Convert(e));
    EXPECT_EQ(back, e) << e.Describe();
    EXPECT_FALSE(back.GetAttachment());
  }
}

TEST(ConvertRoundTrip, DigitsInSystemAreNotMistakenForTheLength) {
  const TarnError e("OS", "12,34", "5,6", 1);
  EXPECT_EQ(Bytes(Convert(e), 50, 50), Field("5,12,345,6"));
  EXPECT_EQ(Convert(Convert(e)), e);
}

TEST(ConvertUnpacking, PlainRecordsBecomePavKinds) {
  TarnException r{};
  std::strcpy(r.text1, "Sound Manager");
  std::strcpy(r.text2, "Record");
  std::strcpy(r.text3, "device busy");
  r.code = -1234;
  r.kind = 1;
  const TarnError e = Convert(r);
  ExpectFields(e, "Pav,1", "Sound Manager", "Record", -1234, "device busy");
  EXPECT_TRUE(IsPackedTarnException(e));
  EXPECT_TRUE(IsPackedTarnMacOSErr(e));
  EXPECT_FALSE(IsPackedTarnInternalErr(e));
  EXPECT_FALSE(IsPackedTarnError(r));

  // Restoring gives back the very same 162 bytes.
  const TarnException again = Convert(e);
  EXPECT_EQ(std::memcmp(&again, &r, sizeof r), 0);

  r.kind = 0;
  EXPECT_TRUE(IsPackedTarnInternalErr(Convert(r)));
  EXPECT_FALSE(IsPackedTarnMacOSErr(Convert(r)));
  r.kind = -7;
  const TarnError odd = Convert(r);
  EXPECT_EQ(odd.GetKind(), "Pav,-7");
  EXPECT_EQ(int32_t{Convert(odd).kind}, -7);
  EXPECT_FALSE(IsPackedTarnException(TarnError(-43)));
  EXPECT_FALSE(IsPackedTarnInternalErr(TarnError(0)));
}

TEST(ConvertUnpacking, UnterminatedFieldsAreReadWithinBounds) {
  TarnException r;
  std::memset(&r, 'x', sizeof r);
  r.code = 5;
  r.kind = 0;
  r.reserved = 0;
  const TarnError e = Convert(r);
  EXPECT_EQ(e.GetSystem().str(), std::string(50, 'x'));
  EXPECT_EQ(e.GetSubsystem().str(), std::string(50, 'x'));
  EXPECT_EQ(e.GetOptionalErrorString().str(), std::string(50, 'x'));
}

TEST(ConvertDetailedMessage, AttachmentTravelsAsTheDetailedMessage) {
  const UString paths("/Volumes/Audio/Take 1.wav\n/Volumes/Audio/Take 1 copy.wav \xC3\xA9");
  const TarnError e("OS", "File I/O", "", -48, "ignored once detailed", paths);
  const TarnException r = Convert(e);
  EXPECT_NE(int32_t{r.reserved}, 0);
  char buffer[256];
  ASSERT_TRUE(TPOGetDetailedErrorMessage(&r, buffer, sizeof buffer));
  EXPECT_EQ(std::string(buffer), paths.utf8_str());

  // With a detailed message the optional error string is left empty.
  const TarnError back = Convert(r);
  ExpectFields(back, "OS", "File I/O", "", -48, "");
  ASSERT_TRUE(back.GetAttachment());
  EXPECT_EQ(back.GetAttachment()->utf8_str(), paths.utf8_str());
}

TEST(ConvertDetailedMessage, SiblingMessagesBecomeAttachmentsCutAt2048Bytes) {
  TarnException r{};
  std::strcpy(r.text1, "Host");
  std::strcpy(r.text3, "short text");
  r.code = 3;
  r.kind = 0;
  TPOSetDetailedErrorMessage(&r, std::string(3000, 'd').c_str());
  const TarnError e = Convert(r);
  ASSERT_TRUE(e.GetAttachment());
  EXPECT_EQ(e.GetAttachment()->utf8_str(), std::string(2048, 'd'));
  EXPECT_TRUE(e.GetOptionalErrorString().empty());
}

TEST(ConvertDeathTest, MalformedPackedRecordsEndTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  auto packed = [](const char* text2) {
    TarnException r{};
    std::strcpy(r.text1, "TarnError,OS");
    std::strcpy(r.text2, text2);
    r.code = 1;
    r.kind = -1;
    return r;
  };
  EXPECT_DEATH((void)Convert(packed("no comma here")), "malformed");
  EXPECT_DEATH((void)Convert(packed("0000000000000001,s")), "malformed");  // 16 digits
  EXPECT_DEATH((void)Convert(packed("50,s")), "malformed");
  EXPECT_DEATH((void)Convert(packed("4x,sys")), "malformed");
  // The limits themselves are fine.
  EXPECT_EQ(Convert(packed("000000000000003,sysub")).GetSystem(), "sys");
  EXPECT_EQ(Convert(packed("49,ab")).GetSystem(), "ab");
  EXPECT_EQ(Convert(packed(",sub")).GetSubsystem(), "sub");
}

TEST(ExceptionThrower, ThrowsTheHeldErrorOnlyWhenTheCodeIsSet) {
  EXPECT_FALSE(Thrown([] { ExceptionThrower quiet; }));
  EXPECT_FALSE(Thrown([] { ExceptionThrower quiet("f.cpp", 3); }));
  const auto e = Thrown([] {
    ExceptionThrower thrower("Streams/CFileStream.cpp", 41);
    TarnError& error = thrower;
    error = -36;  // keeps the source location
  });
  ASSERT_TRUE(e);
  ExpectFields(*e, "OS", "", "", -36, "Streams/CFileStream.cpp 41");

  const auto copied = Thrown([] {
    ExceptionThrower first;
    static_cast<TarnError&>(first) = TarnError("COM", "COM", "COM", -5, nullptr, UString("a"));
    ExceptionThrower second(first);
    static_cast<TarnError&>(first).SetIntErrorCode(0);  // only the copy throws
  });
  ASSERT_TRUE(copied);
  ExpectFields(*copied, "COM", "COM", "COM", -5, "");
  EXPECT_EQ(copied->GetAttachment()->utf8_str(), "a");
}

// Stands in for a sibling-library call that reports failure in the record.
void SiblingCallThatFails(TarnException* record) {
  std::strcpy(record->text1, "Driver");
  std::strcpy(record->text2, "Open");
  std::strcpy(record->text3, "no device");
  record->code = -9;
  record->kind = 1;
}

TEST(TarnExceptionThrower, ThrowsTheConvertedRecordUnlessUnwinding) {
  EXPECT_FALSE(Thrown([] { TarnExceptionThrower quiet; }));
  const auto e = Thrown([] {
    TarnExceptionThrower thrower;
    SiblingCallThatFails(thrower);
  });
  ASSERT_TRUE(e);
  ExpectFields(*e, "Pav,1", "Driver", "Open", -9, "no device");

  // While another exception propagates the record is dropped.
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
