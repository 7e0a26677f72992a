#include "platform/fs/posix/output_open.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace trl::fs {

int OpenForWriting(const std::string& path, int flags, mode_t mode) {
  int fd = ::open(path.c_str(), O_WRONLY | O_CLOEXEC | O_NOFOLLOW | flags, mode);
  if (fd >= 0 || errno != ELOOP) return fd;
  // A link: written through only when what it leads to is no regular file, checked on what was
  // opened, so that a link swapped in between cannot turn it into one.
  fd = ::open(path.c_str(), O_WRONLY | O_CLOEXEC | (flags & ~(O_CREAT | O_TRUNC | O_EXCL)));
  if (fd < 0) return fd;
  struct stat status {};
  if (::fstat(fd, &status) != 0 || S_ISREG(status.st_mode) || S_ISDIR(status.st_mode)) {
    ::close(fd);
    errno = ELOOP;
    return -1;
  }
  return fd;
}

}  // namespace trl::fs
