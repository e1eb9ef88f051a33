#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>

#include "ErrorTestUtil.h"
#include "tarn/Errors/Fail.h"

namespace tarn {
namespace {

TEST(SystemErrorPOSIX, LastErrorIsErrnoWithItsText) {
  errno = ENOENT;
  const TarnError e = GetLastErrorAsTarnError("File I/O", "Open");
  testing::ExpectFields(e, "POSIX", "File I/O", "Open", ENOENT, std::strerror(ENOENT));
  EXPECT_FALSE(e.GetAttachment());
}

TEST(SystemErrorPOSIX, ApiFailuresReadErrno) {
  auto e = testing::Thrown([] {
    errno = EACCES;
    FailWinAPIError(0);
  });
  ASSERT_TRUE(e);
  testing::ExpectFields(*e, "POSIX", "POSIX", "POSIX", EACCES, std::strerror(EACCES));

  e = testing::Thrown([] {
    errno = EINVAL;
    do_FailWinAPIError(0, "t.cpp", 8);
  });
  ASSERT_TRUE(e);
  testing::ExpectFields(*e, "POSIX", "POSIX", "POSIX", EINVAL, "t.cpp 8");
}

}  // namespace
}  // namespace tarn
