#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <random>
#include <vector>

#include "tarn/Basics/Endian.h"
#include "tarn/Basics/Handle.h"
#include "tarn/Basics/Smoosher.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

std::vector<unsigned char> BytesOf(const unsigned int* words, unsigned int byteCount) {
  std::vector<unsigned char> out(byteCount);
  std::memcpy(out.data(), words, byteCount);
  return out;
}

TEST(Endian, SwapReversesTheGivenBytesOnly) {
  unsigned char b[4] = {1, 2, 3, 4};
  Endian::Swap(b, 4);
  EXPECT_EQ(std::vector<unsigned char>(b, b + 4), (std::vector<unsigned char>{4, 3, 2, 1}));
  unsigned char c[4] = {1, 2, 3, 4};
  Endian::Swap(c, 3);
  EXPECT_EQ(std::vector<unsigned char>(c, c + 4), (std::vector<unsigned char>{3, 2, 1, 4}));
  unsigned char d[2] = {7, 8};
  Endian::Swap(d, 1);
  Endian::Swap(d, 0);
  EXPECT_EQ(d[0], 7);
  EXPECT_EQ(d[1], 8);
}

TEST(Endian, SwapArraySwapsEachElement) {
  unsigned char b[6] = {1, 2, 3, 4, 5, 6};
  Endian::SwapArray(b, 2, 3);
  EXPECT_EQ(std::vector<unsigned char>(b, b + 6), (std::vector<unsigned char>{2, 1, 4, 3, 6, 5}));
  unsigned char c[6] = {1, 2, 3, 4, 5, 6};
  Endian::SwapArray(c, 3, 2);
  EXPECT_EQ(std::vector<unsigned char>(c, c + 6), (std::vector<unsigned char>{3, 2, 1, 6, 5, 4}));
}

TEST(Endian, SwappedMatchesSwapForEveryWidth) {
  EXPECT_EQ(Endian::Swapped(std::uint16_t{0x1234}), 0x3412);
  EXPECT_EQ(Endian::Swapped(std::uint32_t{0x12345678}), 0x78563412u);
  EXPECT_EQ(Endian::Swapped(std::uint64_t{0x0102030405060708}), 0x0807060504030201u);
  const double d = 1.5;
  double viaSwap = d;
  Endian::Swap(&viaSwap, 8);
  const double viaSwapped = Endian::Swapped(d);
  EXPECT_EQ(std::memcmp(&viaSwap, &viaSwapped, 8), 0);
  EXPECT_EQ(Endian::Swapped(Endian::Swapped(-2.25f)), -2.25f);
}

TEST(Smoosher, ThreeAndFiveBitsMakeA3) {
  unsigned int words[2] = {0xFFFFFFFF, 0xFFFFFFFF};
  {
    Smoosher s(words);
    s.Put(0b101, 3);
    s.Put(0b00011, 5);
  }
  EXPECT_EQ(BytesOf(words, 8), (std::vector<unsigned char>{0xA3, 0, 0, 0, 0xFF, 0xFF, 0xFF, 0xFF}));
}

TEST(Smoosher, AWhole32BitFieldFillsOneWordAndLeavesNothingPending) {
  unsigned int words[2] = {0xFFFFFFFF, 0xFFFFFFFF};
  {
    Smoosher s(words);
    s.Put(0x12345678, 32);
  }
  // Nothing was pending, so the destructor wrote no second word.
  EXPECT_EQ(BytesOf(words, 8),
            (std::vector<unsigned char>{0x12, 0x34, 0x56, 0x78, 0xFF, 0xFF, 0xFF, 0xFF}));
  UnSmoosher u(words);
  EXPECT_EQ(u.Get(16), 0x1234);
  EXPECT_EQ(u.Get(16), 0x5678);
}

TEST(Smoosher, StraddlingFieldsSplitAcrossWordsAndReadBack) {
  SmoosherBuffer buf(60);
  ASSERT_EQ(buf.GetSize(), 8u);
  {
    Smoosher s(buf.GetBuffer());
    s.Put(0xABCDE, 20);
    s.Put(0x12345, 20);  // 12 bits in word 0, 8 bits in word 1
    s.Put(0x3FF, 10);
  }
  // 0xABCDE then 0x12345 then 0x3FF, padded with zeros.
  EXPECT_EQ(BytesOf(buf.GetBuffer(), 8),
            (std::vector<unsigned char>{0xAB, 0xCD, 0xE1, 0x23, 0x45, 0xFF, 0xC0, 0x00}));
  UnSmoosher u(buf.GetBuffer());
  EXPECT_EQ(u.Get(20), 0xABCDE);
  EXPECT_EQ(u.Get(20), 0x12345);
  EXPECT_EQ(u.Get(10), 0x3FF);
}

