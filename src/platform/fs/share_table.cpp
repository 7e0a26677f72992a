#include "platform/fs/share_table.h"

#include <algorithm>
#include <fstream>
#include <sstream>

#include "platform/failure.h"
#include "platform/fs/component_path.h"
#include "platform/text.h"

// Directories are kept in the component's encoding, like the rest of a path, so that Resolve gives
// one text the caller converts component by component; mount points are read as raw bytes and
// encoded on the way in.

namespace trl::fs {
namespace {

std::vector<std::string> LowerComponents(std::string_view text) {
  auto components = SplitComponents(text);
  for (auto& component : components) component = LowerCase(component);
  return components;
}

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

void ShareTable::Add(std::string_view host, std::string_view share, std::string directory) {
  entries_.push_back({LowerCase(host), LowerComponents(share), std::move(directory), true});
}

void ShareTable::AddMapping(std::string_view mapping) {
  auto equals = mapping.find('=');
  bool unc = mapping.size() > 2 && IsSeparator(mapping[0]) && IsSeparator(mapping[1]) &&
             !IsSeparator(mapping[2]);
  if (!unc || equals == std::string_view::npos || equals + 1 == mapping.size()) {
    Fail(kInvalidArgument);
  }
  auto components = SplitComponents(mapping.substr(2, equals - 2));
  if (components.size() < 2) Fail(kInvalidArgument);
  std::string share;
  for (size_t i = 1; i < components.size(); ++i) share = JoinPath(share, components[i], '\\');
  Add(components[0], share, std::string(mapping.substr(equals + 1)));
}

void ShareTable::AddMounts(std::string_view mountTable) {
  std::istringstream lines{std::string(mountTable)};
  std::string line;
  while (std::getline(lines, line)) {
    std::istringstream fields(line);
    std::string device;
    std::string directory;
    std::string type;
    if (!(fields >> device >> directory >> type)) continue;
    device = UnescapeMountField(device);
    directory = NameFromNative(UnescapeMountField(directory));
    if (type == "cifs" || type == "smb3") {
      // "//host/share[/more]"
      if (device.size() < 3 || !IsSeparator(device[0]) || !IsSeparator(device[1])) continue;
      auto components = LowerComponents(device);
      if (components.size() < 2) continue;
      std::string host = components.front();
      components.erase(components.begin());
      entries_.push_back({std::move(host), std::move(components), directory, false});
    } else if (type == "nfs" || type == "nfs4") {
      // "host:/export/path" answers to the share "export\path" and to "path".
      auto colon = device.find(":/");
      if (colon == 0 || colon == std::string::npos) continue;
      std::string host = LowerCase(device.substr(0, colon));
      auto components = LowerComponents(device.substr(colon + 1));
      if (components.size() > 1) entries_.push_back({host, {components.back()}, directory, false});
      entries_.push_back({std::move(host), std::move(components), directory, false});
    }
  }
}

void ShareTable::AddSystemMounts() {
  std::ifstream file("/proc/self/mounts");
  if (!file) return;
  std::ostringstream text;
  text << file.rdbuf();
  AddMounts(text.str());
}

std::optional<std::string> ShareTable::Resolve(std::string_view uncPath) const {
  auto path = ParseComponentPath(uncPath);
  if (!path.network || path.components.empty()) return std::nullopt;
  std::vector<std::string> lowered;
  lowered.reserve(path.components.size());
  for (const auto& component : path.components) lowered.push_back(LowerCase(component));

  const Entry* best = nullptr;
  for (const auto& entry : entries_) {
    if (entry.host != lowered[0] || entry.share.size() >= lowered.size()) continue;
    if (!std::equal(entry.share.begin(), entry.share.end(), lowered.begin() + 1)) continue;
    // Given mappings outrank mounts; within a kind the longest share wins, the first on a tie.
    if (best == nullptr || (entry.given && !best->given) ||
        (entry.given == best->given && entry.share.size() > best->share.size())) {
      best = &entry;
    }
  }
  if (best == nullptr) return std::nullopt;
  std::string resolved = best->directory;
  for (size_t i = 1 + best->share.size(); i < path.components.size(); ++i) {
    resolved = JoinPath(resolved, path.components[i], '/');
  }
  return resolved;
}

}  // namespace trl::fs
