// Helpers shared by the error tests.
#pragma once

#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "tarn/Errors/TarnError.h"

namespace tarn::testing {

// Runs fn and returns the TarnError it threw, or nothing if it returned.
template <typename Fn>
std::optional<TarnError> Thrown(Fn&& fn) {
  try {
    fn();
  } catch (const TarnError& error) {
    return error;
  }
  return std::nullopt;
}

// Compares every field but the attachment, printing them on failure.
inline void ExpectFields(const TarnError& e, const char* kind, const char* system,
                         const char* subsystem, int code, const char* errorString) {
  EXPECT_EQ(e.GetKind().str(), kind);
  EXPECT_EQ(e.GetSystem().str(), system);
  EXPECT_EQ(e.GetSubsystem().str(), subsystem);
  EXPECT_EQ(e.GetIntErrorCode(), code);
  EXPECT_EQ(e.GetOptionalErrorString().str(), errorString);
}

}  // namespace tarn::testing
