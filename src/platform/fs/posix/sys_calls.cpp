#include "platform/fs/posix/sys_calls.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/statfs.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <memory>
#include <string>

#include "platform/failure.h"

namespace trl::fs::posix {
namespace {

thread_local SysCallCounts counts;

constexpr int kFolderFlags = O_RDONLY | O_NONBLOCK | O_DIRECTORY | O_CLOEXEC;

// The folder `folder` names, opened a few names at a time from "/" (or the working folder), each
// step shorter than PATH_MAX: the system refuses a longer path at once, yet folders may lie
// deeper. -1 with errno set when it cannot be.
int OpenInSteps(const std::string& folder) {
  bool absolute = folder.starts_with('/');
  int descriptor = ::open(absolute ? "/" : ".", O_PATH | O_DIRECTORY | O_CLOEXEC);
  for (size_t at = absolute ? 1 : 0; descriptor >= 0 && at < folder.size();) {
    size_t end = folder.size();
    if (end - at >= PATH_MAX) {
      size_t slash = folder.rfind('/', at + PATH_MAX - 1);
      // Without one, a name is longer than any the system takes, and the rest is refused.
      if (slash != std::string::npos && slash > at) end = slash;
    }
    int next =
        ::openat(descriptor, folder.substr(at, end - at).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    int error = errno;
    ::close(descriptor);
    errno = error;
    descriptor = next;
    at = end + 1;
  }
  return descriptor;
}

// `call(folder, name)` for the item at `path`, given its folder opened in steps and its name
// within; for a path the system refuses as too long. Returns what `call` returns, errno kept.
template <class Call>
auto AtLongPath(const std::string& path, Call call) -> decltype(call(0, "")) {
  size_t slash = path.rfind('/');
  std::string folder =
      slash == std::string::npos ? "." : path.substr(0, std::max<size_t>(slash, 1));
  int descriptor = OpenInSteps(folder);
  if (descriptor < 0) return decltype(call(0, ""))(-1);
  auto result = call(descriptor, path.c_str() + (slash == std::string::npos ? 0 : slash + 1));
  int error = errno;
  ::close(descriptor);
  errno = error;
  return result;
}

// `call(path)`, again through AtLongPath when the system finds `path` too long.
template <class Call, class CallAt>
auto Reaching(const std::string& path, Call call, CallAt callAt) -> decltype(call(path)) {
  auto result = call(path);
  if (result == decltype(result)(-1) && errno == ENAMETOOLONG) result = AtLongPath(path, callAt);
  return result;
}

}  // namespace

SysCallCounts CountedSysCalls() { return counts; }

int Stat(const std::string& path, struct stat& out) {
  ++counts.stat;
  int result = Reaching(
      path, [&](const std::string& at) { return ::stat(at.c_str(), &out); },
      [&](int folder, const char* name) { return ::fstatat(folder, name, &out, 0); });
  return result == 0 ? 0 : errno;
}

int LStat(const std::string& path, struct stat& out) {
  ++counts.stat;
  int result = Reaching(
      path, [&](const std::string& at) { return ::lstat(at.c_str(), &out); },
      [&](int folder, const char* name) {
        return ::fstatat(folder, name, &out, AT_SYMLINK_NOFOLLOW);
      });
  return result == 0 ? 0 : errno;
}

int FileSystemType(const std::string& path, int64_t& type) {
  ++counts.statfs;
  struct statfs info {};
  int result = Reaching(
      path, [&](const std::string& at) { return ::statfs(at.c_str(), &info); },
      [&](int folder, const char* name) {
        int item = ::openat(folder, name, O_PATH | O_CLOEXEC);
        int done = item < 0 ? -1 : ::fstatfs(item, &info);
        if (item >= 0) ::close(item);
        return done;
      });
  if (result != 0) return errno;
  type = static_cast<int64_t>(info.f_type);
  return 0;
}

std::string GetExtendedAttribute(const std::string& path, const char* name) {
  ++counts.getxattr;
  char value[64];
  auto size = Reaching(
      path,
      [&](const std::string& at) { return ::getxattr(at.c_str(), name, value, sizeof value); },
      [&](int folder, const char* item) {
        // The folder's descriptor stands in for the long way to it.
        std::string near = "/proc/self/fd/" + std::to_string(folder) + "/" + item;
        return ::getxattr(near.c_str(), name, value, sizeof value);
      });
  return size > 0 ? std::string(value, static_cast<size_t>(size)) : std::string();
}

int RealPath(const std::string& path, std::string& out) {
  std::unique_ptr<char, decltype(&std::free)> real(::realpath(path.c_str(), nullptr), &std::free);
  if (!real) return errno;
  out = real.get();
  return 0;
}

int OpenFolder(const std::string& path) {
  ++counts.opendir;
  return Reaching(
      path.empty() ? std::string(".") : path,
      [](const std::string& at) { return ::open(at.c_str(), kFolderFlags); },
      [](int folder, const char* name) { return ::openat(folder, name, kFolderFlags); });
}

int OpenFolderAt(int parent, const std::string& name) {
  ++counts.opendir;
  return ::openat(parent, name.c_str(), kFolderFlags);
}

int OpenFile(const std::string& path, int flags) {
  return Reaching(
      path, [&](const std::string& at) { return ::open(at.c_str(), flags); },
      [&](int folder, const char* name) { return ::openat(folder, name, flags); });
}

int32_t LookupFailure(int error, int32_t notFound) {
  switch (error) {
    case ENOENT:
    case ENOTDIR:
    case ELOOP:
    case ENAMETOOLONG:
      return notFound;
    case EACCES:
    case EPERM:
      return kPermissionDenied;
    case EIO:
      return kDeviceIoError;
    default:
      return kPathFileAccessError;
  }
}

int32_t ListingFailure(int error) {
  switch (error) {
    case EACCES:
    case EPERM:
      return kPermissionDenied;
    case ENOENT:
    case ENOTDIR:
      return kPathNotFound;
    default:
      return kPathFileAccessError;
  }
}

}  // namespace trl::fs::posix
