#include "platform/fs/output_stream.h"

#include <windows.h>

#include <fcntl.h>
#include <io.h>

#include <cerrno>

#include "platform/fs/windows/wide_path.h"

namespace trl::fs {
namespace {

int ErrnoOf(DWORD error) {
  switch (error) {
    case ERROR_ACCESS_DENIED:
    case ERROR_SHARING_VIOLATION:
    case ERROR_LOCK_VIOLATION:
      return EACCES;
    case ERROR_WRITE_PROTECT:
      return EROFS;
    case ERROR_FILE_NOT_FOUND:
    case ERROR_PATH_NOT_FOUND:
    case ERROR_INVALID_NAME:
      return ENOENT;
    default:
      return EIO;
  }
}

// Whether the opened item is a reparse point (a symbolic link or a junction planted there);
// devices and pipes are none.
bool IsReparsePoint(HANDLE handle) {
  if (GetFileType(handle) != FILE_TYPE_DISK) return false;
  BY_HANDLE_FILE_INFORMATION information{};
  return !GetFileInformationByHandle(handle, &information) ||
         (information.dwFileAttributes & FILE_ATTRIBUTE_REPARSE_POINT) != 0;
}

}  // namespace

std::FILE* OpenOutputStream(const std::string& path, bool replace) {
  // The reparse point itself is opened, never what it leads to, and then refused.
  HANDLE handle = CreateFileW(
      LongPath(path).c_str(), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
      nullptr, OPEN_ALWAYS, FILE_ATTRIBUTE_NORMAL | FILE_FLAG_OPEN_REPARSE_POINT, nullptr);
  if (handle == INVALID_HANDLE_VALUE) {
    errno = ErrnoOf(GetLastError());
    return nullptr;
  }
  if (IsReparsePoint(handle)) {
    CloseHandle(handle);
    errno = ELOOP;
    return nullptr;
  }
  if (replace && GetFileType(handle) == FILE_TYPE_DISK && !SetEndOfFile(handle)) {
    errno = ErrnoOf(GetLastError());
    CloseHandle(handle);
    return nullptr;
  }
  int fd = _open_osfhandle(reinterpret_cast<intptr_t>(handle), replace ? 0 : _O_APPEND);
  if (fd < 0) {
    CloseHandle(handle);
    return nullptr;
  }
  std::FILE* file = _fdopen(fd, replace ? "w" : "a");
  if (file == nullptr) {
    int error = errno;
    _close(fd);
    errno = error;
  }
  return file;
}

}  // namespace trl::fs
