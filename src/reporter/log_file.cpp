#include "reporter/log_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "platform/failure.h"
#include "platform/fs/posix/output_open.h"

namespace trl {

void LogFile::Open(const std::string& path, bool replace) {
  Close();
  path_ = path;
  // A link planted where the log goes is not written through.
  int fd = fs::OpenForWriting(path, O_CREAT | (replace ? O_TRUNC : O_APPEND));
  if (fd < 0) FailFromErrno(errno);
  file_.reset(::fdopen(fd, replace ? "w" : "a"));
  if (file_ == nullptr) {
    int error = errno;
    ::close(fd);
    FailFromErrno(error);
  }
}

void LogFile::Close() { file_.reset(); }

void LogFile::Append(std::string_view line) {
  if (std::fwrite(line.data(), 1, line.size(), file_.get()) == line.size() &&
      std::fflush(file_.get()) == 0) {
    return;
  }
  int error = errno;
  Close();
  FailFromErrno(error);
}

void LogFile::FailFromErrno(int error) const {
  int32_t number = kPathFileAccessError;
  switch (error) {
    case EACCES:
    case EPERM:
    case EROFS:
      number = kPermissionDenied;
      break;
    case ENOENT:
    case ENOTDIR:
      number = kPathNotFound;
      break;
  }
  Fail(number, StandardDescription(number) + ": " + path_);
}

}  // namespace trl
