#include "tarn/MemAlloc/HydraAllocator.h"

#include <array>
#include <cassert>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "tarn/MemAlloc/HydraAllocatorImpl.h"
#include "tarn/Threads/TarnThreadID.h"

namespace tarn {

// ---- Size classes ---------------------------------------------------------

namespace {

struct ClassTable {
  std::array<uint64_t, 255> sizes{};
  int count = 0;
  std::array<uint8_t, 256> small{};
  // Blocks a quick list may hold: 128 KB of blocks up to 1088 bytes (the
  // classes of requests up to 1 KB, which come and go in the largest
  // numbers), 32 KB of larger ones, and at least 4.
  std::array<uint32_t, 255> quickCap{};
};

constexpr ClassTable MakeClassTable() {
  ClassTable t;
  t.sizes[0] = 32;
  t.sizes[1] = 64;
  t.count = 2;
  while (t.count < 255) {
    const uint64_t a = t.sizes[t.count - 2], b = t.sizes[t.count - 1];
    if (a > UINT64_MAX - b) break;
    t.sizes[t.count++] = a + b;
  }
  for (int k = 0; k < t.count; ++k) {
    const uint64_t n = (t.sizes[k] <= 1088 ? 131'072 : 32'768) / t.sizes[k];
    t.quickCap[k] = n < 4 ? 4 : static_cast<uint32_t>(n);
  }
  for (int i = 0, k = 0; i < 256; ++i) {
    while (t.sizes[k] < 4u * static_cast<uint64_t>(i)) ++k;
    t.small[i] = static_cast<uint8_t>(k);
  }
  return t;
}

constexpr ClassTable kClasses = MakeClassTable();
static_assert(kClasses.count == BuddySystemSubAllocator::kMaxClasses);

// Every size here is a multiple of 4, so need / 4 is exact.
inline int ClassForNeed(uint64_t need) noexcept {
  if (need < 1024) return kClasses.small[need / 4];
  int k = kClasses.small[255];
  while (k < kClasses.count && kClasses.sizes[k] < need) ++k;
  return k < kClasses.count ? k : -1;
}

}  // namespace

int HydraSizeClasses::Count() noexcept { return kClasses.count; }
uint64_t HydraSizeClasses::Size(int k) noexcept { return kClasses.sizes[k]; }
int HydraSizeClasses::SmallIndex(int i) noexcept { return kClasses.small[i]; }
uint32_t HydraSizeClasses::CachedBlocks(int k) noexcept { return kClasses.quickCap[k]; }
int HydraSizeClasses::ClassFor(uint64_t bytes) noexcept {
  if (bytes < 1024) return kClasses.small[(bytes + 3) / 4];
  return ClassForNeed(bytes);
}

// ---- Block prefix -----------------------------------------------------------

namespace {

using namespace HydraSizeClasses;

constexpr std::size_t kPrefixBytes = 16;      // owner, magic, pad marker or slack
constexpr std::size_t kBlockHeaderBytes = 4;  // buddy header in front of the prefix

inline uint32_t Load32(const uint8_t* at) noexcept {
  uint32_t v;
  std::memcpy(&v, at, 4);
  return v;
}
inline void Store32(uint8_t* at, uint32_t v) noexcept { std::memcpy(at, &v, 4); }
inline BuddySystemSubAllocator* LoadOwner(const uint8_t* at) noexcept {
  BuddySystemSubAllocator* o;
  std::memcpy(&o, at, sizeof o);
  return o;
}
inline void StoreOwner(uint8_t* at, BuddySystemSubAllocator* o) noexcept {
  std::memcpy(at, &o, sizeof o);
}

// Kept out of line so that the compiler, not knowing the size's bound, calls
// the C runtime's memset (wide vector stores) rather than the string
// instructions it picks for a bounded size.
[[gnu::noinline]] void* ZeroWide(uint8_t* p, std::size_t bytes) noexcept {
  return std::memset(p, 0, bytes);
}

// Zero-fills the buddy block's user area p (16-byte aligned) for rounded
// bytes. Short areas are filled in whole 16-byte units (a block's user area
// always ends on such a unit: class sizes are multiples of 32) by plain
// vector stores, which beat both a call and the string instructions.
inline void* ZeroUserArea(uint8_t* p, std::size_t rounded) noexcept {
#if defined(__GNUC__)
  if (rounded > 192) return ZeroWide(p, rounded);  // a tail call
  using Unit = long long __attribute__((vector_size(16), may_alias));
  auto* unit = reinterpret_cast<Unit*>(p);
  Unit* const end = unit + (rounded + 15) / 16;
  const Unit zero{};
  for (; unit + 2 <= end; unit += 2) {
    unit[0] = zero;
    unit[1] = zero;
    __asm__("" : : "r"(unit) : "memory");  // keeps the loop from becoming a memset call
  }
  if (unit != end) *unit = zero;
  return p;
#else
  return std::memset(p, 0, rounded);
#endif
}

// What the bytes in front of a user pointer say about it.
struct BlockInfo {
  uint32_t magic = 0;        // 0: not one of ours
  uint8_t* owner = nullptr;  // where the owner is stored
};

// Reads the bytes in front of any pointer handed to Deallocate, which for a
// foreign block are another allocator's header (a sanitizer's red zone, or
// bytes a race detector knows as freed).
#if defined(__clang__) || defined(__GNUC__)
__attribute__((no_sanitize("address"), no_sanitize("hwaddress"), no_sanitize("thread")))
#endif
inline uint32_t
Peek32(const uint8_t* at) noexcept {
  return *reinterpret_cast<const volatile uint32_t*>(at);
}

inline BlockInfo Inspect(void* p) noexcept {
  auto* u = static_cast<uint8_t*>(p);
  BlockInfo info;
  if ((reinterpret_cast<uintptr_t>(u) & 4095) == 0 && !hydra_os::CanAccessPrecedingBytes(u))
    return info;
  uint32_t tag = Peek32(u - 4);
  uint8_t* magicAt = u - 4;
  if (tag == kPadMarker) {
    magicAt = u - 8;
    tag = Peek32(magicAt);
  }
  if (tag != kBuddyMagic && tag != kLargeMagic) return info;
  info.magic = tag;
  info.owner = magicAt - 8;
  return info;
}

// Buddy block header: class (bits 0-7), free (bit 8), side (bits 9-10),
// remembered side (bits 11-12), clean (bit 13, free blocks only), logical
// size / 4 (bits 16-31, live blocks only).
//
// Clean: every byte of the block from +24 on is zero. Memory fresh from the
// system is zero, and a free block's own header and list links lie within
// its first 24 bytes; so the root block of a fresh chunk is clean, and both
// halves of a clean block are clean (each half's region was zero beyond the
// parent's first 24 bytes). Handing out a clean block zeroes only the list
// link inside its user area instead of the whole area. Blocks freed after
// use, merged, or kept on the quick lists are never clean.
enum Side : uint32_t { kRoot = 0, kLeft = 1, kRight = 2 };
constexpr uint32_t kFreeBit = 1u << 8;
constexpr uint32_t kCleanBit = 1u << 13;

inline uint32_t MakeHeader(int c, bool isFree, uint32_t side, uint32_t memory) noexcept {
  return static_cast<uint32_t>(c) | (isFree ? kFreeBit : 0) | (side << 9) | (memory << 11);
}
inline int HeaderClass(uint32_t h) noexcept { return static_cast<int>(h & 0xFF); }
inline bool HeaderFree(uint32_t h) noexcept { return (h & kFreeBit) != 0; }
inline uint32_t HeaderSide(uint32_t h) noexcept { return (h >> 9) & 3; }
inline uint32_t HeaderMemory(uint32_t h) noexcept { return (h >> 11) & 3; }
inline uint64_t HeaderLogical(uint32_t h) noexcept { return static_cast<uint64_t>(h >> 16) * 4; }
inline uint32_t HeaderClean(uint32_t h) noexcept { return h & kCleanBit; }

// Free-list links of a free block (blocks are at least 32 bytes).
inline uint8_t*& NextOf(uint8_t* block) noexcept { return *reinterpret_cast<uint8_t**>(block + 8); }
inline uint8_t*& PrevOf(uint8_t* block) noexcept {
  return *reinterpret_cast<uint8_t**>(block + 16);
}

// The sub-allocator registry, for the figures (creation and destruction only).
std::atomic_flag gRegistryLock = ATOMIC_FLAG_INIT;
BuddySystemSubAllocator* gRegistry = nullptr;

// Holds a flag used as a lock for a scope. The allocator's locks guard rare,
// short steps (registry changes, orphan pops): a waiter just yields its time
// slice until the flag is free.
class FlagGuard {
 public:
  explicit FlagGuard(std::atomic_flag& flag) noexcept : fFlag(flag) {
    while (fFlag.test_and_set(std::memory_order_acquire)) hydra_os::SleepMilliseconds(0);
  }
  ~FlagGuard() { fFlag.clear(std::memory_order_release); }
  FlagGuard(const FlagGuard&) = delete;
  FlagGuard& operator=(const FlagGuard&) = delete;

