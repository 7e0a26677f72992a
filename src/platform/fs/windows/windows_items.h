#pragma once

#include <windows.h>

#include <optional>
#include <string>
#include <vector>

#include "platform/fs/file_system.h"

namespace trl::fs::windows {

// What the system says of an item, following a link to what it leads to.
struct ItemData {
  DWORD attributes = 0;
  uint64_t size = 0;
  FILETIME modified{};
  bool link = false;  // reached through a symbolic link or junction
};

// The data of the item at `native`, or the Win32 error code that kept it from being read.
std::optional<ItemData> QueryItem(const std::string& native, DWORD& error);

// `native` with every link resolved, in its everyday form; the Win32 error code on failure.
std::optional<std::string> FinalPath(const std::string& native, DWORD& error);

// `name` under `folder`, never doubling the "\" after a root.
std::string ChildPath(const std::string& folder, const std::string& name);

class WindowsFile final : public File {
 public:
  WindowsFile(std::string folder, std::string name, ItemData data)
      : folder_(std::move(folder)), name_(std::move(name)), data_(data) {}

  std::string Name() const override { return name_; }
  std::string Path() const override { return folder_.empty() ? name_ : ChildPath(folder_, name_); }
  uint16_t Attributes(uint16_t wanted) const override;
  uint64_t Size() const override { return data_.size; }
  DateTime DateLastModified() const override;
  std::unique_ptr<FileReader> Open() const override;
  bool IsLink() const override { return data_.link; }
  bool OpensOnAnyThread() const override { return true; }

 private:
  std::string folder_;
  std::string name_;
  ItemData data_;
};

class WindowsFolder final : public Folder {
 public:
  // `path` native and in the component's form ("C:\" for a root); `name` "" for a root.
  WindowsFolder(std::string path, std::string name, DWORD attributes)
      : path_(std::move(path)), name_(std::move(name)), attributes_(attributes) {}

  std::string Name() const override { return name_; }
  std::string Path() const override { return path_; }
  uint16_t Attributes(uint16_t wanted) const override;
  bool IsRootFolder() const override;
  const Collection<File>& Files() override;
  const Collection<Folder>& SubFolders() override;
  const std::vector<FolderLink>& FolderLinks() override;

 private:
  void List();

  std::string path_;
  std::string name_;
  DWORD attributes_;
  bool listed_ = false;
  int32_t listingFailure_ = 0;
  Collection<File> files_;
  Collection<Folder> subFolders_;
  std::vector<std::string> linkNames_;
  std::optional<std::vector<FolderLink>> links_;
};

}  // namespace trl::fs::windows
