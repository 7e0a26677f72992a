#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <ctime>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/fs/dos_attributes.h"
#include "platform/fs/file_system.h"
#include "platform/fs/posix/sys_calls.h"

namespace trl::fs::posix {

// What a folder and the items listed in it share: where the folder is (held once, not copied into
// each file) and whether its items carry DOS attributes, decided once per folder.
class FolderPlace {
 public:
  // `parent`, when given, is the folder this one was listed in.
  FolderPlace(std::string native, std::string path,
              std::shared_ptr<const FolderPlace> parent = nullptr)
      : native_(std::move(native)), path_(std::move(path)), parent_(std::move(parent)) {}

  const std::string& Native() const { return native_; }
  const std::shared_ptr<const FolderPlace>& Parent() const { return parent_; }
  // The last name of Native().
  std::string_view NativeName() const;
  const std::string& Path() const { return path_; }
  std::string NativeChild(std::string_view nativeName) const;
  std::string PathChild(std::string_view nativeName) const;
  bool HasDosAttributes() const;
  // Answers HasDosAttributes as `parent` does: for a folder on the same file system.
  void ShareDosSourceOf(std::shared_ptr<const FolderPlace> parent) {
    dosParent_ = std::move(parent);
  }

 private:
  std::string native_;  // "/opt/Acme"
  std::string path_;    // "\opt\Acme"
  std::shared_ptr<const FolderPlace> parent_;
  mutable std::optional<bool> dosAttributes_;
  std::shared_ptr<const FolderPlace> dosParent_;
};

// The real path of the native item `native` in the component's "\" form, each name as
// NameFromNative makes it. Returns 0 or the errno value.
int RealComponentPath(const std::string& native, std::string& out);

// The part of a stat an item keeps.
struct ItemStatus {
  mode_t mode = 0;
  dev_t device = 0;
  ino_t inode = 0;
  uint64_t size = 0;
  time_t modified = 0;
};

ItemStatus ToItemStatus(const struct stat& status);

// The `wanted` attribute bits of an item, reading only what those bits need: DOS attributes of
// the item at `native()` on an SMB mount; otherwise the name for hidden, `isSystem()` for system
// and `mode()` for read-only. The item's path is only made when DOS attributes are read.
template <class Native, class IsSystem, class Mode>
uint16_t ItemAttributes(const FolderPlace& dosSource, Native native, std::string_view nativeName,
                        uint16_t wanted, IsSystem isSystem, Mode mode) {
  wanted &= kAllAttributes;
  if (wanted == 0) return 0;
  if (dosSource.HasDosAttributes()) {
    if (auto dos = DecodeDosAttributes(GetExtendedAttribute(native(), kDosAttributeName))) {
      return *dos & wanted;
    }
  }
  uint16_t attributes = 0;
  if ((wanted & kHidden) != 0 && nativeName.starts_with('.')) attributes |= kHidden;
  if ((wanted & kSystem) != 0 && isSystem()) attributes |= kSystem;
  if ((wanted & kReadOnly) != 0 && (mode() & S_IWUSR) == 0) attributes |= kReadOnly;
  return attributes;
}

}  // namespace trl::fs::posix
