#include "platform/fs/posix/walk_memory.h"

#include "platform/fs/mount_table.h"

namespace trl::fs::posix {
namespace {

std::optional<std::unordered_set<std::string>> SystemMountPoints() {
  auto mounts = SystemMounts();
  if (!mounts) return std::nullopt;
  std::unordered_set<std::string> points;
  for (const Mount& mount : *mounts) points.insert(mount.directory);
  return points;
}

}  // namespace

WalkMemory::WalkMemory() : mountPoints_(SystemMountPoints()) {}

WalkMemory::WalkMemory(std::unordered_set<std::string> mountPoints)
    : mountPoints_(std::move(mountPoints)) {}

void WalkMemory::Listed(const std::shared_ptr<FolderPlace>& parent,
                        const std::shared_ptr<FolderPlace>& place) {
  if (mountPoints_ && !mountPoints_->contains(place->Native())) place->ShareDosSourceOf(parent);
  if (listed_.size() >= kMaxRemembered) listed_.clear();
  std::string nativeName = place->Native().substr(place->Native().rfind('/') + 1);
  listed_.insert_or_assign(place->Path() + "\\", ListedFolder{place, std::move(nativeName)});
}

std::optional<WalkMemory::ListedFolder> WalkMemory::Take(std::string_view text) {
  if (listed_.empty()) return std::nullopt;
  auto found = listed_.find(std::string(text));
  if (found == listed_.end()) return std::nullopt;
  ListedFolder folder = std::move(found->second);
  listed_.erase(found);
  return folder;
}

}  // namespace trl::fs::posix
