// TARN_ASSERT: an always-on assertion (release builds too) that reports to
// the sibling library's assertion handler, TPOAssertionFailed. The default
// handler prints the expression and source location and aborts; a host may
// install one that returns, in which case execution continues after the
// macro.
#pragma once

#include "TarnPublicObjects/TarnPublicObjects.h"

#define TARN_ASSERT(expr) \
  (static_cast<bool>(expr) ? (void)0 : ::TPOAssertionFailed(#expr, __FILE__, __LINE__))

// As TARN_ASSERT, reporting message (a string literal or C string) instead
// of the expression text.
#define TARN_ASSERT_MSG(expr, message) \
  (static_cast<bool>(expr) ? (void)0 : ::TPOAssertionFailed((message), __FILE__, __LINE__))
