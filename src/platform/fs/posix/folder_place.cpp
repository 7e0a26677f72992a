#include "platform/fs/posix/folder_place.h"

#include "platform/fs/component_path.h"
#include "platform/text.h"

namespace trl::fs::posix {

std::string FolderPlace::NativeChild(std::string_view nativeName) const {
  return JoinPath(native_, nativeName, '/');
}

std::string FolderPlace::PathChild(std::string_view nativeName) const {
  return JoinPath(path_, NameFromNative(nativeName), '\\');
}

bool FolderPlace::HasDosAttributes() const {
  if (!dosAttributes_ && dosParent_) dosAttributes_ = dosParent_->HasDosAttributes();
  if (!dosAttributes_) {
    int64_t type = 0;
    dosAttributes_ = FileSystemType(native_, type) == 0 && IsSmbFileSystemType(type);
  }
  return *dosAttributes_;
}

ItemStatus ToItemStatus(const struct stat& status) {
  return {status.st_mode, status.st_dev, status.st_ino, static_cast<uint64_t>(status.st_size),
          status.st_mtime};
}

}  // namespace trl::fs::posix
