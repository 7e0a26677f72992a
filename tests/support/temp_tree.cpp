#include "support/temp_tree.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <vector>

#include "platform/text.h"

namespace trl::testing {
namespace {

namespace stdfs = std::filesystem;

void Check(bool ok, std::string_view what, const std::string& path) {
  if (!ok) {
    throw std::runtime_error(std::string(what) + " " + path + ": " + std::strerror(errno));
  }
}

// Makes every folder below `folder` (itself included) readable, writable and searchable, so that
// removal can reach everything; links are not followed.
void OpenUp(const stdfs::path& folder) {
  std::error_code ignored;
  stdfs::permissions(folder, stdfs::perms::owner_all, stdfs::perm_options::add, ignored);
  for (const auto& entry : stdfs::directory_iterator(folder, ignored)) {
    if (entry.is_directory(ignored) && !entry.is_symlink(ignored)) OpenUp(entry.path());
  }
}

}  // namespace

TempTree::TempTree() {
  std::string pattern = (stdfs::temp_directory_path() / "trl-XXXXXX").string();
  std::vector<char> buffer(pattern.begin(), pattern.end());
  buffer.push_back('\0');
  Check(::mkdtemp(buffer.data()) != nullptr, "mkdtemp", pattern);
  root_ = buffer.data();
}

TempTree::~TempTree() {
  std::error_code ignored;
  OpenUp(root_);
  stdfs::remove_all(root_, ignored);
}

std::string TempTree::Native(std::string_view relative) const {
  return relative.empty() ? root_ : root_ + "/" + std::string(relative);
}

std::string TempTree::Path(std::string_view relative) const {
  std::string path;
  for (const stdfs::path& part : stdfs::path(Native(relative)).relative_path()) {
    if (!part.empty()) path += '\\' + NameFromNative(part.native());
  }
  return path;
}

void TempTree::AddFile(std::string_view relative, std::string_view content) const {
  std::string path = Native(relative);
  std::ofstream file(path, std::ios::binary);
  file.write(content.data(), static_cast<std::streamsize>(content.size()));
  Check(static_cast<bool>(file), "write", path);
}

void TempTree::AddFolder(std::string_view relative) const {
  std::error_code error;
  stdfs::create_directories(Native(relative), error);
  errno = error.value();
  Check(!error, "mkdir", Native(relative));
}

void TempTree::AddLink(std::string_view relative, std::string_view target) const {
  std::string path = Native(relative);
  Check(::symlink(std::string(target).c_str(), path.c_str()) == 0, "symlink", path);
}

void TempTree::AddFifo(std::string_view relative) const {
  std::string path = Native(relative);
  Check(::mkfifo(path.c_str(), 0644) == 0, "mkfifo", path);
}

void TempTree::SetMode(std::string_view relative, mode_t mode) const {
  std::string path = Native(relative);
  Check(::chmod(path.c_str(), mode) == 0, "chmod", path);
}

}  // namespace trl::testing
