// Time-based identifiers from UuidCreateSequential; the UUID structure's
// integer fields are little-endian in memory and stored here big-endian.
#include <rpc.h>
#include <windows.h>

#include "tarn/Basics/UUIDObj.h"
#include "tarn/Errors/Fail.h"

namespace tarn {

UUIDObj UUIDObj::GetNewUUID() {
  UUID u;
  const RPC_STATUS status = ::UuidCreateSequential(&u);
  // RPC_S_UUID_LOCAL_ONLY: unique on this machine only, still usable.
  if (status != RPC_S_OK && status != RPC_S_UUID_LOCAL_ONLY) FailWinError(int(status));
  return UUIDObj(std::uint8_t(u.Data1 >> 24), std::uint8_t(u.Data1 >> 16),
                 std::uint8_t(u.Data1 >> 8), std::uint8_t(u.Data1), std::uint8_t(u.Data2 >> 8),
                 std::uint8_t(u.Data2), std::uint8_t(u.Data3 >> 8), std::uint8_t(u.Data3),
                 u.Data4[0], u.Data4[1], u.Data4[2], u.Data4[3], u.Data4[4], u.Data4[5], u.Data4[6],
                 u.Data4[7]);
}

}  // namespace tarn
