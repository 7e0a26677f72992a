#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace trl::fs {

// One line of a mount table in the format of /proc/self/mounts, escapes undone.
struct Mount {
  std::string device;
  std::string directory;  // native
  std::string type;
};

std::vector<Mount> ParseMountTable(std::string_view text);
// The system's mount table, or nothing when it cannot be read.
std::optional<std::vector<Mount>> SystemMounts();

}  // namespace trl::fs
