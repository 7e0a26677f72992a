#include "platform/fs/posix/folder_place.h"

#include <algorithm>

#include "platform/fs/component_path.h"
#include "platform/text.h"

namespace trl::fs::posix {

std::string FolderPlace::NativeChild(std::string_view nativeName) const {
  return JoinPath(native_, nativeName, '/');
}

std::string FolderPlace::PathChild(std::string_view nativeName) const {
  return JoinPath(path_, NameFromNative(nativeName), '\\');
}

std::string_view FolderPlace::NativeName() const {
  return std::string_view(native_).substr(native_.rfind('/') + 1);
}

bool FolderPlace::HasDosAttributes() const {
  if (!dosAttributes_ && dosParent_) dosAttributes_ = dosParent_->HasDosAttributes();
  if (!dosAttributes_) {
    int64_t type = 0;
    dosAttributes_ = FileSystemType(native_, type) == 0 && IsSmbFileSystemType(type);
  }
  return *dosAttributes_;
}

int RealComponentPath(const std::string& native, std::string& out) {
  std::string real;
  if (int error = RealPath(native, real)) return error;
  std::string path;
  // Split at "/" only: a native name may hold a "\", which NameFromNative escapes.
  for (size_t at = 1; at < real.size();) {
    size_t end = std::min(real.find('/', at), real.size());
    path += '\\';
    path += NameFromNative(std::string_view(real).substr(at, end - at));
    at = end + 1;
  }
  out = path.empty() ? "\\" : std::move(path);
  return 0;
}

ItemStatus ToItemStatus(const struct stat& status) {
  return {status.st_mode, status.st_dev, status.st_ino, static_cast<uint64_t>(status.st_size),
          status.st_mtime};
}

}  // namespace trl::fs::posix
