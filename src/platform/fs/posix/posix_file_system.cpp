#include "platform/fs/posix/posix_file_system.h"

#include <dirent.h>

#include <cerrno>
#include <optional>
#include <thread>

#include "platform/failure.h"
#include "platform/fs/component_path.h"
#include "platform/fs/posix/folder_place.h"
#include "platform/fs/posix/listing_read_ahead.h"
#include "platform/fs/posix/name_resolver.h"
#include "platform/fs/posix/posix_file.h"
#include "platform/fs/posix/posix_folder.h"
#include "platform/fs/posix/sys_calls.h"
#include "platform/fs/posix/walk_memory.h"
#include "platform/text.h"

namespace trl::fs::posix {
namespace {

// What a path names, once found.
struct Item {
  std::shared_ptr<FolderPlace> place;  // for a folder a listing found: where it is
  std::string native;
  std::string path;        // component form, the last name spelt as the file system spells it
  std::string nativeName;  // "" for a root
  bool shareRoot = false;
  bool mustBeFolder = false;         // the path ended with a separator
  std::optional<ItemStatus> status;  // none for a folder a listing found
  bool IsFolder() const { return place || S_ISDIR(status->mode); }
};

std::string ParentOf(const std::string& path, char separator) {
  auto last = path.rfind(separator);
  if (last == std::string::npos) return "";
  return last == 0 ? std::string(1, separator) : path.substr(0, last);
}

// The file a lookup found.
std::unique_ptr<File> FileOf(Item item) {
  auto folder =
      std::make_shared<FolderPlace>(ParentOf(item.native, '/'), ParentOf(item.path, '\\'));
  // Following the link, a regular file is not a system file whether or not it was reached
  // through a link; anything else needs an lstat to decide.
  unsigned char type = S_ISREG(item.status->mode) ? DT_REG : DT_UNKNOWN;
  return std::make_unique<PosixFile>(std::move(folder), std::move(item.nativeName), type,
                                     item.status);
}

// Not safe for use by several threads at once: a run owns one.
class PosixFileSystem final : public FileSystem {
 public:
  explicit PosixFileSystem(ShareTable shares) : shares_(std::move(shares)) {}

  bool FileExists(std::string_view path) override {
    Item item;
    return Find(path, item) == 0 && !item.IsFolder() && !item.mustBeFolder;
  }

  bool FolderExists(std::string_view path) override {
    Item item;
    return Find(path, item) == 0 && item.IsFolder();
  }

  std::unique_ptr<File> GetFile(std::string_view path) override {
    Item item;
    if (int error = Find(path, item)) Fail(LookupFailure(error, kFileNotFound));
    if (item.IsFolder() || item.mustBeFolder) Fail(kFileNotFound);
    return FileOf(std::move(item));
  }

  std::unique_ptr<File> FileIfExists(std::string_view path) override {
    Item item;
    if (Find(path, item) != 0 || item.IsFolder() || item.mustBeFolder) return nullptr;
    return FileOf(std::move(item));
  }

  std::unique_ptr<Folder> GetFolder(std::string_view path) override {
    Item item;
    if (int error = Find(path, item)) Fail(LookupFailure(error, kPathNotFound));
    if (!item.IsFolder()) Fail(kPathNotFound);
    auto place = item.place
                     ? item.place
                     : std::make_shared<FolderPlace>(std::move(item.native), std::move(item.path));
    return std::make_unique<PosixFolder>(std::move(place), std::move(item.nativeName),
                                         item.shareRoot, item.status, run_.memory, run_.readAhead);
  }

  void Forget() override { run_ = RunMemory{}; }

  std::string RealPath(std::string_view path) override {
    Item item;
    if (int error = Find(path, item)) Fail(LookupFailure(error, kPathNotFound));
    std::string real;
    if (int error = RealComponentPath(item.place ? item.place->Native() : item.native, real)) {
      Fail(LookupFailure(error, kPathNotFound));
    }
    return real;
  }

