#include "tarn/Basics/Handle.h"

#include <cstring>
#include <new>
#include <type_traits>

#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

// The master pointer is the first member, so a Handle (pointer to it) and a
// pointer to the whole record are interconvertible.
// Invariant: size <= capacity; bytes [size, capacity) are unspecified and are
// zeroed when the block grows over them.
struct MasterBlock {
  char* data;
  std::size_t size;
  std::size_t capacity;
};
static_assert(std::is_standard_layout_v<MasterBlock>);

MasterBlock* BlockOf(Handle h) noexcept { return reinterpret_cast<MasterBlock*>(h); }

char* AllocateZeroed(std::size_t size) {
  // At least one byte, so that an empty block still has a distinct address.
  char* p = new (std::nothrow) char[size ? size : 1];
  if (!p) FailMemFullError();
  std::memset(p, 0, size ? size : 1);
  return p;
}

}  // namespace

Handle NewHandle(std::size_t size) {
  auto* block = new (std::nothrow) MasterBlock{nullptr, 0, 0};
  if (!block) FailMemFullError();
  try {
    block->data = AllocateZeroed(size);
  } catch (...) {
    delete block;
    throw;
  }
  block->size = size;
  block->capacity = size;
  return &block->data;
}

// Growth is geometric underneath, so that a block grown step by step (a
// stream writing past its end) costs amortised linear time; a block shrunk
// to under a quarter of its capacity is reallocated to give the memory back.
void SetHandleSize(Handle h, std::size_t size) {
  MasterBlock* block = BlockOf(h);
  if (size > block->capacity || size < block->capacity / 4) {
    std::size_t capacity = size;
    if (size > block->capacity && size - block->capacity < block->capacity) {
      capacity = block->capacity * 2;
    }
    char* fresh = AllocateZeroed(capacity);
    std::memcpy(fresh, block->data, size < block->size ? size : block->size);
    delete[] block->data;
    block->data = fresh;
    block->capacity = capacity;
  } else if (size > block->size) {
    std::memset(block->data + block->size, 0, size - block->size);
  }
  block->size = size;
}

std::size_t GetHandleSize(Handle h) noexcept { return h ? BlockOf(h)->size : 0; }

void DisposeHandle(Handle h) noexcept {
  if (!h) return;
  MasterBlock* block = BlockOf(h);
  delete[] block->data;
  delete block;
}

}  // namespace tarn
