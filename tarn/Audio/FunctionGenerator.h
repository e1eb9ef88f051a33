// Periodic reference signals of known value at any time.
//
// A WaveCycle is the shape of one cycle over the phase [0, 1); a
// FunctionGenerator stretches a shape to a period and scales it by an
// amplitude. Values are pure functions of time: generators hold no running
// state, so any number of threads may call GetValue on one generator.
//
//   FunctionGenerator tone(new SineWave, 48000.0 / 440.0, 0.5);
//   for (int i = 0; i < n; ++i) out[i] = float(tone.GetValue(i));
#pragma once

#include <memory>

namespace tarn {

class WaveCycle {
 public:
  WaveCycle() = default;
  WaveCycle(const WaveCycle&) = default;
  WaveCycle& operator=(const WaveCycle&) = default;
  virtual ~WaveCycle() = default;

  // The shape's value at `phase`. Phases outside [0, 1) are evaluated by the
  // same formula, unfolded (negative times keep their sign).
  [[nodiscard]] virtual double GetValue(double phase) const = 0;
};

// sin(2πp): 0 at phase 0, spanning -1..+1.
class SineWave final : public WaveCycle {
 public:
  [[nodiscard]] double GetValue(double phase) const override;
};

// Unipolar on purpose: 1.0 for p < 0.5, otherwise 0.0.
class SquareWave final : public WaveCycle {
 public:
  [[nodiscard]] double GetValue(double phase) const override;
};

// 2p - 1: -1 at phase 0, rising towards +1.
class SawToothWave final : public WaveCycle {
 public:
  [[nodiscard]] double GetValue(double phase) const override;
};

// 4p - 1 for p < 0.5, else -4p + 3: -1 at phase 0, +1 at phase 0.5.
class TriangleWave final : public WaveCycle {
 public:
  [[nodiscard]] double GetValue(double phase) const override;
};

class FunctionGenerator {
 public:
  // Takes ownership of `shape`. A null shape throws the out-of-memory error
  // (-108), so a failed `new` passed straight in is reported.
  FunctionGenerator(WaveCycle* shape, double period, double amplitude);
  FunctionGenerator(const FunctionGenerator&) = delete;
  FunctionGenerator& operator=(const FunctionGenerator&) = delete;
  FunctionGenerator(FunctionGenerator&&) noexcept = default;
  FunctionGenerator& operator=(FunctionGenerator&&) noexcept = default;
  ~FunctionGenerator() = default;

  // amplitude × shape(fmod(t / period, 1.0)).
  [[nodiscard]] double GetValue(double t) const;
  [[nodiscard]] double GetPeriod() const noexcept { return period_; }
  [[nodiscard]] double GetAmplitude() const noexcept { return amplitude_; }

 private:
  std::unique_ptr<WaveCycle> shape_;
  double period_;
  double amplitude_;
};

}  // namespace tarn