TEST(Smoosher, RandomFieldSequencesRoundTrip) {
  std::mt19937 rng(7);
  for (int round = 0; round < 200; ++round) {
    std::vector<std::pair<int, short>> fields;
    unsigned int bits = 0;
    for (int i = 0; i < 50; ++i) {
      const short n = static_cast<short>(1 + rng() % 31);
      const int value = static_cast<int>(rng() & ((1u << n) - 1));
      fields.emplace_back(value, n);
      bits += static_cast<unsigned>(n);
    }
    SmoosherBuffer buf(bits);
    {
      Smoosher s(buf.GetBuffer());
      for (auto [value, n] : fields) s.Put(value, n);
    }
    UnSmoosher u(buf.GetBuffer());
    for (auto [value, n] : fields) ASSERT_EQ(u.Get(n), value) << "round " << round;
  }
}

TEST(Smoosher, NegativeValuesComeBackAsBitPatterns) {
  unsigned int words[1] = {};
  {
    Smoosher s(words);
    s.Put(-3 & 0x1F, 5);  // the caller reduces to the field's width
  }
  UnSmoosher u(words);
  const int raw = u.Get(5);
  EXPECT_EQ(raw, 0b11101);
  EXPECT_EQ((raw ^ 0x10) - 0x10, -3);  // sign-extended by the caller
}

TEST(SmoosherBuffer, SizesAreWholeWords) {
  EXPECT_EQ(SmoosherBuffer(1).GetSize(), 4u);
  EXPECT_EQ(SmoosherBuffer(32).GetSize(), 4u);
  EXPECT_EQ(SmoosherBuffer(33).GetSize(), 8u);
  SmoosherBuffer empty(0);
  EXPECT_EQ(empty.GetSize(), 0u);
  EXPECT_EQ(empty.GetBuffer(), nullptr);
  EXPECT_EQ(SmoosherBuffer(0xFFFFFFFFu).GetSize() / 4, 0x8000000u) << "no overflow in the sizing";
}

TEST(Handle, GrowsZeroFilledAndKeepsContent) {
  auto_handle<char> h(NewHandle(3));
  ASSERT_TRUE(h);
  EXPECT_EQ(h.size(), 3u);
  for (int i = 0; i < 3; ++i) EXPECT_EQ(h.data()[i], 0);
  std::memcpy(h.data(), "abc", 3);
  for (std::size_t size = 4; size < 5000; size += 97) {
    SetHandleSize(h.get(), size);
    ASSERT_EQ(GetHandleSize(h.get()), size);
    ASSERT_EQ(std::memcmp(h.data(), "abc", 3), 0);
    for (std::size_t i = 3; i < size; ++i) ASSERT_EQ(h.data()[i], 0) << size << " " << i;
  }
  // Shrinking and growing again exposes zeros, not the old bytes.
  std::memset(h.data(), 'x', GetHandleSize(h.get()));
  SetHandleSize(h.get(), 2);
  SetHandleSize(h.get(), 10);
  EXPECT_EQ(std::string(h.data(), 10), std::string("xx") + std::string(8, '\0'));
  SetHandleSize(h.get(), 0);
  EXPECT_EQ(h.size(), 0u);
}

TEST(Handle, AutoHandleOwnsAndMoves) {
  auto_handle<char> a(NewHandle(8));
  auto_handle<char> b(std::move(a));
  EXPECT_FALSE(a);
  EXPECT_EQ(b.size(), 8u);
  char** raw = b.release();
  EXPECT_FALSE(b);
  DisposeHandle(raw);
  DisposeHandle(nullptr);
  EXPECT_EQ(GetHandleSize(nullptr), 0u);
}

TEST(Handle, ImpossibleSizeFailsWithMemFull) {
  auto_handle<char> h(NewHandle(4));
  try {
    SetHandleSize(h.get(), static_cast<std::size_t>(-1) / 2);
    FAIL() << "no error";
  } catch (const TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -108);
  }
  EXPECT_EQ(h.size(), 4u) << "a failed resize leaves the block unchanged";
}

}  // namespace
}  // namespace tarn
