// TarnPublicObjects: the small sibling library shared by the TarnCore family.
//
// It offers a plain C-compatible interface that never throws:
//  - TarnException, the 162-byte packed error record exchanged across it;
//  - detailed error messages attached to a record (longer texts than fit);
//  - the process-wide assertion handler;
//  - the process-wide allocator hook.
// Every function may be called from any thread.
#pragma once

#include <cstddef>
#include <cstdint>

extern "C" {

#pragma pack(push, 1)
// The plain error record. Texts are NUL-terminated within their 50 bytes.
struct TarnException {
  char text1[50];     // system, or "TarnError," + kind
  char text2[50];     // subsystem, or "<n>," + system + subsystem
  char text3[50];     // the optional error string
  int32_t code;       // 0 means no error
  int32_t kind;       // 0 internal error, 1 OS error, -1 a packed TarnError
  int32_t reserved;   // ticket of the detailed message, 0 for none
};
#pragma pack(pop)
static_assert(sizeof(TarnException) == 162, "TarnException is 162 bytes");

// Attaches a UTF-8 text to the record (replacing any earlier one). The text
// is kept by the library; the record carries a ticket to it.
void TPOSetDetailedErrorMessage(TarnException* record, const char* utf8Text);

// Copies the record's detailed message, UTF-8, into buffer (at most
// bufferSize - 1 bytes, cut at a character boundary, NUL-terminated).
// Returns false, leaving buffer empty, when the record has none.
bool TPOGetDetailedErrorMessage(const TarnException* record, char* buffer, size_t bufferSize);

// Assertion handling. The default handler prints the failed expression with
// its source location to standard error and aborts the process.
typedef void (*TPOAssertionHandler)(const char* expression, const char* file, int line);
TPOAssertionHandler TPOSetAssertionHandler(TPOAssertionHandler handler);  // returns the previous one
void TPOAssertionFailed(const char* expression, const char* file, int line);

// The process-wide allocator hook: a host may route the family's raw
// allocations through its own allocator. Both functions or neither.
typedef void* (*TPOAllocateFunction)(size_t size);
typedef void (*TPOReleaseFunction)(void* block);
void TPOSetAllocatorHook(TPOAllocateFunction allocate, TPOReleaseFunction release);
void* TPOAllocate(size_t size);
void TPORelease(void* block);

}  // extern "C"

#define TPO_ASSERT(expr) ((expr) ? (void)0 : TPOAssertionFailed(#expr, __FILE__, __LINE__))
