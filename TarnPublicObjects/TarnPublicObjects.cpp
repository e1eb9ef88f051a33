#include "TarnPublicObjects/TarnPublicObjects.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>

namespace {

// Detailed messages live in a ring of slots; a record holds the ticket of its
// slot. Ticket t lives in slot t % kSlots and stays readable until kSlots
// newer messages have been set.
constexpr int32_t kSlots = 256;

struct MessageStore {
  std::mutex mutex;
  int32_t nextTicket = 1;
  int32_t tickets[kSlots] = {};
  std::string texts[kSlots];
};

MessageStore& Store() {
  static MessageStore* store = new MessageStore;  // lives until exit
  return *store;
}

void DefaultAssertionHandler(const char* expression, const char* file, int line) {
  std::fprintf(stderr, "Assertion failed: %s (%s:%d)\n", expression, file, line);
  std::fflush(stderr);
  std::abort();
}

std::atomic<TPOAssertionHandler> gAssertionHandler{&DefaultAssertionHandler};
std::atomic<TPOAllocateFunction> gAllocate{nullptr};
std::atomic<TPOReleaseFunction> gRelease{nullptr};

}  // namespace

extern "C" {

void TPOSetDetailedErrorMessage(TarnException* record, const char* utf8Text) {
  if (record == nullptr) return;
  MessageStore& store = Store();
  std::lock_guard lock(store.mutex);
  int32_t ticket = store.nextTicket++;
  if (store.nextTicket <= 0) store.nextTicket = 1;
  store.tickets[ticket % kSlots] = ticket;
  store.texts[ticket % kSlots] = utf8Text ? utf8Text : "";
  record->reserved = ticket;
}

bool TPOGetDetailedErrorMessage(const TarnException* record, char* buffer, size_t bufferSize) {
  if (buffer != nullptr && bufferSize > 0) buffer[0] = 0;
  if (record == nullptr || record->reserved <= 0 || buffer == nullptr || bufferSize == 0) return false;
  MessageStore& store = Store();
  std::lock_guard lock(store.mutex);
  int32_t slot = record->reserved % kSlots;
  if (store.tickets[slot] != record->reserved) return false;
  const std::string& text = store.texts[slot];
  size_t n = text.size() < bufferSize - 1 ? text.size() : bufferSize - 1;
  // Never cut a UTF-8 sequence in half.
  while (n > 0 && n < text.size() && (static_cast<unsigned char>(text[n]) & 0xC0) == 0x80) --n;
  std::memcpy(buffer, text.data(), n);
  buffer[n] = 0;
  return true;
}

TPOAssertionHandler TPOSetAssertionHandler(TPOAssertionHandler handler) {
  return gAssertionHandler.exchange(handler ? handler : &DefaultAssertionHandler);
}

void TPOAssertionFailed(const char* expression, const char* file, int line) {
  gAssertionHandler.load()(expression, file, line);
}

void TPOSetAllocatorHook(TPOAllocateFunction allocate, TPOReleaseFunction release) {
  if ((allocate == nullptr) != (release == nullptr)) return;
  gAllocate.store(allocate);
  gRelease.store(release);
}

void* TPOAllocate(size_t size) {
  TPOAllocateFunction allocate = gAllocate.load();
  return allocate ? allocate(size) : std::calloc(1, size ? size : 1);
}

void TPORelease(void* block) {
  TPOReleaseFunction release = gRelease.load();
  if (release) release(block);
  else std::free(block);
}

}  // extern "C"