 private:
  std::atomic_flag& fFlag;
};

// Read straight off the thread pointer (initial-exec): the allocation and
// free paths must not call into the runtime to find it.
constinit thread_local BuddySystemSubAllocator* tCurrent TARN_TLS_INITIAL_EXEC = nullptr;

}  // namespace

// ---- BuddySystemSubAllocator ------------------------------------------------

BuddySystemSubAllocator::BuddySystemSubAllocator() noexcept
    : fChunkClass(ClassForNeed(65'536 - 16) - 1), fSmallestChunkClass(ClassForNeed(16'000 - 12)) {
  // ClassForNeed gives the smallest class at least that large; the chunk
  // class is the largest not above it.
  if (kClasses.sizes[fChunkClass + 1] <= 65'536 - 16) ++fChunkClass;
}

BuddySystemSubAllocator::~BuddySystemSubAllocator() {
  Tidy();
  // Only fully merged chunks remain (no live blocks): give them back.
  for (int c = 0; c <= fChunkClass; ++c) {
    while (uint8_t* block = ListPop(c)) {
      assert(HeaderSide(Load32(block)) == kRoot);
      HydraAllocator::GlobalPool().GiveBack(block - 16);
    }
  }
}

BuddySystemSubAllocator* BuddySystemSubAllocator::Create() noexcept {
  void* memory = std::malloc(sizeof(BuddySystemSubAllocator));
  if (!memory) return nullptr;
  assert(reinterpret_cast<uintptr_t>(memory) % 16 == 0);
  auto* s = new (memory) BuddySystemSubAllocator();
  FlagGuard guard(gRegistryLock);
  s->regNext = gRegistry;
  if (gRegistry) gRegistry->regPrev = s;
  gRegistry = s;
  return s;
}

void BuddySystemSubAllocator::Destroy(BuddySystemSubAllocator* s) noexcept {
  {
    FlagGuard guard(gRegistryLock);
    if (s->regPrev)
      s->regPrev->regNext = s->regNext;
    else
      gRegistry = s->regNext;
    if (s->regNext) s->regNext->regPrev = s->regPrev;
  }
  s->~BuddySystemSubAllocator();
  std::free(s);
}

void BuddySystemSubAllocator::ListPush(int c, uint8_t* block) noexcept {
  uint8_t* head = fFreeLists[c];
  NextOf(block) = head;
  PrevOf(block) = nullptr;
  if (head) PrevOf(head) = block;
  fFreeLists[c] = block;
}

void BuddySystemSubAllocator::ListRemove(int c, uint8_t* block) noexcept {
  uint8_t* next = NextOf(block);
  uint8_t* prev = PrevOf(block);
  if (prev)
    NextOf(prev) = next;
  else
    fFreeLists[c] = next;
  if (next) PrevOf(next) = prev;
  if (HeaderSide(Load32(block)) == kRoot) --fSpareChunks;
}

uint8_t* BuddySystemSubAllocator::ListPop(int c) noexcept {
  uint8_t* block = fFreeLists[c];
  if (block) ListRemove(c, block);
  return block;
}

bool BuddySystemSubAllocator::Grow() noexcept {
  HydraGlobalPool& pool = HydraAllocator::GlobalPool();
  for (int c = fChunkClass; c >= fSmallestChunkClass; --c) {
    auto* chunk = static_cast<uint8_t*>(pool.Take(kClasses.sizes[c] + 16));
    if (!chunk) continue;
    uint8_t* root = chunk + 16;
    HydraChunkHeader* ch = ChunkHeaderOf(chunk);
    const bool fresh = ch->logical == kFreshChunk;
    ch->logical = 0;
    Store32(root, MakeHeader(c, true, kRoot, kRoot) | (fresh ? kCleanBit : 0));
    ListPush(c, root);
    ++fSpareChunks;
    return true;
  }
  return false;
}

// A class c block can come from a block of class x when x == c, when x ==
// c + 1 and c >= 1 (its left part), or when x >= c + 2; classes 0 and 1 are
// the seeds and do not split into each other.
static inline bool CanServe(int x, int c) noexcept {
  return x == c || (x == c + 1 && c >= 1) || x >= c + 2;
}

bool BuddySystemSubAllocator::HasQuickBlocks() const noexcept {
  for (int c = 0; c <= fChunkClass; ++c)
    if (fQuick[c]) return true;
  return false;
}

void BuddySystemSubAllocator::Tidy() noexcept {
  for (int c = 0; c <= fChunkClass; ++c) {
    uint8_t* block = fQuick[c];
    fQuick[c] = nullptr;
    fQuickCount[c] = 0;
    while (block) {
      uint8_t* next = NextOf(block);
      const uint32_t h = Load32(block);
      Store32(block, MakeHeader(c, true, HeaderSide(h), HeaderMemory(h)));
      FreeBlockMerging(block);
      block = next;
    }
  }
}

void BuddySystemSubAllocator::BecomeOrphan() noexcept {
  fSpareLimit = 0;
  Tidy();
  for (int c = fSmallestChunkClass; c <= fChunkClass && fSpareChunks != 0; ++c) {
    uint8_t* block = fFreeLists[c];
    while (block) {
      uint8_t* next = NextOf(block);
      if (HeaderSide(Load32(block)) == kRoot) {
        ListRemove(c, block);
        HydraAllocator::GlobalPool().GiveBack(block - 16);
      }
      block = next;
    }
  }
}

uint8_t* BuddySystemSubAllocator::TakeBlock(int c) noexcept {
  if (uint8_t* block = fQuick[c]) {
    fQuick[c] = NextOf(block);
    --fQuickCount[c];
    return block;
  }
  if (uint8_t* block = ListPop(c)) return block;
  int k = c + (c >= 1 ? 1 : 2);
  while (k <= fChunkClass && !fFreeLists[k]) ++k;
  if (k > fChunkClass && HasQuickBlocks()) {
    Tidy();
    if (uint8_t* block = ListPop(c)) return block;
    k = c + (c >= 1 ? 1 : 2);
    while (k <= fChunkClass && !fFreeLists[k]) ++k;
  }
  if (k > fChunkClass) {
    if (c > fChunkClass || !Grow()) return nullptr;
    k = c + (c >= 1 ? 1 : 2);
    while (k <= fChunkClass && !fFreeLists[k]) ++k;
    if (k > fChunkClass) return ListPop(c);  // a small emergency chunk of class c
  }
  uint8_t* block = ListPop(k);
  while (k != c) {
    const uint32_t h = Load32(block);
    uint8_t* left = block;
    uint8_t* right = block + kClasses.sizes[k - 1];
    Store32(left, MakeHeader(k - 1, true, kLeft, HeaderSide(h)) | HeaderClean(h));
    Store32(right, MakeHeader(k - 2, true, kRight, HeaderMemory(h)) | HeaderClean(h));
    // Keep the smaller part that can still serve c; list the other.
    if (k - 2 >= 0 && CanServe(k - 2, c)) {
      ListPush(k - 1, left);
      block = right;
      k -= 2;
    } else {
      ListPush(k - 2, right);
      block = left;
      k -= 1;
    }
  }
  return block;
}

void BuddySystemSubAllocator::FreeBlockMerging(uint8_t* block) noexcept {
  uint32_t h = Load32(block);
  for (;;) {
    const int k = HeaderClass(h);
    const uint32_t side = HeaderSide(h);
    if (side == kRoot) break;
    uint8_t* buddy;
    uint8_t* parent;
    int buddyClass;
    uint32_t parentSide, parentMemory;
    if (side == kLeft) {
      buddy = block + kClasses.sizes[k];
      buddyClass = k - 1;
      parent = block;
      const uint32_t bh = Load32(buddy);
      if (!HeaderFree(bh) || HeaderClass(bh) != buddyClass) break;
      parentSide = HeaderMemory(h);
      parentMemory = HeaderMemory(bh);
    } else {
      buddy = block - kClasses.sizes[k + 1];
      buddyClass = k + 1;
      parent = buddy;
      const uint32_t bh = Load32(buddy);
      if (!HeaderFree(bh) || HeaderClass(bh) != buddyClass) break;
      parentSide = HeaderMemory(bh);
      parentMemory = HeaderMemory(h);
    }
    ListRemove(buddyClass, buddy);
    block = parent;
    h = MakeHeader(side == kLeft ? k + 1 : k + 2, true, parentSide, parentMemory);
    Store32(block, h);
  }
  if (HeaderSide(h) == kRoot) {
    if (fSpareChunks >= fSpareLimit) {
      HydraAllocator::GlobalPool().GiveBack(block - 16);
      return;
    }
    ++fSpareChunks;
  }
  ListPush(HeaderClass(h), block);
}

void* BuddySystemSubAllocator::Allocate(std::size_t size) noexcept {
  // 1 to kQuickSizeLimit bytes with nothing to drain: the class is one index
  // lookup away, and a block freed earlier in that class is usually waiting
  // on its quick list. Everything else is out of line, so that this path
  // saves no registers.
  if (size - 1 < kQuickSizeLimit && !HasRemoteFrees()) [[likely]] {
    const std::size_t rounded = (size + 3) & ~std::size_t{3};
    const int c = kClasses.small[(rounded + kPrefixBytes + kBlockHeaderBytes) / 4];
    if (uint8_t* block = fQuick[c]) [[likely]] {
      fQuick[c] = NextOf(block);
      --fQuickCount[c];
      return HandOut(block, c, rounded);
    }
  }
  return AllocateSlow(size);
}

[[gnu::noinline]] void* BuddySystemSubAllocator::AllocateSlow(std::size_t size) noexcept {
  if (HasRemoteFrees()) DrainRemoteFrees();
  if (size == 0) size = 1;
  if (size > (std::size_t{1} << 48)) return nullptr;
  const std::size_t rounded = (size + 3) & ~std::size_t{3};
  if (rounded + kPrefixBytes >= kLargeThreshold) return AllocateLarge(rounded);
  const int c = ClassForNeed(rounded + kPrefixBytes + kBlockHeaderBytes);
  uint8_t* block = TakeBlock(c);
  if (!block) return nullptr;
  return HandOut(block, c, rounded);
}

inline void* BuddySystemSubAllocator::HandOut(uint8_t* block, int c, std::size_t rounded) noexcept {
  const uint32_t h = Load32(block);
  Store32(block, MakeHeader(c, false, HeaderSide(h), HeaderMemory(h)) |
                     static_cast<uint32_t>(rounded / 4) << 16);
  StoreOwner(block + 4, this);
  Store32(block + 12, kBuddyMagic);
  Add(bytesInUse, static_cast<int64_t>(kClasses.sizes[c]));
  Add(logicalBytes, static_cast<int64_t>(rounded));
  Add(blocks, 1);
  uint8_t* user = block + 16;
  if (HeaderClean(h)) [[unlikely]] {
    std::memset(user, 0, 8);  // PrevOf's link; the rest is zero already
    return user;
  }
  return ZeroUserArea(user, rounded);
}

void* BuddySystemSubAllocator::AllocateLarge(std::size_t rounded) noexcept {
  auto* chunk = static_cast<uint8_t*>(HydraAllocator::GlobalPool().Take(rounded + kPrefixBytes));
  if (!chunk) return nullptr;
  HydraChunkHeader* ch = ChunkHeaderOf(chunk);
  const bool fresh = ch->logical == kFreshChunk;
  ch->logical = rounded;
  StoreOwner(chunk, this);
  Store32(chunk + 8, kLargeMagic);
  Store32(chunk + 12, kPadMarker);
  uint8_t* user = chunk + 16;
  // A chunk fresh from the system is zero: leaving it untouched also leaves
  // its pages unmapped until the caller writes to them.
  if (!fresh) std::memset(user, 0, rounded);
  ++fLargeBlocks;
  Add(bytesInUse, static_cast<int64_t>(ch->size));
  Add(logicalBytes, static_cast<int64_t>(rounded));
  Add(blocks, 1);
  return user;
}

void BuddySystemSubAllocator::FreeLarge(void* user) noexcept {
  uint8_t* chunk = static_cast<uint8_t*>(user) - 16;
  HydraChunkHeader* ch = ChunkHeaderOf(chunk);
  --fLargeBlocks;
  Add(bytesInUse, -static_cast<int64_t>(ch->size));
  Add(logicalBytes, -static_cast<int64_t>(ch->logical));
  Add(blocks, -1);
  ch->logical = 0;
  HydraAllocator::GlobalPool().GiveBack(chunk);
}

void BuddySystemSubAllocator::FreeLocal(void* user) noexcept {
  auto* u = static_cast<uint8_t*>(user);
  if (Load32(u - 4) == kPadMarker) {
    FreeLarge(user);
    return;
  }
  FreeBuddyLocal(u);
}

inline void BuddySystemSubAllocator::FreeBuddyLocal(uint8_t* user) noexcept {
  uint8_t* block = user - 16;
  const uint32_t h = Load32(block);
  const int c = HeaderClass(h);
  Add(bytesInUse, -static_cast<int64_t>(kClasses.sizes[c]));
  Add(logicalBytes, -static_cast<int64_t>(HeaderLogical(h)));
  Add(blocks, -1);
  if (fQuickCount[c] < kClasses.quickCap[c]) [[likely]] {
    // The header keeps reading as in use (HandOut rewrites it whole).
    NextOf(block) = fQuick[c];
    fQuick[c] = block;
    ++fQuickCount[c];
    return;
  }
  Store32(block, MakeHeader(c, true, HeaderSide(h), HeaderMemory(h)));
  FreeBlockMerging(block);
}

void BuddySystemSubAllocator::DrainRemoteFrees() noexcept {
  void* node = std::atomic_ref<void*>(remoteFrees.top).exchange(nullptr, std::memory_order_acquire);
  while (node) {
    void* next = AtomicStackNext(node);
    FreeLocal(node);
    node = next;
  }
}

std::size_t BuddySystemSubAllocator::Capacity(void* user) noexcept {
  auto* u = static_cast<uint8_t*>(user);
  if (Load32(u - 4) == kPadMarker) return ChunkHeaderOf(u - 16)->size - kPrefixBytes;
  return kClasses.sizes[HeaderClass(Load32(u - 16))] - kPrefixBytes - kBlockHeaderBytes;
}

void* BuddySystemSubAllocator::ResizeInPlace(void* user, std::size_t size) noexcept {
  if (size > (std::size_t{1} << 48)) return nullptr;
  auto* u = static_cast<uint8_t*>(user);
  const std::size_t rounded = (size + 3) & ~std::size_t{3};
  if (Load32(u - 4) == kPadMarker) {
    HydraChunkHeader* ch = ChunkHeaderOf(u - 16);
    const std::size_t total = rounded + kPrefixBytes;
    // Stay while the request is still large and uses at least half the chunk.
    if (total < kLargeThreshold || total > ch->size || total * 2 < ch->size) return nullptr;
    // Bytes past the caller's size stay zero, so that a later growth (in
    // place or by copying the logical size) shows only zeros there.
    if (rounded > ch->logical)
      std::memset(u + ch->logical, 0, rounded - ch->logical);
    else
      std::memset(u + size, 0, ch->logical - size);
    Add(logicalBytes, static_cast<int64_t>(rounded) - static_cast<int64_t>(ch->logical));
    ch->logical = rounded;
    return user;
  }
  if (rounded + kPrefixBytes >= kLargeThreshold) return nullptr;
  uint8_t* block = u - 16;
  const uint32_t h = Load32(block);
  const int c = HeaderClass(h);
  const int wanted = ClassForNeed(rounded + kPrefixBytes + kBlockHeaderBytes);
  // Stay when it fits and would not fit a class two steps smaller.
  if (wanted > c || wanted < c - 1) return nullptr;
  const uint64_t old = HeaderLogical(h);
  if (rounded > old)
    std::memset(u + old, 0, rounded - old);
  else
    std::memset(u + size, 0, old - size);
  Add(logicalBytes, static_cast<int64_t>(rounded) - static_cast<int64_t>(old));
  Store32(block, (h & 0xFFFF) | static_cast<uint32_t>(rounded / 4) << 16);
  return user;
}

// ---- HydraGlobalPool ----------------------------------------------------------

HydraGlobalPool::HydraGlobalPool() noexcept {
  for (int64_t i = 0; i < kLowWater; ++i)
    if (void* chunk = MapChunk(kPooledChunkBytes)) PushPooled(chunk);
}

void* HydraGlobalPool::MapChunk(std::size_t size) noexcept {
  const std::size_t page = hydra_os::PageSize();
  if (size > SIZE_MAX - 2 * page) return nullptr;
  const std::size_t bytes = (size + sizeof(HydraChunkHeader) + page - 1) / page * page;
  auto* base = static_cast<HydraChunkHeader*>(hydra_os::MapPages(bytes));
  if (!base) return nullptr;
  base->logical = kFreshChunk;
  base->size = size;
  fOSBytes.fetch_add(bytes);
  return base + 1;
}

void HydraGlobalPool::UnmapChunk(void* chunk) noexcept {
  HydraChunkHeader* base = ChunkHeaderOf(chunk);
  const std::size_t page = hydra_os::PageSize();
  const std::size_t bytes = (base->size + sizeof(HydraChunkHeader) + page - 1) / page * page;
  if (!hydra_os::UnmapPages(base, bytes))
    std::fprintf(stderr, "HydraGlobalPool: releasing a chunk failed, system error %d\n",
                 hydra_os::LastSystemError());
  fOSBytes.fetch_sub(bytes);
}

HydraGlobalPool::ChunkNode* HydraGlobalPool::NewNode() noexcept {
  if (void* node = DequeueAtomic(&fFreeNodes)) return static_cast<ChunkNode*>(node);
  // A page of nodes, never released: a popper may still read a node's link.
  const std::size_t page = hydra_os::PageSize();
  auto* nodes = static_cast<ChunkNode*>(hydra_os::MapPages(page));
  if (!nodes) return nullptr;
  const std::size_t count = page / sizeof(ChunkNode);
  for (std::size_t i = 1; i + 1 < count; ++i) nodes[i].link = &nodes[i + 1];
  if (count > 2) SpliceAtomic(&fFreeNodes, &nodes[1], &nodes[count - 1]);
  return &nodes[0];
}

void HydraGlobalPool::PushPooled(void* chunk) noexcept {
  ChunkNode* node = NewNode();
  if (!node) {
    UnmapChunk(chunk);
    return;
  }
  node->chunk = chunk;
  fPooledCount.fetch_add(1);
  EnqueueAtomic(&fChunks, node);
}

void* HydraGlobalPool::PopPooled() noexcept {
  auto* node = static_cast<ChunkNode*>(DequeueAtomic(&fChunks));
  if (!node) return nullptr;
  fPooledCount.fetch_sub(1);
  void* chunk = node->chunk;
  EnqueueAtomic(&fFreeNodes, node);
  return chunk;
}

void* HydraGlobalPool::Take(std::size_t size) noexcept {
  if (size > kPooledChunkBytes) return MapChunk(size);
  if (void* chunk = PopPooled()) return chunk;
  return MapChunk(kPooledChunkBytes);
}

void HydraGlobalPool::GiveBack(void* chunk) noexcept {
  HydraChunkHeader* header = ChunkHeaderOf(chunk);
  header->logical = 0;
  if (header->size == kPooledChunkBytes)
    PushPooled(chunk);
  else
    UnmapChunk(chunk);
}

void HydraGlobalPool::PushOrphan(BuddySystemSubAllocator* orphan) noexcept {
  fOrphanCount.fetch_add(1);
  EnqueueAtomic(&fOrphans, orphan);
}

void HydraGlobalPool::CollectOrphans() noexcept {
  // Take every orphan, destroy those whose blocks have all come back, and
  // put the others back on the stack, where a new thread may still adopt
  // them.
  BuddySystemSubAllocator* held = nullptr;
  while (BuddySystemSubAllocator* orphan = HydraAllocator::Instance().GetSubAllocatorOrphan()) {
    orphan->next = held;
    held = orphan;
  }
  while (BuddySystemSubAllocator* orphan = held) {
    held = orphan->next;
    orphan->DrainRemoteFrees();
    if (orphan->HoldsLiveBlocks()) {
      EnqueueAtomic(&fOrphans, orphan);
    } else {
      BuddySystemSubAllocator::Destroy(orphan);
      fOrphanCount.fetch_sub(1);
    }
  }
}

void HydraGlobalPool::PoolThreadRound(unsigned round) noexcept {
  const int64_t pooled = fPooledCount.load();
  if (pooled < kLowWater) {
    for (int64_t i = pooled; i < kLowWater; ++i)
      if (void* chunk = MapChunk(kPooledChunkBytes)) PushPooled(chunk);
  } else if (pooled > kHighWater) {
    for (int64_t i = pooled; i > kHighWater; --i)
      if (void* chunk = PopPooled()) UnmapChunk(chunk);
  }
  if (round % 5 == 4) CollectOrphans();
}

namespace {
void PoolThreadBody(void* arg) {
  auto* pool = static_cast<HydraGlobalPool*>(arg);
  for (unsigned round = 0;; ++round) {
    hydra_os::SleepMilliseconds(100);
    pool->PoolThreadRound(round);
  }
}
}  // namespace

void HydraGlobalPool::StartPoolThread() noexcept {
  if (fThreadStarted.exchange(true)) return;
  if (!hydra_os::StartThread(&PoolThreadBody, this))
    std::fprintf(stderr, "HydraGlobalPool: the pool thread could not start, system error %d\n",
                 hydra_os::LastSystemError());
}

// ---- HydraAllocator -------------------------------------------------------------

namespace {
alignas(HydraAllocator) unsigned char gInstanceStorage[sizeof(HydraAllocator)];
alignas(HydraGlobalPool) unsigned char gPoolStorage[sizeof(HydraGlobalPool)];
}  // namespace

HydraAllocator::HydraAllocator() noexcept : fPool(new (gPoolStorage) HydraGlobalPool()) {
  if (!hydra_os::CreateThreadKey(&HydraAllocator::SubAllocatorDestructor))
    std::fprintf(stderr, "HydraAllocator: no thread key left, system error %d\n",
                 hydra_os::LastSystemError());
}

HydraAllocator& HydraAllocator::MakeInstance() noexcept {
  static HydraAllocator* const made = [] {
    auto* instance = new (gInstanceStorage) HydraAllocator();
    sInstance.store(instance, std::memory_order_release);
    // Started after the instance is published: the thread may use it.
    instance->fPool->StartPoolThread();
    return instance;
  }();
  return *made;
}

HydraGlobalPool& HydraAllocator::GlobalPool() noexcept { return *Instance().fPool; }

bool HydraAllocator::GetIgnoreUnknownDeallocations() const noexcept {
  return fIgnoreUnknownDeallocations.load(std::memory_order_relaxed);
}
void HydraAllocator::SetIgnoreUnknownDeallocations(bool ignore) noexcept {
  fIgnoreUnknownDeallocations.store(ignore, std::memory_order_relaxed);
}

BuddySystemSubAllocator* HydraAllocator::GetSubAllocatorForCurrentThread() noexcept {
  if (BuddySystemSubAllocator* s = tCurrent) return s;
  // A new thread takes over an orphan, if there is one: the blocks the
  // orphan still has out are then freed by its new owner as they come back,
  // not up to half a second later by the pool thread, and its chunks serve
  // the new thread at once. Programs that start a thread per task keep a
  // handful of sub-allocators instead of one per recently ended thread.
  BuddySystemSubAllocator* s = GetSubAllocatorOrphan();
  if (s) {
    s->next = nullptr;
    s->BecomeAdopted();
    fPool->fOrphanCount.fetch_sub(1);
  } else {
    s = BuddySystemSubAllocator::Create();
  }
  if (!s) return nullptr;
  hydra_os::SetThreadKey(s);
  tCurrent = s;
  return s;
}

BuddySystemSubAllocator* HydraAllocator::GetSubAllocatorOrphan() noexcept {
  // Pops are serialized: a popped orphan may be destroyed (by the pool
  // thread, or by its adopter's thread ending), so no other pop may still be
  // reading its link. Pushes need no lock.
  FlagGuard guard(fPool->fOrphanPopLock);
  return static_cast<BuddySystemSubAllocator*>(DequeueAtomic(&fPool->fOrphans));
}

void HydraAllocator::SubAllocatorDestructor(void* subAllocator) noexcept {
  auto* s = static_cast<BuddySystemSubAllocator*>(subAllocator);
  if (!s) return;
  if (tCurrent == s) tCurrent = nullptr;
  s->DrainRemoteFrees();
  if (s->HoldsLiveBlocks()) {
    s->BecomeOrphan();
    GlobalPool().PushOrphan(s);
  } else
    BuddySystemSubAllocator::Destroy(s);
}

void* HydraAllocator::Allocate(std::size_t size) noexcept {
  BuddySystemSubAllocator* s = tCurrent;
  if (!s) [[unlikely]] {
    s = GetSubAllocatorForCurrentThread();
    if (!s) return nullptr;
  }
  return s->Allocate(size);
}

void HydraAllocator::Deallocate(void* p) noexcept {
  // The common case first: a buddy block of the calling thread (a buddy
  // block's magic sits right before the user memory; a page-aligned pointer
  // needs the readability check of the general case).
  auto* u = static_cast<uint8_t*>(p);
  BuddySystemSubAllocator* self = tCurrent;
  if ((reinterpret_cast<uintptr_t>(u) & 4095) != 0 && self && Peek32(u - 4) == kBuddyMagic &&
      LoadOwner(u - 12) == self) [[likely]] {
    self->FreeBuddyLocal(u);
    if (self->HasRemoteFrees()) [[unlikely]]
      self->DrainRemoteFrees();
    return;
  }
  DeallocateSlow(p, self);
}

[[gnu::noinline]] void HydraAllocator::DeallocateSlow(void* p,
                                                      BuddySystemSubAllocator* self) noexcept {
  if (!p) return;
  const BlockInfo info = Inspect(p);
  if (info.magic == 0) {
    if (!GetIgnoreUnknownDeallocations()) std::free(p);
    return;
  }
  BuddySystemSubAllocator* owner = LoadOwner(info.owner);
  if (owner == self) {
    self->FreeLocal(p);
  } else {
    owner->PushRemoteFree(p);
  }
  if (self && self->HasRemoteFrees()) self->DrainRemoteFrees();
}

void* HydraAllocator::Reallocate(void* p, std::size_t size) noexcept {
  if (!p) return Allocate(size);
  if (size == 0) {
    Deallocate(p);
    return nullptr;
  }
  const BlockInfo info = Inspect(p);
  if (info.magic == 0) return GetIgnoreUnknownDeallocations() ? nullptr : std::realloc(p, size);
  BuddySystemSubAllocator* s = GetSubAllocatorForCurrentThread();
  if (!s) return nullptr;
  if (LoadOwner(info.owner) == s)
    if (void* same = s->ResizeInPlace(p, size)) return same;
  auto* u = static_cast<uint8_t*>(p);
  const std::size_t old =
      info.magic == kLargeMagic ? ChunkHeaderOf(u - 16)->logical : HeaderLogical(Load32(u - 16));
  void* moved = Allocate(size);
  if (!moved) return nullptr;
  std::memcpy(moved, p, old < size ? old : size);
  Deallocate(p);
  return moved;
}

// ---- HydraDebugging ---------------------------------------------------------------

namespace {
template <class Figure>
uint64_t SumOverSubAllocators(Figure figure) noexcept {
  (void)HydraAllocator::Instance();
  if (BuddySystemSubAllocator* self = tCurrent) self->DrainRemoteFrees();
  FlagGuard guard(gRegistryLock);
  uint64_t sum = 0;
  for (BuddySystemSubAllocator* s = gRegistry; s; s = s->regNext) sum += figure(*s);
  return sum;
}
}  // namespace

uint64_t HydraDebugging::TotalBytesInOperatorNewPools() noexcept {
  return HydraAllocator::GlobalPool().OSBytes();
}
uint64_t HydraDebugging::BytesInUseInOperatorNewPools() noexcept {
  return SumOverSubAllocators([](BuddySystemSubAllocator& s) { return s.bytesInUse.load(); });
}
uint64_t HydraDebugging::FreeBytesInOperatorNewPools() noexcept {
  const uint64_t inUse = BytesInUseInOperatorNewPools();
  const uint64_t total = TotalBytesInOperatorNewPools();
  return total > inUse ? total - inUse : 0;
}
uint64_t HydraDebugging::LogicalBytesInOperatorNewPools() noexcept {
  return SumOverSubAllocators([](BuddySystemSubAllocator& s) { return s.logicalBytes.load(); });
}
uint64_t HydraDebugging::BlocksInOperatorNewPools() noexcept {
  return SumOverSubAllocators([](BuddySystemSubAllocator& s) { return s.blocks.load(); });
}
uint64_t HydraDebugging::OrphanedSubAllocators() noexcept {
  return HydraAllocator::GlobalPool().OrphanCount();
}
uint64_t HydraDebugging::PooledChunks() noexcept {
  return HydraAllocator::GlobalPool().PooledChunkCount();
}

}  // namespace tarn
