#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <string>

// The system calls the POSIX layer makes about items, in one place so that each is counted. The
// counts exist for tests, which use them to prove that a walk asks the file system nothing it does
// not need (an unwanted stat per file is invisible otherwise); they cost one increment per call.

namespace trl::fs::posix {

struct SysCallCounts {
  uint64_t stat = 0;  // stat and lstat
  uint64_t statfs = 0;
  uint64_t getxattr = 0;
  uint64_t opendir = 0;
};

// The calls this thread has made so far.
SysCallCounts CountedSysCalls();

// A path longer than the system takes at once (PATH_MAX) is reached a few folders at a time, so
// that items below such a path are found, read and listed like any other.

// Each returns 0 or the errno value.
int Stat(const std::string& path, struct stat& out);
int LStat(const std::string& path, struct stat& out);
int FileSystemType(const std::string& path, int64_t& type);
// The value of extended attribute `name`, or "" when it cannot be read.
std::string GetExtendedAttribute(const std::string& path, const char* name);
// The path with every link, "." and ".." resolved, from "/".
int RealPath(const std::string& path, std::string& out);
// A descriptor of the folder to list, or -1 with errno set; an empty path is the working folder.
int OpenFolder(const std::string& path);
// The folder `name` of the open folder `parent`, the same way.
int OpenFolderAt(int parent, const std::string& name);
// open(2): a descriptor, or -1 with errno set.
int OpenFile(const std::string& path, int flags);

// Failure numbers for errno values: looking an item up (`notFound` when it does not exist),
// and listing a folder.
int32_t LookupFailure(int error, int32_t notFound);
int32_t ListingFailure(int error);

}  // namespace trl::fs::posix