 private:
  // Returns 0 and the item `text` names, or an errno value (ENOENT for a network path that
  // leads nowhere).
  int Find(std::string_view text, Item& item) {
    if (run_.last && run_.lastText == text) {
      item = *run_.last;
      return 0;
    }
    run_.last.reset();
    if (auto listed = run_.memory->Take(text)) {
      item.place = std::move(listed->place);
      item.nativeName = std::move(listed->nativeName);
      item.mustBeFolder = true;
      Remember(text, item);
      return 0;
    }
    auto path = ParseComponentPath(text);
    std::string native;
    struct stat status {};
    if (int error = Locate(path, native, status)) return error;
    item.shareRoot = path.network && path.components.size() == 2;
    if (item.shareRoot && !S_ISDIR(status.st_mode)) return ENOTDIR;

    item.native = std::move(native);
    if (!item.shareRoot && !path.components.empty()) {
      // The last name as found, unless the path ends at the folder a share leads to: that
      // folder's own name is not part of the path.
      std::string found = item.native.substr(item.native.rfind('/') + 1);
      std::string given = NameToNative(path.components.back());
      if (found == given || LowerCase(found) == LowerCase(given)) {
        path.components.back() = NameFromNative(found);
        given = std::move(found);
      }
      item.nativeName = std::move(given);
    }
    item.path = path.Text();
    item.mustBeFolder = path.trailingSeparator;
    item.status = ToItemStatus(status);
    if (S_ISDIR(status.st_mode)) Remember(text, item);
    return 0;
  }

  void Remember(std::string_view text, const Item& item) {
    run_.lastText = text;
    run_.last = item;
  }

  // Finds the native item `path` names: through the share table for a network path, with one
  // stat when the spelling is exact, else through the resolver. Returns 0 or an errno value.
  int Locate(const ComponentPath& path, std::string& native, struct stat& status) {
    ComponentPath local = path;
    if (path.network) {
      if (path.components.size() < 2) return ENOENT;
      auto directory = shares_.Resolve(path.Text());
      if (!directory) return ENOENT;
      local = ParseComponentPath(*directory);
    }
    if (!local.absolute && local.components.empty()) return ENOENT;
    std::vector<std::string> names;
    names.reserve(local.components.size());
    native = local.absolute ? "/" : "";
    for (const auto& component : local.components) {
      names.push_back(NameToNative(component));
      native = JoinPath(native, names.back(), '/');
    }
    int error = Stat(native, status);
    if (error != ENOENT && error != ENOTDIR) return error;
    error = run_.resolver.Resolve(local.absolute, names, native);
    return error != 0 ? error : Stat(native, status);
  }

  // What the file system learns of the disk in one run, all of it dropped by Forget: a run that
  // used an earlier run's listings would see files that are gone and miss new ones.
  struct RunMemory {
    NameResolver resolver;
    std::shared_ptr<WalkMemory> memory = std::make_shared<WalkMemory>();
    // One thread more lists ahead of a walk; with a single core it would only take turns with it.
    std::shared_ptr<ListingReadAhead> readAhead = std::thread::hardware_concurrency() > 1
                                                      ? std::make_shared<ListingReadAhead>()
                                                      : nullptr;
    // A walker asks about each subfolder it has listed three times running, with one text:
    // FileExists, FolderExists and GetFolder of the subfolder's Path and "\". The last folder
    // found is remembered with its text, so the three cost one stat; any other lookup drops it,
    // and files are never remembered, so a file's coming and going is seen at once.
    std::string lastText;
    std::optional<Item> last;
  };

  ShareTable shares_;
  RunMemory run_;
};

}  // namespace
}  // namespace trl::fs::posix

namespace trl::fs {

std::unique_ptr<FileSystem> CreatePosixFileSystem(ShareTable shares) {
  return std::make_unique<posix::PosixFileSystem>(std::move(shares));
}

}  // namespace trl::fs
