#include <gtest/gtest.h>

#include <bit>
#include <cstdint>
#include <cstring>
#include <random>
#include <tuple>
#include <vector>

#include "tarn/Basics/ConstantString.h"
#include "tarn/Basics/Endian.h"
#include "tarn/Basics/Handle.h"
#include "tarn/Basics/Smoosher.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

using Bytes = std::vector<unsigned char>;

TEST(Endian, SwapsReverseEachElementOnly) {
  for (auto [size, count, want] : {std::tuple{4, 1, Bytes{4, 3, 2, 1, 5, 6}},
                                   {3, 1, Bytes{3, 2, 1, 4, 5, 6}},
                                   {1, 1, Bytes{1, 2, 3, 4, 5, 6}},
                                   {0, 1, Bytes{1, 2, 3, 4, 5, 6}},
                                   {2, 3, Bytes{2, 1, 4, 3, 6, 5}},
                                   {3, 2, Bytes{3, 2, 1, 6, 5, 4}}}) {
    Bytes b{1, 2, 3, 4, 5, 6};
    count == 1 ? Endian::Swap(b.data(), size) : Endian::SwapArray(b.data(), size, count);
    EXPECT_EQ(b, want) << size << " x " << count;
  }
  EXPECT_EQ(Endian::Swapped(std::uint16_t{0x1234}), 0x3412);
  EXPECT_EQ(Endian::Swapped(std::uint32_t{0x12345678}), 0x78563412u);
  EXPECT_EQ(Endian::Swapped(std::uint64_t{0x0102030405060708}), 0x0807060504030201u);
  EXPECT_EQ(std::bit_cast<std::uint64_t>(Endian::Swapped(1.5)),
            Endian::Swapped(std::bit_cast<std::uint64_t>(1.5)));
}

// Fields packed most significant bit first into big-endian 32-bit words; a
// word is written when full or, padded with zeros, by the destructor.
using Fields = std::vector<std::pair<int, short>>;
void Pack(unsigned int* words, const Fields& fields) {
  Smoosher s(words);
  for (auto [value, n] : fields) s.Put(value, n);
}

TEST(Smoosher, ExactBitImagesAndRandomRoundTrips) {
  for (auto [fields, want] :
       {std::pair{Fields{{0b101, 3}, {0b00011, 5}}, Bytes{0xA3, 0, 0, 0, 0xFF, 0xFF, 0xFF, 0xFF}},
        {Fields{{0x12345678, 32}}, Bytes{0x12, 0x34, 0x56, 0x78, 0xFF, 0xFF, 0xFF, 0xFF}},
        {Fields{{0xABCDE, 20}, {0x12345, 20}, {0x3FF, 10}},
         Bytes{0xAB, 0xCD, 0xE1, 0x23, 0x45, 0xFF, 0xC0, 0}},
        {Fields{{-3 & 0x1F, 5}}, Bytes{0xE8, 0, 0, 0, 0xFF, 0xFF, 0xFF, 0xFF}}}) {
    unsigned int words[2] = {0xFFFFFFFF, 0xFFFFFFFF};
    Pack(words, fields);
    Bytes got(8);
    std::memcpy(got.data(), words, 8);
    EXPECT_EQ(got, want);
  }
  std::mt19937 rng(7);
  for (int round = 0; round < 200; ++round) {
    Fields fields;
    unsigned int bits = 0;
    for (int i = 0; i < 50; ++i) {
      const auto n = static_cast<short>(1 + rng() % 31);
      fields.emplace_back(static_cast<int>(rng() & ((1u << n) - 1)), n);
      bits += static_cast<unsigned>(n);
    }
    SmoosherBuffer buf(bits);
    ASSERT_EQ(buf.GetSize(), (bits + 31) / 32 * 4);
    Pack(buf.GetBuffer(), fields);
    UnSmoosher u(buf.GetBuffer());
    for (auto [value, n] : fields) ASSERT_EQ(u.Get(n), value) << "round " << round;
  }
  EXPECT_EQ(SmoosherBuffer(0).GetBuffer(), nullptr);
  EXPECT_EQ(SmoosherBuffer(0xFFFFFFFFu).GetSize() / 4, 0x8000000u) << "no overflow in the sizing";
}

TEST(Handle, GrowsZeroFilledKeepsContentAndOwns) {
  auto_handle<char> h(NewHandle(3));
  ASSERT_TRUE(h && std::string(h.data(), 3) == std::string(3, '\0'));
  std::memcpy(h.data(), "abc", 3);
  for (std::size_t size = 4; size < 5000; size += 97) {
    SetHandleSize(h.get(), size);
    ASSERT_EQ(GetHandleSize(h.get()), size);
    ASSERT_EQ(std::string(h.data(), size), "abc" + std::string(size - 3, '\0')) << size;
  }
  // Shrinking and growing again exposes zeros, not the old bytes.
  std::memset(h.data(), 'x', GetHandleSize(h.get()));
  for (std::size_t size : {2, 10}) SetHandleSize(h.get(), size);
  EXPECT_EQ(std::string(h.data(), 10), std::string("xx") + std::string(8, '\0'));
  try {
    SetHandleSize(h.get(), static_cast<std::size_t>(-1) / 2);
    ADD_FAILURE() << "no error";
  } catch (const TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -108);
  }
  EXPECT_EQ(h.size(), 10u) << "a failed resize leaves the block unchanged";
  SetHandleSize(h.get(), 0);
  auto_handle<char> moved(std::move(h));
  EXPECT_TRUE(!h && moved.size() == 0 && GetHandleSize(nullptr) == 0);
  DisposeHandle(moved.release());
  EXPECT_FALSE(moved);
  DisposeHandle(nullptr);
}

TEST(ConstantString, CopiesAtMostCapacityAndTerminates) {
  const std::pair<const char*, const char*> rows[] = {
      {nullptr, ""}, {"", ""}, {"abc", "abc"}, {"abcd", "abcd"}, {"abcde", "abcd"}};
  for (auto [in, want] : rows) {
    const ConstantString<5> a(in), b(std::string_view(in ? in : ""));
    EXPECT_TRUE(a.str() == want && a == b && a == want && a.view() == want &&
                a.length() == std::strlen(want) && a.empty() == !*want)
        << want;
  }
  ConstantString<5> s("abcd");
  s = "x";
  EXPECT_TRUE(std::memcmp(s.c_str(), "x\0\0\0\0", 5) == 0 && s == "x" && !(s == nullptr) &&
              ConstantString<5>() == nullptr);  // the bytes after the terminator are 0
}

}  // namespace
}  // namespace tarn
