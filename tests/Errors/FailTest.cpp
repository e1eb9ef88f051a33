#include "tarn/Errors/Fail.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "ErrorTestUtil.h"
#include "tarn/Basics/TarnCoreLibCallbacks.h"

namespace tarn {
namespace {

using testing::ExpectFields;
using testing::Thrown;

int gTarget = 0;
const void* const kSome = &gTarget;

TEST(Fail, FunctionsThatReturnWhenThereIsNothingToReport) {
  EXPECT_FALSE(Thrown([] { FailOSErr(0); }));
  EXPECT_FALSE(Thrown([] { FailStream(0); }));
  EXPECT_FALSE(Thrown([] { FailNIL(kSome); }));
  EXPECT_FALSE(Thrown([] { FailNILRes(kSome); }));
  EXPECT_FALSE(Thrown([] { do_FailNILRes(kSome, "f", 1); }));
  EXPECT_FALSE(Thrown([] { FailMemError(); }));
  EXPECT_FALSE(Thrown([] { FailResError(); }));
  EXPECT_FALSE(Thrown([] { do_FailResError("f", 1); }));
  EXPECT_FALSE(Thrown([] { FailWinError(0); }));
  EXPECT_FALSE(Thrown([] { do_FailWinError(0, "f", 1); }));
  EXPECT_FALSE(Thrown([] { FailWinAPIError(1); }));
  EXPECT_FALSE(Thrown([] { FailWinAPIError(-1); }));
  EXPECT_FALSE(Thrown([] { do_FailWinAPIError(7, "f", 1); }));
  EXPECT_FALSE(Thrown([] { FailPOSIXError(0); }));
  EXPECT_FALSE(Thrown([] { FailCOMError(0); }));
  EXPECT_FALSE(Thrown([] { FailCOMError(1); }));  // S_FALSE is a success code
  EXPECT_FALSE(Thrown([] { do_FailCOMError(0x7FFFFFFF, "f", 1); }));
  EXPECT_FALSE(Thrown([] { _FailNullPtrError(kSome, kNullPtrMemFull, "m"); }));
  EXPECT_FALSE(Thrown([] { _FailNullPtrError(kSome, static_cast<NullPtrErrorCode>(9), "m"); }));
}

TEST(Fail, OSStyleFunctionsThrowPlainCodes) {
  ExpectFields(*Thrown([] { Failure(-36); }), "OS", "", "", -36, "");
  ExpectFields(*Thrown([] { do_Failure(-39, "Streams/CStream.cpp", 77); }), "OS", "", "", -39,
               "Streams/CStream.cpp 77");
  ExpectFields(*Thrown([] { FailOSErr(-43); }), "OS", "", "", -43, "");
  ExpectFields(*Thrown([] { FailOSErr(123456789); }), "OS", "", "", 123456789, "");
  ExpectFields(*Thrown([] { FailStream(-39); }), "OS", "", "", -39, "");
  ExpectFields(*Thrown([] { FailNIL(nullptr); }), "OS", "", "", -108, "");
  ExpectFields(*Thrown([] { FailMemFullError(); }), "OS", "", "", -108, "");
  ExpectFields(*Thrown([] { FailNILRes(nullptr); }), "OS", "", "", -192, "");
  ExpectFields(*Thrown([] { do_FailNILRes(nullptr, "a.cpp", 5); }), "OS", "", "", -192, "a.cpp 5");
  EXPECT_FALSE(Thrown([] { FailOSErr(-43); })->GetAttachment());
}

TEST(Fail, FailureRecordsTheLastCode) {
  Thrown([] { Failure(-4242); });
  EXPECT_EQ(GetLastFailureCode(), -4242);
  Thrown([] { do_Failure(-17, "f", 2); });
  EXPECT_EQ(GetLastFailureCode(), -17);
  Thrown([] { FailNIL(nullptr); });
  EXPECT_EQ(GetLastFailureCode(), -108);
}

TEST(Fail, WindowsAndCOMCodesTravelUnchanged) {
  ExpectFields(*Thrown([] { FailWinError(5); }), "Windows", "Windows", "Windows", 5, "");
  ExpectFields(*Thrown([] { FailWinError(-1); }), "Windows", "Windows", "Windows", -1, "");
  ExpectFields(*Thrown([] { do_FailWinError(0x80000000u, "w.cpp", 10); }), "Windows", "Windows",
               "Windows", static_cast<int>(0x80000000u), "w.cpp 10");
  ExpectFields(*Thrown([] { FailCOMError(static_cast<int>(0x80004005u)); }), "COM", "COM", "COM",
               static_cast<int>(0x80004005u), "");
  ExpectFields(*Thrown([] { do_FailCOMError(-1, "c.cpp", 99); }), "COM", "COM", "COM", -1,
               "c.cpp 99");
}

TEST(Fail, POSIXErrorsCarryTheSystemText) {
  const auto e = Thrown([] { FailPOSIXError(22); });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetKind(), "POSIX");
  EXPECT_EQ(e->GetSystem(), "POSIX");
  EXPECT_EQ(e->GetIntErrorCode(), 22);
  EXPECT_FALSE(e->GetOptionalErrorString().empty());
  EXPECT_EQ(ErrnoAsTarnError(2, "File I/O", "Open").GetSubsystem(), "Open");
}

TEST(FailNullPtr, CodesOneAndTwoBecomeOSErrorsWithTheSourcePath) {
  const auto mem = Thrown([] { _FailNullPtrError(nullptr, kNullPtrMemFull, "ignored"); });
  ASSERT_TRUE(mem);
  EXPECT_EQ(mem->GetKind(), "OS");
  EXPECT_EQ(mem->GetIntErrorCode(), -108);
  EXPECT_TRUE(mem->GetOptionalErrorString().view().starts_with("Errors/FailNULLUtils "));
  EXPECT_EQ(GetLastFailureCode(), -108);

  const auto res = Thrown([] { _FailNullPtrError(nullptr, kNullPtrResNotFound, "ignored"); });
  ASSERT_TRUE(res);
  EXPECT_EQ(res->GetKind(), "OS");
  EXPECT_EQ(res->GetIntErrorCode(), -192);
  EXPECT_TRUE(res->GetOptionalErrorString().view().starts_with("Errors/FailNULLUtils "));
}

TEST(FailNullPtr, OtherCodesAreFailNULLErrorsWithTexts) {
  const auto e =
      Thrown([] { _FailNullPtrError(nullptr, static_cast<NullPtrErrorCode>(3), nullptr); });
  ASSERT_TRUE(e);
  ExpectFields(*e, "FailNULL", "MemSys", "", 3, "");
  const auto m =
      Thrown([] { _FailNullPtrError(nullptr, static_cast<NullPtrErrorCode>(0), "why"); });
  ExpectFields(*m, "FailNULL", "MemSys", "", 0, "why");

  // The first call registered the translator for list 12596, exactly once.
  int registered = 0;
  for (auto* t : TarnError::GetTranslatorList()) registered += t->CanTranslate(*e);
  EXPECT_EQ(registered, 1);
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  UString title, description;
  e->GetErrorDescription(TarnError::DefaultTranslator(), title, description);
  EXPECT_EQ(title.utf8_str(), GetIndUString(kFailNULLStringList, 0).utf8_str());
  EXPECT_EQ(description.utf8_str(), GetIndUString(kFailNULLStringList, 3).utf8_str());
  EXPECT_FALSE(description.empty());
}

TEST(GetCurrentError, TurnsWhatWasCaughtIntoATarnError) {
  auto current = [](auto thrower) {
    try {
      thrower();
    } catch (...) {
      return GetCurrentError(false);
    }
    return TarnError(999);
  };
  const TarnError original("OS", "File I/O", "x", -43, "t", UString("/p"));
  const TarnError copied = current([&] { throw original; });
  EXPECT_EQ(copied, original);
  EXPECT_EQ(copied.GetAttachment()->utf8_str(), "/p");

  ExpectFields(current([] { throw std::runtime_error("disk on fire"); }), "Unknown Exception",
               "TarnError", "", 1, "disk on fire");
  ExpectFields(current([] { throw std::bad_alloc(); }), "Unknown Exception", "TarnError", "", 1,
               std::bad_alloc().what());
  ExpectFields(current([] { throw 42; }), "Unknown Exception", "TarnError", "", 1,
               "not a std::exception");
  const std::string longWhat(400, 'w');
  EXPECT_EQ(current([&] { throw std::runtime_error(longWhat); }).GetOptionalErrorString().length(),
            255u);
}

TEST(GetCurrentErrorDeathTest, WithNoExceptionInFlightTheProcessEnds) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_DEATH((void)GetCurrentError(false), "");
}

}  // namespace
}  // namespace tarn
