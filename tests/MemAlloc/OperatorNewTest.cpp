// The global operators (served by HydraAllocator where Tarn::HydraOverride
// is linked, by the C++ runtime otherwise): every form C++20 has, with any
// power-of-two alignment.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <memory>
#include <new>
#include <vector>

namespace tarn {
namespace {

TEST(OperatorNew, AlignedFormsHonourEveryPowerOfTwo) {
  for (std::size_t align = 1; align <= 8192; align *= 2) {
    for (std::size_t size : {std::size_t{0}, std::size_t{1}, std::size_t{100}, std::size_t{5000},
                             std::size_t{70'000}}) {
      const auto a = static_cast<std::align_val_t>(align);
      void* p = ::operator new(size, a);
      void* q = ::operator new[](size, a);
      void* r = ::operator new(size, a, std::nothrow);
      void* s = ::operator new[](size, a, std::nothrow);
      for (void* x : {p, q, r, s}) {
        ASSERT_NE(x, nullptr);
        ASSERT_EQ(reinterpret_cast<uintptr_t>(x) % align, 0u) << align << " " << size;
        std::memset(x, 0x5A, size);
      }
      ::operator delete(p, a);
#ifdef __cpp_sized_deallocation
      ::operator delete[](q, size, a);
#else
      ::operator delete[](q, a);
#endif
      ::operator delete(r, a, std::nothrow);
      ::operator delete[](s, a, std::nothrow);
    }
  }
}

TEST(OperatorNew, PlainNothrowAndSizedForms) {
  for (std::size_t size :
       {std::size_t{0}, std::size_t{7}, std::size_t{41'321}, std::size_t{1} << 20}) {
    void* p = ::operator new(size);
    void* q = ::operator new[](size, std::nothrow);
    ASSERT_TRUE(p && q);
    EXPECT_EQ(reinterpret_cast<uintptr_t>(p) % __STDCPP_DEFAULT_NEW_ALIGNMENT__, 0u);
    std::memset(p, 1, size);
    std::memset(q, 1, size);
#ifdef __cpp_sized_deallocation
    ::operator delete(p, size);
#else
    ::operator delete(p);
#endif
    ::operator delete[](q, std::nothrow);
  }
  struct alignas(64) Wide {
    double lanes[8];
  };
  auto wide = std::make_unique<Wide[]>(33);
  EXPECT_EQ(reinterpret_cast<uintptr_t>(wide.get()) % 64, 0u);
  std::vector<Wide> many(100);
  EXPECT_EQ(reinterpret_cast<uintptr_t>(many.data()) % 64, 0u);
}

TEST(OperatorNew, HugeRequestThrowsBadAlloc) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "the sanitizers' allocators report huge requests instead of failing them";
#endif
  volatile std::size_t huge = SIZE_MAX / 2;
  EXPECT_THROW((void)::operator new(huge), std::bad_alloc);
  EXPECT_EQ(::operator new(huge, std::nothrow), nullptr);
  EXPECT_THROW((void)::operator new (huge, std::align_val_t{64}), std::bad_alloc);
}

}  // namespace
}  // namespace tarn
