#include "platform/fs/output_stream.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "platform/fs/posix/output_open.h"

namespace trl::fs {

std::FILE* OpenOutputStream(const std::string& path, bool replace) {
  int fd = OpenForWriting(path, O_CREAT | (replace ? O_TRUNC : O_APPEND));
  if (fd < 0) return nullptr;
  std::FILE* file = ::fdopen(fd, replace ? "w" : "a");
  if (file == nullptr) {
    int error = errno;
    ::close(fd);
    errno = error;
  }
  return file;
}

}  // namespace trl::fs
