#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>

#include "platform/fs/posix/folder_place.h"

namespace trl::fs::posix {

// What a file system's listings teach it for the lookups that follow them. A walker lists a
// folder, then asks about each subfolder by its Path and "\": those answers come from the listing
// instead of a stat each. Subfolders that are not mount points share their parent's source of
// attributes, so it is decided once per file system instead of once per folder.
class WalkMemory {
 public:
  // Reads the system's mount table; without it every folder decides its attributes' source itself.
  WalkMemory();
  explicit WalkMemory(std::unordered_set<std::string> mountPoints);

  // A subfolder of `parent` was listed; `place` is where it is.
  void Listed(const std::shared_ptr<FolderPlace>& parent,
              const std::shared_ptr<FolderPlace>& place);

  struct ListedFolder {
    std::shared_ptr<FolderPlace> place;
    std::string nativeName;
  };
  // The listed subfolder whose Path and "\" is `text`, forgotten as it is handed out.
  std::optional<ListedFolder> Take(std::string_view text);

 private:
  // Listings whose subfolders are never asked about (a walk without recursion) must not pile up.
  static constexpr size_t kMaxRemembered = 1 << 16;

  std::optional<std::unordered_set<std::string>> mountPoints_;
  std::unordered_map<std::string, ListedFolder> listed_;
};

}  // namespace trl::fs::posix
