#include "tarn/Errors/TarnAssert.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace {

std::string gExpression, gFile;
int gCalls = 0;

void RecordingHandler(const char* expression, const char* file, int /*line*/) {
  ++gCalls;
  gExpression = expression;
  gFile = file;
}

class TarnAssertTest : public ::testing::Test {
 protected:
  void SetUp() override {
    gCalls = 0;
    previous_ = TPOSetAssertionHandler(&RecordingHandler);
  }
  void TearDown() override { TPOSetAssertionHandler(previous_); }

 private:
  TPOAssertionHandler previous_ = nullptr;
};

TEST_F(TarnAssertTest, ReportsFailuresToTheSiblingHandlerOnce) {
  int evaluations = 0;
  TARN_ASSERT(++evaluations == 1);
  EXPECT_EQ(evaluations, 1);
  EXPECT_EQ(gCalls, 0);

  std::unique_ptr<int> none;
  TARN_ASSERT(none);  // anything that tests as bool
  EXPECT_EQ(gCalls, 1);
  EXPECT_EQ(gExpression, "none");
  EXPECT_NE(gFile.find("TarnAssertTest.cpp"), std::string::npos);

  TARN_ASSERT_MSG(evaluations == 2, "px != 0");
  EXPECT_EQ(gCalls, 2);
  EXPECT_EQ(gExpression, "px != 0");
}

TEST(TarnAssertDeathTest, DefaultHandlerEndsTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  int* px = nullptr;
  EXPECT_DEATH(TARN_ASSERT(px != 0), "px != 0");
}

}  // namespace
