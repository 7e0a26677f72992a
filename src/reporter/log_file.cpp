#include "reporter/log_file.h"

#include <cerrno>

#include "platform/failure.h"
#include "platform/fs/output_stream.h"

namespace trl {

void LogFile::Open(const std::string& path, bool replace) {
  Close();
  path_ = path;
  // A link planted where the log goes is not written through.
  file_.reset(fs::OpenOutputStream(path, replace));
  if (file_ == nullptr) FailFromErrno(errno);
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
