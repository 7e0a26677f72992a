#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/clock.h"

namespace trl::fs {

// Attribute bits, as the component's home platform reports them.
enum Attribute : uint16_t {
  kReadOnly = 1,
  kHidden = 2,
  kSystem = 4,
  kArchive = 32,
};
inline constexpr uint16_t kAllAttributes = kReadOnly | kHidden | kSystem | kArchive;

// Which file an open file is and which state of it: equal identities at two moments mean its
// content may be taken as unchanged between them. Times are nanoseconds since the epoch.
struct FileIdentity {
  uint64_t device = 0;
  uint64_t inode = 0;
  uint64_t size = 0;
  int64_t modified = 0;
  int64_t changed = 0;  // the last change of content or of status (links, mode, owner)

  bool operator==(const FileIdentity&) const = default;
};

// Random-access reading of one open file.
class FileReader {
 public:
  virtual ~FileReader() = default;
  virtual uint64_t Size() = 0;
  // Reads up to `size` bytes at `offset`; returns how many were read (0 at the end).
  virtual size_t ReadAt(uint64_t offset, void* buffer, size_t size) = 0;
  // The open file's identity as it is now; none where the file system cannot tell it.
  virtual std::optional<FileIdentity> Identity() { return std::nullopt; }
};

class File {
 public:
  virtual ~File() = default;
  // The name as the file system gives it, case kept, reversibly made XML-safe (see NameFromNative).
  virtual std::string Name() const = 0;
  // The path in the component's "\" form: the folder's Path, "\" and Name.
  virtual std::string Path() const = 0;
  // The attribute word restricted to the `wanted` bits: only what is needed to decide those bits is
  // read from the file system, so a caller that needs no read-only bit causes no stat.
  virtual uint16_t Attributes(uint16_t wanted = kAllAttributes) const = 0;
  virtual uint64_t Size() const = 0;
  virtual DateTime DateLastModified() const = 0;
  virtual std::unique_ptr<FileReader> Open() const = 0;
  // Whether its folder's listing holds another file whose name differs from this one only in
  // letter case: such names match alike, yet name different files.
  virtual bool HasCaseSibling() const { return false; }
  // Whether it is a link to a file rather than the file itself.
  virtual bool IsLink() const { return false; }
  // Whether Open may be called on any thread while the file system goes on being used on the
  // thread that made the file, so that files can be read ahead on other threads.
  virtual bool OpensOnAnyThread() const { return false; }
};

class Folder;
template <class T>
using Collection = std::vector<std::unique_ptr<T>>;  // Count is size()

// A link to a folder found in a listing: its name and the real path of the folder it leads to.
struct FolderLink {
  std::string name;
  std::string target;  // as RealPath gives it
};

class Folder {
 public:
  virtual ~Folder() = default;
  virtual std::string Name() const = 0;  // "" for the root of a drive
  virtual std::string Path() const = 0;  // "\" form, no trailing "\" except for a root
  virtual uint16_t Attributes(uint16_t wanted = kAllAttributes) const = 0;
  virtual bool IsRootFolder() const = 0;
  // The folder's files and subfolders in the order the file system lists them. The folder is
  // listed once, on the first call of either. A folder that cannot be listed fails with
  // kPermissionDenied (70) or kPathNotFound (76). A link to a folder is not a subfolder (a walk
  // never loops); a link to a file is a file; a dangling link is neither.
  virtual const Collection<File>& Files() = 0;
  virtual const Collection<Folder>& SubFolders() = 0;
  // The links to folders the same listing found (a dangling link or a loop is none), in the
  // order the file system lists them. Their targets are resolved on the first call.
  virtual const std::vector<FolderLink>& FolderLinks() = 0;
  // As File::HasCaseSibling, among the subfolders of the parent's listing.
  virtual bool HasCaseSibling() const { return false; }
};

// The file system as the component sees it: paths with "\" separators, names that match
// regardless of case, network paths "\\host\share\..." like local ones.
class FileSystem {
 public:
  virtual ~FileSystem() = default;
  virtual bool FileExists(std::string_view path) = 0;
  virtual bool FolderExists(std::string_view path) = 0;
  // Fail with kFileNotFound (53) / kPathNotFound (76) when there is no such item, with
  // kPermissionDenied (70) when it cannot be reached.
  virtual std::unique_ptr<File> GetFile(std::string_view path) = 0;
  virtual std::unique_ptr<Folder> GetFolder(std::string_view path) = 0;
  // The file where FileExists says there is one, else none: both questions in one lookup.
  virtual std::unique_ptr<File> FileIfExists(std::string_view path) {
    return FileExists(path) ? GetFile(path) : nullptr;
  }
  // Drops whatever was learnt of the disk (listings, lookups), so that what follows sees it as it
  // is now. A stage calls it as each run begins: nothing learnt in one run is used by the next.
  virtual void Forget() {}
  // The path of the item `path` names with every link resolved, in the "\" form of a local
  // path: the same item always gives the same text, whichever way it was reached. A file system
  // without links gives the path back as it is.
  virtual std::string RealPath(std::string_view path) { return std::string(path); }
};

}  // namespace trl::fs
