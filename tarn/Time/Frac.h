// A whole number plus a numerator over a fixed denominator D.
//
// Canonical form, which every operation leaves behind:
//   -D < numerator < D, and the numerator never has the opposite sign of a
//   non-zero whole part (whole > 0 => numerator >= 0, whole < 0 =>
//   numerator <= 0); with a zero whole part the numerator carries the sign.
// Because of it, comparison is lexicographic on (whole, numerator).
// Integer overflow of the parts wraps; division by zero is the caller's fault.
//
//   Frac<7200000> a(1, -1);   // canonical: (0, 7199999)
//   Frac<7200000> b = a + a;  // (1, 7199998)
#pragma once

#include <cmath>
#include <compare>
#include <cstdint>

#include "tarn/Time/WrappingMath.h"

namespace tarn {

template <int D>
class Frac {
  static_assert(D > 1, "the denominator must exceed 1");

 public:
  // Selects the constructor that stores a pair already known to be canonical.
  struct AlreadyCanonical {};

  constexpr Frac() noexcept = default;
  constexpr Frac(int whole, int numerator) noexcept : whole_(whole), numerator_(numerator) {
    if (numerator_ != 0) MakeCanonical();
  }
  constexpr Frac(int whole, int numerator, AlreadyCanonical) noexcept
      : whole_(whole), numerator_(numerator) {}
  constexpr Frac(const Frac&) noexcept = default;
  constexpr Frac& operator=(const Frac&) noexcept = default;

  [[nodiscard]] static constexpr int Denominator() noexcept { return D; }

  constexpr void MakeCanonical() noexcept {
    // Equivalent to stepping by D until the numerator lies in (-D, D).
    whole_ = detail::WrapAdd32(whole_, numerator_ / D);
    numerator_ %= D;
    CorrectSign();
  }

  [[nodiscard]] constexpr int IntegerPart() const noexcept { return whole_; }
  [[nodiscard]] constexpr int FractionalPart() const noexcept { return numerator_; }
  [[nodiscard]] constexpr int Floor() const noexcept {
    return numerator_ < 0 ? detail::WrapSub32(whole_, 1) : whole_;
  }
  [[nodiscard]] constexpr int Ceiling() const noexcept {
    return numerator_ > 0 ? detail::WrapAdd32(whole_, 1) : whole_;
  }
  // Halves round toward +infinity: 0.5 gives 1, -0.5 gives 0, -0.75 gives -1.
  [[nodiscard]] constexpr int Round() const noexcept {
    return (*this + Frac(0, D / 2, AlreadyCanonical{})).Floor();
  }
  [[nodiscard]] constexpr double AsDouble() const noexcept {
    return whole_ + static_cast<double>(numerator_) / D;
  }

  [[nodiscard]] constexpr Frac operator-() const noexcept {
    return Frac(detail::WrapNeg32(whole_), detail::WrapNeg32(numerator_), AlreadyCanonical{});
  }
  [[nodiscard]] constexpr Frac AbsoluteValue() const noexcept {
    const bool negative = whole_ != 0 ? whole_ < 0 : numerator_ < 0;
    return negative ? -*this : *this;
  }

  friend constexpr Frac operator+(Frac a, Frac b) noexcept {
    return Normalized(detail::WrapAdd32(a.whole_, b.whole_),
                      detail::WrapAdd32(a.numerator_, b.numerator_));
  }
  friend constexpr Frac operator-(Frac a, Frac b) noexcept {
    return Normalized(detail::WrapSub32(a.whole_, b.whole_),
                      detail::WrapSub32(a.numerator_, b.numerator_));
  }
  constexpr Frac& operator+=(Frac rhs) noexcept { return *this = *this + rhs; }
  constexpr Frac& operator-=(Frac rhs) noexcept { return *this = *this - rhs; }

  // Scales through double precision: the numerator is rounded half away from zero.
  Frac& operator*=(int n) noexcept { return *this = FromDouble(AsDouble() * n); }
  Frac& operator/=(int n) noexcept { return *this = FromDouble(AsDouble() / n); }

  friend constexpr bool operator==(const Frac&, const Frac&) noexcept = default;
  friend constexpr auto operator<=>(const Frac&, const Frac&) noexcept = default;

 private:
  constexpr void CorrectSign() noexcept {
    if (whole_ > 0 && numerator_ < 0) {
      numerator_ += D;
      --whole_;
    } else if (whole_ < 0 && numerator_ > 0) {
      numerator_ -= D;
      ++whole_;
    }
  }

  // Brings a numerator from anywhere in the int range into (-D, D) by division.
  static constexpr Frac Normalized(int whole, int numerator) noexcept {
    Frac r(whole, numerator, AlreadyCanonical{});
    if (numerator == 0) return r;
    if (numerator >= D) {
      r.whole_ = detail::WrapAdd32(whole, numerator / D);
      r.numerator_ = numerator % D;
    } else if (numerator < -(D - 1)) {
      const int k = static_cast<int>((-static_cast<std::int64_t>(D) - numerator) / D + 1);
      r.numerator_ = static_cast<int>(numerator + static_cast<std::int64_t>(k) * D);
      r.whole_ = detail::WrapSub32(whole, k);
    }
    r.CorrectSign();
    return r;
  }

  static Frac FromDouble(double v) noexcept {
    if (!std::isfinite(v)) return Frac(detail::TruncateToInt<int>(v), 0, AlreadyCanonical{});
    const double whole = std::trunc(v);
    const auto numerator = static_cast<int>(std::round((v - whole) * D));
    const auto wrapped = static_cast<int>(static_cast<std::uint32_t>(
        static_cast<std::uint64_t>(detail::TruncateToInt<std::int64_t>(whole))));
    Frac r(wrapped, numerator, AlreadyCanonical{});
    r.MakeCanonical();
    return r;
  }

  int whole_ = 0;
  int numerator_ = 0;
};

}  // namespace tarn
