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

class FaultyFile : public fs::File {
 public:
  FaultyFile(std::unique_ptr<fs::File> target, FaultInjectingFileSystem& faults)
      : target_(std::move(target)), faults_(faults) {}

  std::string Name() const override { return target_->Name(); }
  std::string Path() const override { return target_->Path(); }
  uint16_t Attributes(uint16_t wanted) const override { return target_->Attributes(wanted); }
  uint64_t Size() const override { return target_->Size(); }
  DateTime DateLastModified() const override { return target_->DateLastModified(); }
  std::unique_ptr<fs::FileReader> Open() const override {
    faults_.Enter(Operation::kOpenFile, target_->Path());
    return target_->Open();
  }

 private:
  std::unique_ptr<fs::File> target_;
  FaultInjectingFileSystem& faults_;
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
  return target_.GetFolder(path);
}

}  // namespace trl::testing
