#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/fs/file_system.h"
#include "platform/fs/posix/folder_place.h"

namespace trl::fs::posix {

// A file of a POSIX folder. Made from a listing it costs no system call: the stat that size,
// time or the read-only bit need is made on first use and kept.
class PosixFile final : public File {
 public:
  // `type` is the item's d_type (DT_UNKNOWN when not known); `status` what a stat already said.
  PosixFile(std::shared_ptr<const FolderPlace> folder, std::string nativeName, unsigned char type,
            std::optional<ItemStatus> status = std::nullopt)
      : folder_(std::move(folder)),
        nativeName_(std::move(nativeName)),
        type_(type),
        status_(status) {}

  std::string Name() const override;
  std::string Path() const override;
  uint16_t Attributes(uint16_t wanted) const override;
  uint64_t Size() const override;
  DateTime DateLastModified() const override;
  std::unique_ptr<FileReader> Open() const override;
  bool HasCaseSibling() const override { return caseSibling_; }
  // Opening needs only the folder's native path and the name, neither of which changes.
  bool OpensOnAnyThread() const override { return true; }

  const std::string& NativeName() const { return nativeName_; }
  void MarkCaseSibling() { caseSibling_ = true; }

 private:
  std::string Native() const { return folder_->NativeChild(nativeName_); }
  const ItemStatus& Status() const;
  bool IsSystem() const;
  bool IsLink() const override;

  std::shared_ptr<const FolderPlace> folder_;
  std::string nativeName_;
  mutable unsigned char type_;
  mutable std::optional<ItemStatus> status_;
  bool caseSibling_ = false;
};

}  // namespace trl::fs::posix
