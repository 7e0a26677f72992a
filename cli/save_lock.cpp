#include "save_lock.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "atomic_file.h"
#include "command_error.h"

namespace trl::cli {

SaveLock::SaveLock(const std::string& path) {
  std::string lock = SaveTarget(path) + ".lock";
  // Read-only is enough for the lock, and lets users who may read the folder share one lock file;
  // a link or anything but a regular file planted there is refused.
  fd_ = ::open(lock.c_str(), O_RDONLY | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0644);
  struct stat status {};
  if (fd_ < 0 || ::fstat(fd_, &status) != 0 || !S_ISREG(status.st_mode)) {
    int error = fd_ < 0 ? errno : EINVAL;
    if (fd_ >= 0) ::close(fd_);
    throw CommandError(fmt::format("cannot lock '{}' for the save: '{}': {}", path, lock,
                                   error == ELOOP ? "it is a link" : std::strerror(error)),
                       kExitFailed);
  }
  if (::flock(fd_, LOCK_EX | LOCK_NB) == 0) return;
  fmt::print(stderr, "trllocator: waiting for another run that is saving '{}'\n", path);
  while (::flock(fd_, LOCK_EX) != 0) {
    if (errno != EINTR) {
      int error = errno;
      ::close(fd_);
      throw CommandError(
          fmt::format("cannot lock '{}' for the save: {}", path, std::strerror(error)),
          kExitFailed);
    }
  }
}

SaveLock::~SaveLock() { ::close(fd_); }

}  // namespace trl::cli
