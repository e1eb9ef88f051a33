// TarnError fields and cuts, the classic-code mapping, every Fail function,
// GetCurrentError, the last system error and TARN_ASSERT.
#include "tarn/Errors/TarnError.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <functional>
#include <stdexcept>
#include <string>
#ifdef _WIN32
#include <windows.h>
#endif

#include "ErrorTestUtil.h"
#include "tarn/Errors/Fail.h"
#include "tarn/Errors/TarnAssert.h"

namespace tarn {
namespace {

using testing::ExpectFields;
using testing::Thrown;

TEST(TarnError, ConstructorsCutsAndEquality) {
  const std::string s63(63, 'k'), s64(64, 'k'), s255(255, 'e'), s300(300, 'e');
  const TarnError cut(s64.c_str(), s64.c_str(), s64.c_str(), 1, s300.c_str());
  EXPECT_EQ(cut.GetKind().str() + cut.GetSystem().str() + cut.GetSubsystem().str(),
            s63 + s63 + s63);
  EXPECT_EQ(cut.GetOptionalErrorString().str(), s255);
  EXPECT_EQ(TarnError(1, std::string(254, 'f').c_str(), 12345).GetOptionalErrorString().str(),
            std::string(254, 'f') + " ");
  ExpectFields(TarnError(), "OS", "", "", 0);
  ExpectFields(TarnError(-50, "Streams/CStream.cpp", 812), "OS", "", "", -50,
               "Streams/CStream.cpp 812");
  ExpectFields(TarnError("COM", "Audio", "", -5, "x.cpp", -7), "COM", "Audio", "", -5, "x.cpp -7");
  const TarnError base("OS", "File I/O", "sub", -43, "text", UString("/a"));
  EXPECT_EQ(base, TarnError("OS", "File I/O", "sub", -43, "text"));
  for (const TarnError& other : {TarnError("OT", "File I/O", "sub", -43, "text"),
                                 TarnError("OS", "File I/P", "sub", -43, "text"),
                                 TarnError("OS", "File I/O", "sub", -42, "text"),
                                 TarnError("OS", "File I/O", "sub", -43, "texT")}) {
    EXPECT_NE(base, other);
  }
  EXPECT_FALSE(IsFileSystemError(TarnError("POSIX", "File I/O", "", 2)));
}

TEST(TarnError, NoForeignCodeMapsToNoErrorOrCancel) {
  for (int high : {0, 1, -1, 0x7FFF, -0x8000}) {
    for (int low = 0; low <= 0xFFFF; ++low) {
      const int code =
          static_cast<int>(static_cast<uint32_t>(high) << 16 | static_cast<uint32_t>(low));
      const short os = TarnError(code).GetMacOSErrorCode();
      const short foreign = TarnError("COM", "", "", code).GetMacOSErrorCode();
      ASSERT_EQ(static_cast<uint16_t>(os), low) << code;
      ASSERT_EQ(foreign, code == 0 ? -128 : (low == 0 || low == 0xFF80) ? 32767 : os) << code;
    }
  }
  EXPECT_EQ(TarnError("OS ", "", "", 0).GetMacOSErrorCode(), -128);  // kind must be "OS" exactly
  const TarnError e("COM", "COM", "COM", 0x10000);
  EXPECT_EQ(static_cast<int>(e.GetErrorCode()), 0x10000);
  EXPECT_EQ(static_cast<short>(e.GetErrorCode()), 32767);
}

TEST(Fail, EveryFunctionThrowsItsFieldsOrReturns) {
  const void* some = &some;
  for (const std::function<void()>& quiet : std::initializer_list<std::function<void()>>{
           [] { FailOSErr(0); }, [&] { FailNIL(some); }, [&] { do_FailNILRes(some, "f", 1); },
           [] { FailMemError(); }, [] { do_FailResError("f", 1); },
           [] { do_FailWinError(0, "f", 1); }, [] { FailWinAPIError(-1); },
           [] { FailPOSIXError(0); }, [] { FailCOMError(1); },
           [] { do_FailCOMError(0x7FFFFFFF, "f", 1); },
           [&] { _FailNullPtrError(some, static_cast<NullPtrErrorCode>(9), "m"); }}) {
    EXPECT_FALSE(Thrown(quiet));
  }
  ExpectFields(Thrown([] { do_Failure(-39, "Streams/CStream.cpp", 77); }), "OS", "", "", -39,
               "Streams/CStream.cpp 77");
  EXPECT_EQ(GetLastFailureCode(), -39);
  ExpectFields(Thrown([] { FailOSErr(123456789); }), "OS", "", "", 123456789);
  ExpectFields(Thrown([] { FailNIL(nullptr); }), "OS", "", "", -108);
  ExpectFields(Thrown([] { do_FailNILRes(nullptr, "a.cpp", 5); }), "OS", "", "", -192, "a.cpp 5");
  ExpectFields(Thrown([] { FailWinError(-1); }), "Windows", "Windows", "Windows", -1);
  ExpectFields(Thrown([] { do_FailCOMError(-1, "c.cpp", 99); }), "COM", "COM", "COM", -1,
               "c.cpp 99");
  const auto posix = Thrown([] { FailPOSIXError(22); });
  ExpectFields(posix, "POSIX", "POSIX", "POSIX", 22, posix->GetOptionalErrorString().c_str());
  const auto mem = Thrown([] { _FailNullPtrError(nullptr, kNullPtrResNotFound, "ignored"); });
  ASSERT_TRUE(mem);
  EXPECT_EQ(mem->GetIntErrorCode(), -192);
  EXPECT_TRUE(mem->GetOptionalErrorString().view().starts_with("Errors/FailNULLUtils "));
  ExpectFields(Thrown([] { _FailNullPtrError(nullptr, static_cast<NullPtrErrorCode>(0), "why"); }),
               "FailNULL", "MemSys", "", 0, "why");
}

TarnError CurrentError(const std::function<void()>& thrower) {
  try {
    thrower();
  } catch (...) {
    return GetCurrentError(false);
  }
  return TarnError(999);
}

TEST(GetCurrentError, TurnsWhatWasCaughtIntoATarnError) {
  const TarnError original("OS", "File I/O", "x", -43, "t", UString("/p"));
  EXPECT_EQ(CurrentError([&] { throw original; }).GetAttachment()->utf8_str(), "/p");
  ExpectFields(CurrentError([] { throw std::runtime_error(std::string(400, 'w')); }),
               "Unknown Exception", "TarnError", "", 1, std::string(255, 'w').c_str());
  ExpectFields(CurrentError([] { throw 42; }), "Unknown Exception", "TarnError", "", 1,
               "not a std::exception");
}

TEST(SystemError, LastErrorAndApiFailures) {
#ifdef _WIN32
  const char* kind = "Windows";
  const int notFound = ERROR_FILE_NOT_FOUND, denied = ERROR_ACCESS_DENIED;
  auto setLast = [](int code) { ::SetLastError(static_cast<DWORD>(code)); };
#else
  const char* kind = "POSIX";
  const int notFound = ENOENT, denied = EACCES;
  auto setLast = [](int code) { errno = code; };
#endif
  setLast(notFound);
  const TarnError e = GetLastErrorAsTarnError("File I/O", "Open");
  ExpectFields(e, kind, "File I/O", "Open", notFound, e.GetOptionalErrorString().c_str());
  EXPECT_FALSE(e.GetOptionalErrorString().empty());
  ExpectFields(Thrown([&] { setLast(denied), do_FailWinAPIError(0, "t.cpp", 8); }), kind, kind,
               kind, denied, "t.cpp 8");
}

std::string gAsserted;

TEST(ErrorsDeathTest, AssertReportsToTheHandlerOnceOrEndsTheProcess) {
  const TPOAssertionHandler previous = TPOSetAssertionHandler(
      [](const char* expression, const char*, int) { gAsserted += expression; });
  int evaluations = 0;
  TARN_ASSERT(++evaluations == 1);
  TARN_ASSERT(evaluations == 2);
  TARN_ASSERT_MSG(evaluations == 3, "px != 0");
  TPOSetAssertionHandler(previous);
  EXPECT_EQ(evaluations, 1);
  EXPECT_EQ(gAsserted, "evaluations == 2px != 0");
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  int* px = nullptr;
  EXPECT_DEATH(TARN_ASSERT(px != 0), "px != 0");
  EXPECT_DEATH((void)GetCurrentError(false), "");  // no exception in flight
}

}  // namespace
}  // namespace tarn
