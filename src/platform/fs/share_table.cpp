#include "platform/fs/share_table.h"

#include <algorithm>

#include "platform/failure.h"
#include "platform/fs/component_path.h"
#include "platform/fs/mount_table.h"
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

void ShareTable::AddMounts(std::string_view mountTable) { AddMounts(ParseMountTable(mountTable)); }

void ShareTable::AddMounts(const std::vector<Mount>& mounts) {
  for (const Mount& mount : mounts) {
    const std::string& device = mount.device;
    std::string directory = NameFromNative(mount.directory);
    if (mount.type == "cifs" || mount.type == "smb3") {
      // "//host/share[/more]"
      if (device.size() < 3 || !IsSeparator(device[0]) || !IsSeparator(device[1])) continue;
      auto components = LowerComponents(device);
      if (components.size() < 2) continue;
      std::string host = components.front();
      components.erase(components.begin());
      entries_.push_back({std::move(host), std::move(components), directory, false});
    } else if (mount.type == "nfs" || mount.type == "nfs4") {
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
  if (auto mounts = SystemMounts()) AddMounts(*mounts);
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
