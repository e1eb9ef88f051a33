#include "tarn/Errors/TarnError.h"

#include <gtest/gtest.h>

TEST(TarnError, DefaultIsOSNoError) {
  tarn::TarnError e;
  EXPECT_EQ(e.GetKind(), "OS");
  EXPECT_EQ(e.GetIntErrorCode(), 0);
}
