#include "server/guid.h"

#include <fmt/format.h>

#include <cstring>

namespace trl::server {

bool SameGuid(const TrlGuid& a, const TrlGuid& b) {
  return a.data1 == b.data1 && a.data2 == b.data2 && a.data3 == b.data3 &&
         std::memcmp(a.data4, b.data4, sizeof a.data4) == 0;
}

std::string GuidText(const TrlGuid& guid) {
  const uint8_t* d = guid.data4;
  return fmt::format("{{{:08X}-{:04X}-{:04X}-{:02X}{:02X}-{:02X}{:02X}{:02X}{:02X}{:02X}{:02X}}}",
                     guid.data1, guid.data2, guid.data3, d[0], d[1], d[2], d[3], d[4], d[5], d[6],
                     d[7]);
}

}  // namespace trl::server
