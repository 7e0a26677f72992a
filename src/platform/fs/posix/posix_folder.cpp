#include "platform/fs/posix/posix_folder.h"

#include <dirent.h>

#include <cerrno>
#include <cstring>

#include "platform/failure.h"
#include "platform/fs/posix/posix_file.h"
#include "platform/text.h"

namespace trl::fs::posix {

std::string PosixFolder::Name() const { return NameFromNative(nativeName_); }

uint16_t PosixFolder::Attributes(uint16_t wanted) const {
  // A folder (or a link to one) is never a system item.
  return ItemAttributes(
      *place_, place_->Native(), nativeName_, wanted, [] { return false; },
      [this] { return Status().mode; });
}

// A mount point sits on another device than its parent, and "/" is its own parent.
bool PosixFolder::IsRootFolder() const {
  if (shareRoot_ || place_->Native() == "/") return true;
  struct stat parent {};
  if (int error = Stat(place_->NativeChild(".."), parent)) {
    Fail(LookupFailure(error, kPathNotFound));
  }
  return Status().device != parent.st_dev || Status().inode == parent.st_ino;
}

const Collection<File>& PosixFolder::Files() {
  List();
  return files_;
}

const Collection<Folder>& PosixFolder::SubFolders() {
  List();
  return subFolders_;
}

const ItemStatus& PosixFolder::Status() const {
  if (!status_) {
    struct stat status {};
    if (int error = Stat(place_->Native(), status)) Fail(LookupFailure(error, kPathNotFound));
    status_ = ToItemStatus(status);
  }
  return *status_;
}

// Sorts the entries by d_type, so a plain file or folder costs no call; links and entries of
// unknown type cost one stat each. A link to a folder is left out (a walk never loops) and so is
// a dangling link.
void PosixFolder::List() {
  if (listed_) return;
  std::unique_ptr<DIR, int (*)(DIR*)> stream(OpenDirectory(place_->Native()), closedir);
  if (!stream) Fail(ListingFailure(errno));
  Collection<File> files;
  Collection<Folder> subFolders;
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
      if (LStat(place_->NativeChild(name), item) != 0) continue;  // gone since it was listed
      type = static_cast<unsigned char>(IFTODT(item.st_mode));
    }
    if (type == DT_LNK) {
      struct stat target {};
      if (Stat(place_->NativeChild(name), target) != 0 || S_ISDIR(target.st_mode)) continue;
      status = ToItemStatus(target);
    }
    if (type == DT_DIR) {
      auto place =
          std::make_shared<FolderPlace>(place_->NativeChild(name), place_->PathChild(name));
      if (memory_) memory_->Listed(place_, place);
      subFolders.push_back(
          std::make_unique<PosixFolder>(std::move(place), name, false, std::nullopt, memory_));
    } else {
      files.push_back(std::make_unique<PosixFile>(place_, name, type, status));
    }
  }
  if (errno != 0) Fail(ListingFailure(errno));
  files_ = std::move(files);
  subFolders_ = std::move(subFolders);
  listed_ = true;
}

}  // namespace trl::fs::posix
