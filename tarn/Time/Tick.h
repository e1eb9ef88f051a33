// Musical time in 32.32 fixed point.
//
// A Tick holds one signed 64-bit raw value: the high 32 bits (signed) are
// whole ticks, the low 32 bits the fraction in units of 2^-32 tick. All
// arithmetic wraps on overflow like plain 64-bit integers; saturation is
// available only through AddPin. Construction from a double is the one
// pinning operation. Division by zero is the caller's fault.
//
//   Tick beat = Tick(480) + MakeTickByShifting(1, 1);  // 480.5 ticks
//   int whole = beat.Round();                          // 481
//
// Plain value: copyable, allocation-free, safe on any thread.
#pragma once

#include <compare>
#include <cstdint>

namespace tarn {

class CStream;

// The value type returned by Tick's named constants.
class TickConstant {
 public:
  explicit constexpr TickConstant(std::int64_t raw) noexcept : raw_(raw) {}
  [[nodiscard]] constexpr std::int64_t Raw() const noexcept { return raw_; }

 private:
  std::int64_t raw_;
};

class Tick {
 public:
  constexpr Tick() noexcept = default;
  constexpr Tick(int wholeTicks) noexcept  // NOLINT: implicit
      : raw_(static_cast<std::int64_t>(
            static_cast<std::uint64_t>(static_cast<std::uint32_t>(wholeTicks)) << 32)) {}
  // d ticks, pinned to +-(2^63 - 1024) raw (the largest doubles that fit),
  // then truncated toward zero. NaN gives 0.
  explicit Tick(double ticks) noexcept;
  constexpr Tick(TickConstant c) noexcept : raw_(c.Raw()) {}  // NOLINT: implicit
  constexpr Tick(const Tick&) noexcept = default;
  constexpr Tick& operator=(const Tick&) noexcept = default;

  [[nodiscard]] static constexpr TickConstant Zero() noexcept { return TickConstant(0); }
  [[nodiscard]] static constexpr TickConstant Epsilon() noexcept { return TickConstant(1); }
  [[nodiscard]] static constexpr TickConstant NegativeEpsilon() noexcept {
    return TickConstant(-1);
  }
  // 2147483647 whole ticks.
  [[nodiscard]] static constexpr TickConstant Max() noexcept {
    return TickConstant(0x7FFFFFFF00000000);
  }
  // -2147483647 whole ticks: the negation of Max(), not the most negative raw value.
  [[nodiscard]] static constexpr TickConstant Min() noexcept { return TickConstant(-Max().Raw()); }

  // Whole ticks: rounded down, rounded half up (toward +infinity), rounded up.
  [[nodiscard]] constexpr int Floor() const noexcept { return WholeOf(raw_); }
  [[nodiscard]] int Round() const noexcept;
  [[nodiscard]] int Ceiling() const noexcept;

  [[nodiscard]] double AsDouble() const noexcept;
  [[nodiscard]] constexpr std::int64_t AsLongLong() const noexcept { return raw_; }

  Tick& operator+=(Tick rhs) noexcept;
  Tick& operator-=(Tick rhs) noexcept;
  [[nodiscard]] Tick operator-() const noexcept;
  friend Tick operator+(Tick a, Tick b) noexcept { return a += b; }
  friend Tick operator-(Tick a, Tick b) noexcept { return a -= b; }
  // Scaling works on the raw value: raw * n, raw / n.
  [[nodiscard]] Tick operator*(int n) const noexcept;
  [[nodiscard]] Tick operator*(std::int64_t n) const noexcept;
  // raw * d truncated toward zero, not pinned; out of range gives the most negative raw.
  [[nodiscard]] Tick operator*(double d) const noexcept;
  [[nodiscard]] Tick operator/(std::int64_t n) const noexcept;
  // The 64-bit quotient of the raw values.
  [[nodiscard]] std::int64_t operator/(Tick rhs) const noexcept;
  [[nodiscard]] Tick operator%(Tick rhs) const noexcept;

  friend constexpr bool operator==(Tick, Tick) noexcept = default;
  friend constexpr auto operator<=>(Tick, Tick) noexcept = default;

  // Keeps debugger-friendly mirrors current in debug builds; no effect here.
  void UpdateDebugValues() noexcept {}

  // Stream form: the raw value as a big-endian signed 64-bit integer.
  void PutTo(CStream& stream) const;
  void GetFrom(CStream& stream);

 private:
  struct RawTag {};
  constexpr Tick(RawTag, std::int64_t raw) noexcept : raw_(raw) {}
  static constexpr int WholeOf(std::int64_t raw) noexcept { return static_cast<int>(raw >> 32); }

  friend constexpr Tick AssembleTick(int whole, unsigned fraction) noexcept;
  friend constexpr Tick MakeTickByShifting(int value, int shift) noexcept;

  std::int64_t raw_ = 0;
};

// whole + fraction * 2^-32 ticks.
[[nodiscard]] constexpr Tick AssembleTick(int whole, unsigned fraction) noexcept {
  return Tick(
      Tick::RawTag{},
      static_cast<std::int64_t>(
          (static_cast<std::uint64_t>(static_cast<std::uint32_t>(whole)) << 32) | fraction));
}

// Exactly value / 2^shift ticks, shift in 1..31.
[[nodiscard]] constexpr Tick MakeTickByShifting(int value, int shift) noexcept {
  return Tick(Tick::RawTag{},
              static_cast<std::int64_t>(static_cast<std::uint64_t>(static_cast<std::int64_t>(value))
                                        << (32 - shift)));
}

}  // namespace tarn
