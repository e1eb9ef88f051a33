// Dither generators on a 16-bit scale.
//
// `TriangularPDFDither16` is a linear congruential generator that sums two
// consecutive draws into a triangular distribution over [-65536, 65534]. Each
// value consumes two generator steps. The default constructor seeds from the
// current event time in sixtieths of a second, so generators made within the
// same sixtieth produce the same sequence; copies continue the sequence of
// the original from the point of copying. A generator belongs to one thread.
#pragma once

#include <cstdint>

namespace tarn {

class Dither16 {
 public:
  Dither16() = default;
  Dither16(const Dither16&) = default;
  Dither16& operator=(const Dither16&) = default;
  virtual ~Dither16() = default;

  // The next dither value; advances the generator.
  virtual std::int32_t Next() noexcept = 0;
};

class TriangularPDFDither16 final : public Dither16 {
 public:
  // Seeds with trunc(eventTimeSeconds * 60 + 0.5), low 32 bits.
  TriangularPDFDither16() noexcept;
  explicit TriangularPDFDither16(std::uint32_t seed) noexcept : mState(seed) {}
  TriangularPDFDither16(const TriangularPDFDither16&) = default;
  TriangularPDFDither16& operator=(const TriangularPDFDither16&) = default;
  ~TriangularPDFDither16() override = default;

  std::int32_t Next() noexcept override {
    const std::uint32_t s0 = mState;
    const std::uint32_t s1 = Step(s0);
    mState = Step(s1);
    return (static_cast<std::int32_t>(s1) >> 16) + (static_cast<std::int32_t>(s0) >> 16);
  }

  [[nodiscard]] std::uint32_t GetState() const noexcept { return mState; }

  // The seed a generator constructed at event time `seconds` starts from.
  [[nodiscard]] static std::uint32_t SeedForEventTime(double seconds) noexcept;

  static constexpr std::uint32_t Step(std::uint32_t s) noexcept {
    return s * 1664525u + 1013904223u;
  }

 private:
  std::uint32_t mState;
};

}  // namespace tarn
