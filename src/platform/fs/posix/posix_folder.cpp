#include "platform/fs/posix/posix_folder.h"

#include "platform/failure.h"
#include "platform/fs/posix/folder_listing.h"
#include "platform/text.h"

namespace trl::fs::posix {

PosixFolder::~PosixFolder() {
  if (readAhead_ && !files_.empty()) readAhead_->Recycle(std::move(files_));
}

std::string PosixFolder::Name() const { return NameFromNative(nativeName_); }

uint16_t PosixFolder::Attributes(uint16_t wanted) const {
  // A folder (or a link to one) is never a system item.
  return ItemAttributes(
      *place_, [this] { return place_->Native(); }, nativeName_, wanted, [] { return false; },
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

const std::vector<FolderLink>& PosixFolder::FolderLinks() {
  List();
  if (!links_) {
    links_.emplace();
    for (const auto& name : linkNames_) {
      std::string target;
      // A link that no longer leads anywhere, or leads round in a loop, is no link to a folder.
      if (RealComponentPath(place_->NativeChild(name), target) == 0) {
        links_->push_back({NameFromNative(name), std::move(target)});
      }
    }
  }
  return *links_;
}

const ItemStatus& PosixFolder::Status() const {
  if (!status_) {
    struct stat status {};
    if (int error = Stat(place_->Native(), status)) Fail(LookupFailure(error, kPathNotFound));
    status_ = ToItemStatus(status);
  }
  return *status_;
}

void PosixFolder::List() {
  if (!listed_) {
    FolderListing listing = readAhead_ ? readAhead_->Take(place_) : ListFolder(place_);
    listingError_ = listing.error;
    files_ = std::move(listing.files);
    for (auto& sub : listing.subFolders) {
      if (memory_) memory_->Listed(place_, sub.place);
      auto folder = std::make_unique<PosixFolder>(std::move(sub.place), std::move(sub.nativeName),
                                                  false, std::nullopt, memory_, readAhead_);
      if (sub.caseSibling) folder->MarkCaseSibling();
      subFolders_.push_back(std::move(folder));
    }
    linkNames_ = std::move(listing.folderLinks);
    listed_ = true;
  }
  if (listingError_ != 0) Fail(ListingFailure(listingError_));
}

}  // namespace trl::fs::posix
