// Small helpers, and the headers, shared by the thread tests.
#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <numeric>
#include <thread>
#include <vector>

#include "tarn/Errors/TarnError.h"

namespace tarn::test {

// Runs body(i) on count threads and joins them.
template <class F>
void RunThreads(int count, F body) {
  std::vector<std::thread> threads;
  for (int i = 0; i < count; ++i) threads.emplace_back(body, i);
  for (auto& t : threads) t.join();
}

// Runs body on another thread and returns its result.
template <class F>
auto OnOtherThread(F body) {
  decltype(body()) result{};
  std::thread([&] { result = body(); }).join();
  return result;
}

// Polls done() every millisecond for about 10 s.
template <class Pred>
bool Eventually(Pred done) {
  for (int i = 0; i < 10000 && !done(); ++i)
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  return done();
}

// The TarnError that f throws (a failure when it throws none).
inline TarnError CatchError(const std::function<void()>& f) {
  try {
    f();
  } catch (const TarnError& e) {
    return e;
  }
  ADD_FAILURE() << "no TarnError thrown";
  return TarnError();
}

}  // namespace tarn::test
