#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "platform/fs/file_system.h"

namespace trl::testing {

// A FileSystem that passes every call to another one, except the calls it was told to fail, and
// counts the calls of each kind so a test can check that no unneeded work was done. Files it hands
// out are wrapped too, so opening one can fail as well; folders are passed through.
// Paths match regardless of case, of "/" for "\" and of a trailing separator.
class FaultInjectingFileSystem : public fs::FileSystem {
 public:
  enum class Operation {
    kFileExists,
    kFolderExists,
    kGetFile,
    kGetFolder,
    kOpenFile,
  };

  // `target` must outlive this object and everything it hands out.
  explicit FaultInjectingFileSystem(fs::FileSystem& target) : target_(target) {}

  // From now on, `operation` on `path` fails with failure `number`.
  void FailOn(Operation operation, std::string_view path, int32_t number);
  int Calls(Operation operation) const { return calls_[static_cast<size_t>(operation)]; }

  bool FileExists(std::string_view path) override;
  bool FolderExists(std::string_view path) override;
  std::unique_ptr<fs::File> GetFile(std::string_view path) override;
  std::unique_ptr<fs::Folder> GetFolder(std::string_view path) override;
  std::string RealPath(std::string_view path) override { return target_.RealPath(path); }

  // Counts `operation` and fails it when a rule says so; for the wrapped files.
  void Enter(Operation operation, std::string_view path);

 private:
  fs::FileSystem& target_;
  std::map<std::pair<Operation, std::string>, int32_t> failures_;
  std::array<int, 5> calls_{};
};

}  // namespace trl::testing
