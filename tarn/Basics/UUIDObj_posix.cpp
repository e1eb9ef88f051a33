// Time-based identifiers from libuuid, whose bytes are already in the
// big-endian field order of UUIDObj.
#include <uuid/uuid.h>

#include <cstring>

#include "tarn/Basics/UUIDObj.h"

namespace tarn {

UUIDObj UUIDObj::GetNewUUID() {
  uuid_t raw;
  uuid_generate_time(raw);
  TarnCOM::UUIDBytes bytes;
  std::memcpy(bytes.bytes, raw, 16);
  return UUIDObj(bytes);
}

}  // namespace tarn
