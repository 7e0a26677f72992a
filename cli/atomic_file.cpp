#include "atomic_file.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>

#include "command_error.h"

namespace trl::cli {
namespace {

[[noreturn]] void Fail(const std::string& what, const std::string& path, int error) {
  throw CommandError(fmt::format("cannot {} '{}': {}", what, path, std::strerror(error)),
                     kExitFailed);
}

bool WriteAll(int fd, const std::string& text) {
  const char* data = text.data();
  size_t left = text.size();
  while (left > 0) {
    ssize_t written = ::write(fd, data, left);
    if (written < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    data += written;
    left -= static_cast<size_t>(written);
  }
  return true;
}

// Makes a rename in the folder of `path` durable.
void SyncFolderOf(const std::string& path) {
  std::filesystem::path folder = std::filesystem::path(path).parent_path();
  int fd = ::open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY);
  if (fd < 0) return;  // the rename stands; only its durability across a power cut is less sure
  ::fsync(fd);
  ::close(fd);
}

}  // namespace

void ReplaceFileAtomically(const std::string& path, const std::string& text, bool keepBackup) {
  std::string temporary = path + ".XXXXXX";
  int fd = ::mkstemp(temporary.data());
  if (fd < 0) Fail("create a file beside", path, errno);

  // The replacement keeps the permissions of the file it replaces; a new file gets the usual ones.
  struct stat existing {};
  if (::stat(path.c_str(), &existing) == 0) {
    ::fchmod(fd, existing.st_mode & 07777);
  } else {
    mode_t mask = ::umask(0);
    ::umask(mask);
    ::fchmod(fd, 0666 & ~mask);
  }
  bool written = WriteAll(fd, text) && WriteAll(fd, "\n") && ::fsync(fd) == 0;
  int error = errno;
  if (::close(fd) != 0 && written) {
    written = false;
    error = errno;
  }
  if (!written) {
    ::unlink(temporary.c_str());
    Fail("write", temporary, error);
  }

  if (keepBackup && ::access(path.c_str(), F_OK) == 0) {
    std::string backup = path + ".bak";
    // A hard link keeps the old content under the backup name while `path` is replaced below.
    ::unlink(backup.c_str());
    if (::link(path.c_str(), backup.c_str()) != 0) {
      error = errno;
      ::unlink(temporary.c_str());
      Fail("keep a backup of", path, error);
    }
  }
  if (::rename(temporary.c_str(), path.c_str()) != 0) {
    error = errno;
    ::unlink(temporary.c_str());
    Fail("replace", path, error);
  }
  SyncFolderOf(path);
}

}  // namespace trl::cli
