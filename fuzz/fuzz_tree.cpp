#include "fuzz_tree.h"

#include <fstream>
#include <sstream>

#include "platform/failure.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/temp_tree.h"

namespace trl::fuzz {
namespace {

std::string ReadSourceFile(const std::string& relative) {
  std::ifstream in(std::string(TRL_SOURCE_DIR) + "/" + relative, std::ios::binary);
  std::ostringstream content;
  content << in.rdbuf();
  return std::move(content).str();
}

void Fill(const testing::TempTree& made) {
  made.AddFolder("app/lib");
  made.AddFolder("app/Lib");
  made.AddFolder("app/empty");
  made.AddFile("app/README.md", "read me");
  made.AddFile("app/readme.md", "another file");
  made.AddFile("app/.hidden", "");
  made.AddFile("app/lib/core.js", "module.exports = 1;\n");
  made.AddFile("app/lib/name-\xff.txt", "not UTF-8");
  made.AddFile("app/tool.exe", ReadSourceFile("tests/schema/data/versioned32.exe"));
  made.AddFifo("app/pipe");
  made.AddLink("app/lib-link", "lib");
  made.AddLink("app/gone", "missing");
}

const testing::TempTree& Tree() {
  static const testing::TempTree tree;
  static const bool filled = (Fill(tree), true);
  static_cast<void>(filled);
  return tree;
}

// Whether `path` lies in the tree: below its root, climbing nowhere.
bool Inside(std::string_view path) {
  const std::string& root = TreeRoot();
  if (!path.starts_with(root)) return false;
  std::string_view rest = path.substr(root.size());
  if (!rest.empty() && rest.front() != '\\' && rest.front() != '/') return false;
  while (!rest.empty()) {
    size_t end = rest.find_first_of("\\/");
    if (rest.substr(0, end) == "..") return false;
    if (end == std::string_view::npos) break;
    rest.remove_prefix(end + 1);
  }
  return true;
}

class TreeOnly : public fs::FileSystem {
 public:
  TreeOnly() : target_(fs::CreatePosixFileSystem({})) {}

  bool FileExists(std::string_view path) override {
    return Inside(path) && target_->FileExists(path);
  }
  bool FolderExists(std::string_view path) override {
    return Inside(path) && target_->FolderExists(path);
  }
  std::unique_ptr<fs::File> GetFile(std::string_view path) override {
    if (!Inside(path)) Fail(kFileNotFound);
    return target_->GetFile(path);
  }
  std::unique_ptr<fs::Folder> GetFolder(std::string_view path) override {
    if (!Inside(path)) Fail(kPathNotFound);
    return target_->GetFolder(path);
  }
  void Forget() override { target_->Forget(); }
  std::string RealPath(std::string_view path) override {
    return Inside(path) ? target_->RealPath(path) : std::string(path);
  }

 private:
  std::unique_ptr<fs::FileSystem> target_;
};

}  // namespace

const std::string& TreeRoot() {
  static const std::string root = Tree().Path();
  return root;
}

std::string WithTreeRoot(std::string_view text) {
  static constexpr std::string_view kToken = "{root}";
  std::string out;
  for (size_t at = text.find(kToken); at != std::string_view::npos; at = text.find(kToken)) {
    out.append(text.substr(0, at)).append(TreeRoot());
    text.remove_prefix(at + kToken.size());
  }
  return out.append(text);
}

std::unique_ptr<fs::FileSystem> TreeFileSystem() { return std::make_unique<TreeOnly>(); }

}  // namespace trl::fuzz
