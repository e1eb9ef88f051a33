#include <windows.h>

#include <gtest/gtest.h>

#include "ErrorTestUtil.h"
#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

TEST(SystemErrorWindows, LastErrorWithTheSystemMessage) {
  ::SetLastError(ERROR_FILE_NOT_FOUND);
  const TarnError e = GetLastErrorAsTarnError("File I/O", "Open");
  EXPECT_EQ(e.GetKind(), "Windows");
  EXPECT_EQ(e.GetSystem(), "File I/O");
  EXPECT_EQ(e.GetSubsystem(), "Open");
  EXPECT_EQ(e.GetIntErrorCode(), ERROR_FILE_NOT_FOUND);
  EXPECT_FALSE(e.GetOptionalErrorString().empty());
  EXPECT_FALSE(e.GetAttachment());
}

TEST(SystemErrorWindows, ApiFailuresReadTheLastError) {
  auto e = testing::Thrown([] {
    ::SetLastError(ERROR_ACCESS_DENIED);
    FailWinAPIError(0);
  });
  ASSERT_TRUE(e);
  EXPECT_EQ(e->GetKind(), "Windows");
  EXPECT_EQ(e->GetSystem(), "Windows");
  EXPECT_EQ(e->GetSubsystem(), "Windows");
  EXPECT_EQ(e->GetIntErrorCode(), ERROR_ACCESS_DENIED);

  e = testing::Thrown([] {
    ::SetLastError(ERROR_INVALID_PARAMETER);
    do_FailWinAPIError(0, "t.cpp", 8);
  });
  ASSERT_TRUE(e);
  testing::ExpectFields(*e, "Windows", "Windows", "Windows", ERROR_INVALID_PARAMETER, "t.cpp 8");
}

}  // namespace
}  // namespace tarn
