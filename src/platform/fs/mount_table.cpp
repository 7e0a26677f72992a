#include "platform/fs/mount_table.h"

#include <fstream>
#include <sstream>

namespace trl::fs {
namespace {

bool IsOctalDigit(char c) { return c >= '0' && c <= '7'; }

// Undoes the octal escapes (\040 for a blank, \011, \012, \134) of a mount table field.
std::string UnescapeMountField(std::string_view field) {
  std::string out;
  out.reserve(field.size());
  for (size_t i = 0; i < field.size(); ++i) {
    if (field[i] == '\\' && i + 3 < field.size() && IsOctalDigit(field[i + 1]) &&
        IsOctalDigit(field[i + 2]) && IsOctalDigit(field[i + 3])) {
      out += static_cast<char>((field[i + 1] - '0') * 64 + (field[i + 2] - '0') * 8 +
                               (field[i + 3] - '0'));
      i += 3;
    } else {
      out += field[i];
    }
  }
  return out;
}

}  // namespace

std::vector<Mount> ParseMountTable(std::string_view text) {
  std::vector<Mount> mounts;
  std::istringstream lines{std::string(text)};
  std::string line;
  while (std::getline(lines, line)) {
    std::istringstream fields(line);
    Mount mount;
    if (!(fields >> mount.device >> mount.directory >> mount.type)) continue;
    mount.device = UnescapeMountField(mount.device);
    mount.directory = UnescapeMountField(mount.directory);
    mounts.push_back(std::move(mount));
  }
  return mounts;
}

std::optional<std::vector<Mount>> SystemMounts() {
  std::ifstream file("/proc/self/mounts");
  if (!file) return std::nullopt;
  std::ostringstream text;
  text << file.rdbuf();
  return ParseMountTable(text.str());
}

}  // namespace trl::fs
