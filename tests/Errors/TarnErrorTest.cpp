#include "tarn/Errors/TarnError.h"

#include <gtest/gtest.h>

#include <string>

#include "ErrorTestUtil.h"

namespace tarn {
namespace {

using testing::ExpectFields;

TEST(TarnErrorConstruction, EachConstructorFillsExactlyItsFields) {
  ExpectFields(TarnError(), "OS", "", "", 0, "");
  ExpectFields(TarnError(-43), "OS", "", "", -43, "");
  ExpectFields(TarnError(-50, "Streams/CStream.cpp", 812), "OS", "", "", -50,
               "Streams/CStream.cpp 812");
  ExpectFields(TarnError("Windows", "File I/O", "Open", 5, "Access is denied."), "Windows",
               "File I/O", "Open", 5, "Access is denied.");
  ExpectFields(TarnError("COM", "Audio", "", -2147467259, "x.cpp", -7), "COM", "Audio", "",
               -2147467259, "x.cpp -7");
  EXPECT_FALSE(TarnError(-43).GetAttachment().has_value());
  TarnError withPath("OS", "File I/O", "", -43, nullptr, UString("/tmp/a.wav"));
  ASSERT_TRUE(withPath.GetAttachment().has_value());
  EXPECT_EQ(withPath.GetAttachment()->utf8_str(), "/tmp/a.wav");
  EXPECT_TRUE(withPath.GetOptionalErrorString().empty());
}

TEST(TarnErrorConstruction, TextsAreCutAt63And255Bytes) {
  const std::string s63(63, 'k'), s64(64, 'k'), s255(255, 'e'), s300(300, 'e');
  TarnError exact(s63.c_str(), s63.c_str(), s63.c_str(), 1, s255.c_str());
  ExpectFields(exact, s63.c_str(), s63.c_str(), s63.c_str(), 1, s255.c_str());
  TarnError cut(s64.c_str(), s64.c_str(), s64.c_str(), 1, s300.c_str());
  ExpectFields(cut, s63.c_str(), s63.c_str(), s63.c_str(), 1, s255.c_str());

  // The "<file> <line>" form is cut the same way, keeping the file's start.
  const std::string longFile(254, 'f');
  EXPECT_EQ(TarnError(1, longFile.c_str(), 12345).GetOptionalErrorString().str(), longFile + " ");
  EXPECT_EQ(TarnError("a", "b", "c", 1, longFile.c_str(), 9).GetOptionalErrorString().length(),
            255u);

  TarnError e;
  e.SetSystem(s300.c_str());
  EXPECT_EQ(e.GetSystem().length(), 63u);
  e.SetOptionalErrorString(std::string_view(s300));
  EXPECT_EQ(e.GetOptionalErrorString().str(), s255);
  e.SetKind(static_cast<const char*>(nullptr));
  EXPECT_TRUE(e.GetKind().empty());
}

TEST(TarnErrorMacOSCode, OSKindKeepsLow16Bits) {
  EXPECT_EQ(TarnError(5).GetMacOSErrorCode(), 5);
  EXPECT_EQ(TarnError(0).GetMacOSErrorCode(), 0);
  EXPECT_EQ(TarnError(-128).GetMacOSErrorCode(), -128);
  EXPECT_EQ(TarnError(0x10000).GetMacOSErrorCode(), 0);  // "OS" is taken as it is
  EXPECT_EQ(TarnError(0x18000).GetMacOSErrorCode(), -32768);
  EXPECT_EQ(TarnError(-1).GetMacOSErrorCode(), -1);
}

TEST(TarnErrorMacOSCode, ForeignKindsNeverBecomeNoErrorOrCancel) {
  auto mac = [](int code) { return TarnError("Windows", "", "", code).GetMacOSErrorCode(); };
  EXPECT_EQ(mac(0), -128);
  EXPECT_EQ(mac(0x10000), 32767);
  EXPECT_EQ(mac(-128), 32767);
  EXPECT_EQ(mac(0x1FF80), 32767);  // low bits 0xFF80 are -128
  EXPECT_EQ(mac(-65536), 32767);   // low bits 0
  EXPECT_EQ(mac(2), 2);
  EXPECT_EQ(mac(-127), -127);
  EXPECT_EQ(mac(-129), -129);
  EXPECT_EQ(mac(0x12345), 0x2345);
  EXPECT_EQ(mac(32767), 32767);
  EXPECT_EQ(mac(32768), -32768);
  // The kind must match "OS" exactly.
  EXPECT_EQ(TarnError("OS ", "", "", 0).GetMacOSErrorCode(), -128);
  EXPECT_EQ(TarnError("os", "", "", 0).GetMacOSErrorCode(), -128);
}

TEST(TarnErrorMacOSCode, ProxyConvertsToIntAndShort) {
  TarnError e("COM", "COM", "COM", 0x10000);
  int asInt = e.GetErrorCode();
  short asShort = e.GetErrorCode();
  EXPECT_EQ(asInt, 0x10000);
  EXPECT_EQ(asShort, 32767);
}

TEST(TarnErrorQueries, MacOSAndFileSystemErrors) {
  EXPECT_TRUE(TarnError(-43).IsMacOSError());
  EXPECT_TRUE(TarnError(-43).IsMacOSError(-43));
  EXPECT_FALSE(TarnError(-43).IsMacOSError(-44));
  EXPECT_FALSE(TarnError("Windows", "", "", -43).IsMacOSError());
  EXPECT_FALSE(TarnError("Windows", "", "", -43).IsMacOSError(-43));
  EXPECT_STREQ(TarnError::MacOSKind(), "OS");
  EXPECT_EQ(TarnError::MacOSKind(), TarnError::MacOSKind());
  EXPECT_STREQ(TarnError::UnknownExceptionKind(), "Unknown Exception");

  EXPECT_TRUE(IsFileSystemError(TarnError("OS", "File I/O", "", -43)));
  EXPECT_FALSE(IsFileSystemError(TarnError("OS", "File I/O ", "", -43)));
  EXPECT_FALSE(IsFileSystemError(TarnError("POSIX", "File I/O", "", 2)));
  EXPECT_FALSE(IsFileSystemError(TarnError(-43)));
}

TEST(TarnErrorEquality, ComparesEveryFieldButTheAttachment) {
  const TarnError base("OS", "File I/O", "sub", -43, "text", UString("/a"));
  EXPECT_EQ(base, TarnError("OS", "File I/O", "sub", -43, "text", UString("/b")));
  EXPECT_EQ(base, TarnError("OS", "File I/O", "sub", -43, "text"));
  EXPECT_NE(base, TarnError("OT", "File I/O", "sub", -43, "text"));
  EXPECT_NE(base, TarnError("OS", "File I/P", "sub", -43, "text"));
  EXPECT_NE(base, TarnError("OS", "File I/O", "sup", -43, "text"));
  EXPECT_NE(base, TarnError("OS", "File I/O", "sub", -42, "text"));
  EXPECT_NE(base, TarnError("OS", "File I/O", "sub", -43, "texT"));
  EXPECT_NE(base, TarnError("OS", "File I/O", "sub", -43, ""));
  // Equal after cutting: texts differing only beyond 63 bytes compare equal.
  EXPECT_EQ(TarnError(std::string(70, 'a').c_str(), "", "", 1),
            TarnError((std::string(63, 'a') + "b").c_str(), "", "", 1));
}

TEST(TarnErrorCopy, CopiesAreIndependent) {
  TarnError a("OS", "File I/O", "", -43, nullptr, UString("one"));
  TarnError b = a;
  b.GetAttachment() = UString("two");
  b.SetIntErrorCode(-36);
  EXPECT_EQ(a.GetAttachment()->utf8_str(), "one");
  EXPECT_EQ(a.GetIntErrorCode(), -43);
  TarnError c = std::move(b);
  EXPECT_EQ(c.GetAttachment()->utf8_str(), "two");
}

}  // namespace
}  // namespace tarn
