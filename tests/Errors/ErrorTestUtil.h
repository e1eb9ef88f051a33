// Helpers shared by the error tests.
#pragma once

#include <gtest/gtest.h>

#include <optional>
#include <ostream>

#include "tarn/Errors/TarnError.h"

namespace tarn {
inline void PrintTo(const TarnError& error, std::ostream* os) { *os << error.Describe(); }
}  // namespace tarn

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

// Compares every field but the attachment against an error built from them.
inline void ExpectFields(const std::optional<TarnError>& e, const char* kind, const char* system,
                         const char* subsystem, int code, const char* text = "") {
  ASSERT_TRUE(e) << "nothing thrown";
  EXPECT_EQ(*e, TarnError(kind, system, subsystem, code, text));
}

}  // namespace tarn::testing
