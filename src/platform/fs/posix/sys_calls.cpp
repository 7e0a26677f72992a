#include "platform/fs/posix/sys_calls.h"

#include <sys/statfs.h>
#include <sys/xattr.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include "platform/failure.h"

namespace trl::fs::posix {
namespace {

thread_local SysCallCounts counts;

}  // namespace

SysCallCounts CountedSysCalls() { return counts; }

int Stat(const std::string& path, struct stat& out) {
  ++counts.stat;
  return ::stat(path.c_str(), &out) == 0 ? 0 : errno;
}

int LStat(const std::string& path, struct stat& out) {
  ++counts.stat;
  return ::lstat(path.c_str(), &out) == 0 ? 0 : errno;
}

int FileSystemType(const std::string& path, int64_t& type) {
  ++counts.statfs;
  struct statfs info {};
  if (::statfs(path.c_str(), &info) != 0) return errno;
  type = static_cast<int64_t>(info.f_type);
  return 0;
}

std::string GetExtendedAttribute(const std::string& path, const char* name) {
  ++counts.getxattr;
  char value[64];
  auto size = ::getxattr(path.c_str(), name, value, sizeof value);
  return size > 0 ? std::string(value, static_cast<size_t>(size)) : std::string();
}

int RealPath(const std::string& path, std::string& out) {
  std::unique_ptr<char, decltype(&std::free)> real(::realpath(path.c_str(), nullptr), &std::free);
  if (!real) return errno;
  out = real.get();
  return 0;
}

DIR* OpenDirectory(const std::string& path) {
  ++counts.opendir;
  return ::opendir(path.empty() ? "." : path.c_str());
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
