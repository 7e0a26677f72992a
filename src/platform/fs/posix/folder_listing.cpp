#include "platform/fs/posix/folder_listing.h"

#include <dirent.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <string_view>
#include <unordered_map>

#include "platform/fs/posix/posix_file.h"
#include "platform/fs/posix/sys_calls.h"
#include "platform/text.h"

namespace trl::fs::posix {
namespace {

// Only a name with a letter that lower-casing may change can have a sibling; most folders have
// none, and cost one pass over their names.
bool MayChangeCase(std::string_view name) {
  return std::any_of(name.begin(), name.end(), [](char c) {
    return (c >= 'A' && c <= 'Z') || static_cast<unsigned char>(c) >= 0x80;
  });
}

template <class Items, class NameOf, class Mark>
void MarkCaseSiblings(Items& items, NameOf nameOf, Mark mark) {
  std::unordered_map<std::string, int> names;
  for (const auto& item : items) {
    const std::string& name = nameOf(item);
    if (MayChangeCase(name)) names.try_emplace(LowerCase(name), 0);
  }
  if (names.empty()) return;
  auto folded = [&](const std::string& name) {
    return MayChangeCase(name) ? LowerCase(name) : name;
  };
  for (const auto& item : items) {
    auto known = names.find(folded(nameOf(item)));
    if (known != names.end()) ++known->second;
  }
  for (auto& item : items) {
    auto known = names.find(folded(nameOf(item)));
    if (known != names.end() && known->second > 1) mark(item);
  }
}

}  // namespace

FolderListing ListFolder(const std::shared_ptr<const FolderPlace>& folder) {
  FolderListing listing;
  std::unique_ptr<DIR, int (*)(DIR*)> stream(OpenDirectory(folder->Native()), closedir);
  if (!stream) {
    listing.error = errno;
    return listing;
  }
  for (;;) {
    errno = 0;  // readdir tells an error from the end only through errno
    const dirent* entry = readdir(stream.get());
    if (entry == nullptr) break;
    const char* name = entry->d_name;
    if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0) continue;
    unsigned char type = entry->d_type;
    std::optional<ItemStatus> status;
    if (type == DT_UNKNOWN) {
      struct stat item {};
      if (LStat(folder->NativeChild(name), item) != 0) continue;  // gone since it was listed
      type = static_cast<unsigned char>(IFTODT(item.st_mode));
    }
    if (type == DT_LNK) {
      struct stat target {};
      if (Stat(folder->NativeChild(name), target) != 0) continue;
      if (S_ISDIR(target.st_mode)) {
        listing.folderLinks.emplace_back(name);
        continue;
      }
      status = ToItemStatus(target);
    }
    if (type == DT_DIR) {
      auto place =
          std::make_shared<FolderPlace>(folder->NativeChild(name), folder->PathChild(name));
      listing.subFolders.push_back({std::move(place), name});
    } else {
      listing.files.push_back(std::make_unique<PosixFile>(folder, name, type, status));
    }
  }
  listing.error = errno;
  if (listing.error != 0) {
    listing.files.clear();
    listing.subFolders.clear();
    listing.folderLinks.clear();
  }
  MarkCaseSiblings(
      listing.files,
      [](const auto& file) -> const std::string& {
        return static_cast<const PosixFile&>(*file).NativeName();
      },
      [](auto& file) { static_cast<PosixFile&>(*file).MarkCaseSibling(); });
  MarkCaseSiblings(
      listing.subFolders, [](const auto& sub) -> const std::string& { return sub.nativeName; },
      [](auto& sub) { sub.caseSibling = true; });
  return listing;
}

}  // namespace trl::fs::posix
