// RCBlobMT: shared bytes whose count may be taken and dropped on any thread,
// and the refusal of blocks too large to be sizes of the chunk files.

#include "tarn/Basics/RCBlobMT.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <thread>
#include <vector>

#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

using Bytes = std::vector<std::uint8_t>;

Bytes Counting(std::size_t n, std::uint8_t seed) {
  Bytes bytes(n);
  for (std::size_t i = 0; i < n; ++i) bytes[i] = static_cast<std::uint8_t>(seed + i * 7);
  return bytes;
}

TEST(RCBlobMT, SharesBytesAcrossThreadsAndRefusesHugeBlocks) {
  const RCBlobMT blob(Counting(1000, 1).data(), 1000);
  EXPECT_EQ(blob.GetSize(), 1000);
  EXPECT_EQ(Bytes(blob.GetPtr(), blob.GetPtr() + 1000), Counting(1000, 1));
  EXPECT_TRUE(RCBlobMT(blob).SameBytes(blob));
  EXPECT_FALSE(RCBlobMT(Counting(1000, 2).data(), 1000).SameBytes(blob));
  EXPECT_TRUE(RCBlobMT().SameBytes(RCBlobMT(0)));
  EXPECT_EQ(RCBlobMT().GetPtr(), nullptr);
  const RCBlobMT zeros(64);
  EXPECT_EQ(Bytes(zeros.GetPtr(), zeros.GetPtr() + 64), Bytes(64));
  {
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
      threads.emplace_back([&blob] {
        for (int i = 0; i < 20000; ++i) {
          RCBlobMT copy = blob;
          RCBlobMT moved = std::move(copy);
          ASSERT_EQ(moved.GetPtr()[999], blob.GetPtr()[999]);
        }
      });
    }
    for (auto& t : threads) t.join();
  }
  EXPECT_EQ(blob.UseCount(), 1);
  try {
    RCBlobMT huge(std::size_t{0x80000000});
    ADD_FAILURE() << "a block of 2 GiB was made";
  } catch (const TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -50);
  }
}

}  // namespace
}  // namespace tarn
