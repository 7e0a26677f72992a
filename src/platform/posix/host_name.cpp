#include "platform/host_name.h"

#include <unistd.h>

#include <array>

namespace trl {

std::string HostName() {
  std::array<char, 256> buffer{};
  if (gethostname(buffer.data(), buffer.size() - 1) != 0) return "";
  return buffer.data();
}

}  // namespace trl
