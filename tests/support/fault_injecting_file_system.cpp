#include "support/fault_injecting_file_system.h"

#include "platform/failure.h"
#include "platform/text.h"

namespace trl::testing {
namespace {

using Operation = FaultInjectingFileSystem::Operation;

std::string MatchKey(std::string_view path) {
  std::string key = LowerCase(path);
  for (char& c : key) {
    if (c == '/') c = '\\';
  }
  while (key.size() > 1 && key.back() == '\\') key.pop_back();
  return key;
}

// Owns the file it wraps when it came from GetFile; a listed one belongs to its folder.
class FaultyFile : public fs::File {
 public:
  FaultyFile(std::unique_ptr<fs::File> owned, FaultInjectingFileSystem& faults)
      : owned_(std::move(owned)), target_(*owned_), faults_(faults) {}
  FaultyFile(const fs::File& target, FaultInjectingFileSystem& faults)
      : target_(target), faults_(faults) {}

  std::string Name() const override { return target_.Name(); }
  std::string Path() const override { return target_.Path(); }
  uint16_t Attributes(uint16_t wanted) const override { return target_.Attributes(wanted); }
  uint64_t Size() const override { return target_.Size(); }
  DateTime DateLastModified() const override { return target_.DateLastModified(); }
  std::unique_ptr<fs::FileReader> Open() const override {
    faults_.Enter(Operation::kOpenFile, target_.Path());
    return target_.Open();
  }
  bool HasCaseSibling() const override { return target_.HasCaseSibling(); }

 private:
  std::unique_ptr<fs::File> owned_;
  const fs::File& target_;
  FaultInjectingFileSystem& faults_;
};

// Owns the folder it wraps when it came from GetFolder; a listed one belongs to its parent.
class FaultyFolder : public fs::Folder {
 public:
  FaultyFolder(std::unique_ptr<fs::Folder> owned, FaultInjectingFileSystem& faults)
      : owned_(std::move(owned)), target_(*owned_), faults_(faults) {}
  FaultyFolder(fs::Folder& target, FaultInjectingFileSystem& faults)
      : target_(target), faults_(faults) {}

  std::string Name() const override { return target_.Name(); }
  std::string Path() const override { return target_.Path(); }
  uint16_t Attributes(uint16_t wanted) const override { return target_.Attributes(wanted); }
  bool IsRootFolder() const override { return target_.IsRootFolder(); }

  const fs::Collection<fs::File>& Files() override {
    List();
    return files_;
  }

  const fs::Collection<fs::Folder>& SubFolders() override {
    List();
    return subFolders_;
  }

  const std::vector<fs::FolderLink>& FolderLinks() override {
    List();
    return target_.FolderLinks();
  }
  bool HasCaseSibling() const override { return target_.HasCaseSibling(); }

 private:
  void List() {
    faults_.Enter(Operation::kListFolder, target_.Path());
    if (listed_) return;
    for (const auto& file : target_.Files()) {
      files_.push_back(std::make_unique<FaultyFile>(*file, faults_));
    }
    for (const auto& folder : target_.SubFolders()) {
      subFolders_.push_back(std::make_unique<FaultyFolder>(*folder, faults_));
    }
    listed_ = true;
  }

  std::unique_ptr<fs::Folder> owned_;
  fs::Folder& target_;
  FaultInjectingFileSystem& faults_;
  bool listed_ = false;
  fs::Collection<fs::File> files_;
  fs::Collection<fs::Folder> subFolders_;
};

}  // namespace

void FaultInjectingFileSystem::FailOn(Operation operation, std::string_view path, int32_t number) {
  failures_[{operation, MatchKey(path)}] = number;
}

void FaultInjectingFileSystem::Enter(Operation operation, std::string_view path) {
  ++calls_[static_cast<size_t>(operation)];
  auto failure = failures_.find({operation, MatchKey(path)});
  if (failure != failures_.end()) Fail(failure->second);
}

bool FaultInjectingFileSystem::FileExists(std::string_view path) {
  Enter(Operation::kFileExists, path);
  return target_.FileExists(path);
}

bool FaultInjectingFileSystem::FolderExists(std::string_view path) {
  Enter(Operation::kFolderExists, path);
  return target_.FolderExists(path);
}

std::unique_ptr<fs::File> FaultInjectingFileSystem::GetFile(std::string_view path) {
  Enter(Operation::kGetFile, path);
  return std::make_unique<FaultyFile>(target_.GetFile(path), *this);
}

std::unique_ptr<fs::Folder> FaultInjectingFileSystem::GetFolder(std::string_view path) {
  Enter(Operation::kGetFolder, path);
  return std::make_unique<FaultyFolder>(target_.GetFolder(path), *this);
}

}  // namespace trl::testing
