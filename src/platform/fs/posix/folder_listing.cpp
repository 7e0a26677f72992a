#include "platform/fs/posix/folder_listing.h"

#include <dirent.h>

#include <cerrno>
#include <cstring>
#include <optional>

#include "platform/fs/posix/posix_file.h"
#include "platform/fs/posix/sys_calls.h"

namespace trl::fs::posix {

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
      if (Stat(folder->NativeChild(name), target) != 0 || S_ISDIR(target.st_mode)) continue;
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
  }
  return listing;
}

}  // namespace trl::fs::posix
