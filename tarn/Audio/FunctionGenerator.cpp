#include "tarn/Audio/FunctionGenerator.h"

#include <cmath>

#include "tarn/Errors/Fail.h"

namespace tarn {

double SineWave::GetValue(double phase) const { return std::sin(phase * 2.0 * 3.141592653589793); }

double SquareWave::GetValue(double phase) const { return phase < 0.5 ? 1.0 : 0.0; }

double SawToothWave::GetValue(double phase) const { return 2.0 * phase - 1.0; }

double TriangleWave::GetValue(double phase) const {
  return phase < 0.5 ? 4.0 * phase - 1.0 : -4.0 * phase + 3.0;
}

FunctionGenerator::FunctionGenerator(WaveCycle* shape, double period, double amplitude)
    : shape_(shape), period_(period), amplitude_(amplitude) {
  if (shape == nullptr) FailMemFullError();
}

double FunctionGenerator::GetValue(double t) const {
  return amplitude_ * shape_->GetValue(std::fmod(t / period_, 1.0));
}

}  // namespace tarn
