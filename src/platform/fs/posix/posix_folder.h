#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/fs/file_system.h"
#include "platform/fs/posix/folder_place.h"
#include "platform/fs/posix/listing_read_ahead.h"
#include "platform/fs/posix/walk_memory.h"

namespace trl::fs::posix {

// A folder of a POSIX file system, listed in one pass on first use of Files or SubFolders.
// A listing that fails is not tried again: both fail alike.
class PosixFolder final : public Folder {
 public:
  // `nativeName` is "" for a root: "/" or the folder a share leads to (`shareRoot`).
  // `memory`, when given, learns from the listing (see WalkMemory); `readAhead`, when given,
  // lists the folder and its subfolders.
  PosixFolder(std::shared_ptr<FolderPlace> place, std::string nativeName, bool shareRoot,
              std::optional<ItemStatus> status = std::nullopt,
              std::shared_ptr<WalkMemory> memory = nullptr,
              std::shared_ptr<ListingReadAhead> readAhead = nullptr)
      : place_(std::move(place)),
        nativeName_(std::move(nativeName)),
        shareRoot_(shareRoot),
        status_(status),
        memory_(std::move(memory)),
        readAhead_(std::move(readAhead)) {}
  ~PosixFolder() override;
  PosixFolder(const PosixFolder&) = delete;
  PosixFolder& operator=(const PosixFolder&) = delete;

  std::string Name() const override;
  std::string Path() const override { return place_->Path(); }
  uint16_t Attributes(uint16_t wanted) const override;
  bool IsRootFolder() const override;
  const Collection<File>& Files() override;
  const Collection<Folder>& SubFolders() override;
  const std::vector<FolderLink>& FolderLinks() override;
  bool HasCaseSibling() const override { return caseSibling_; }

  void MarkCaseSibling() { caseSibling_ = true; }

 private:
  const ItemStatus& Status() const;
  void List();

  std::shared_ptr<FolderPlace> place_;
  std::string nativeName_;
  bool shareRoot_;
  mutable std::optional<ItemStatus> status_;
  std::shared_ptr<WalkMemory> memory_;
  std::shared_ptr<ListingReadAhead> readAhead_;
  bool listed_ = false;
  int listingError_ = 0;
  Collection<File> files_;
  Collection<Folder> subFolders_;
  std::vector<std::string> linkNames_;
  std::optional<std::vector<FolderLink>> links_;  // resolved on first use
  bool caseSibling_ = false;
};

}  // namespace trl::fs::posix
