#include "platform/fs/windows/windows_file_system.h"

#include <windows.h>

#include "platform/failure.h"
#include "platform/fs/component_path.h"
#include "platform/fs/windows/wide_path.h"
#include "platform/fs/windows/windows_items.h"
#include "platform/windows/system_error.h"
#include "platform/windows/wide_text.h"

namespace trl::fs::windows {
namespace {

// What a path names, once found.
struct Item {
  std::string path;           // native, in the component's form; "C:\" for the root of a drive
  std::string folder;         // the path of the folder it is in; "" for a root
  std::string name;           // as the system spells it; "" for a root
  bool root = false;          // of a drive, a share or the current drive
  bool mustBeFolder = false;  // the path ended with a separator
  ItemData data;
  bool IsFolder() const { return (data.attributes & FILE_ATTRIBUTE_DIRECTORY) != 0; }
};

bool IsDrive(std::string_view component) {
  return component.size() == 2 && component[1] == ':' &&
         ((component[0] >= 'A' && component[0] <= 'Z') ||
          (component[0] >= 'a' && component[0] <= 'z'));
}

// The name of the item at `path` as the folder's listing spells it, or `given` when the system
// cannot tell.
std::string SpelledName(const std::string& path, const std::string& given) {
  WIN32_FIND_DATAW found{};
  HANDLE search = FindFirstFileExW(LongPath(path).c_str(), FindExInfoBasic, &found,
                                   FindExSearchNameMatch, nullptr, 0);
  if (search == INVALID_HANDLE_VALUE) return given;
  FindClose(search);
  return FromWide(found.cFileName);
}

// Not safe for use by several threads at once: a run owns one. It keeps nothing between calls:
// the system's own lookups are fast and match regardless of case.
class WindowsFileSystem final : public FileSystem {
 public:
  bool FileExists(std::string_view path) override {
    Item item;
    return Find(path, item) == ERROR_SUCCESS && !item.IsFolder() && !item.mustBeFolder;
  }

  bool FolderExists(std::string_view path) override {
    Item item;
    return Find(path, item) == ERROR_SUCCESS && item.IsFolder();
  }

  std::unique_ptr<File> GetFile(std::string_view path) override {
    Item item;
    if (DWORD error = Find(path, item)) Fail(FailureNumberOf(error, kFileNotFound));
    if (item.IsFolder() || item.mustBeFolder || item.root) Fail(kFileNotFound);
    return std::make_unique<WindowsFile>(std::move(item.folder), SpelledName(item.path, item.name),
                                         item.data);
  }

  std::unique_ptr<Folder> GetFolder(std::string_view path) override {
    Item item;
    if (DWORD error = Find(path, item)) Fail(FailureNumberOf(error, kPathNotFound));
    if (!item.IsFolder()) Fail(kPathNotFound);
    std::string name = item.root ? "" : SpelledName(item.path, item.name);
    std::string spelled = item.root             ? item.path
                          : item.folder.empty() ? name
                                                : ChildPath(item.folder, name);
    return std::make_unique<WindowsFolder>(std::move(spelled), std::move(name),
                                           item.data.attributes);
  }

  std::string RealPath(std::string_view path) override {
    Item item;
    if (DWORD error = Find(path, item)) Fail(FailureNumberOf(error, kPathNotFound));
    DWORD error = 0;
    auto real = FinalPath(item.path, error);
    if (!real) Fail(FailureNumberOf(error, kPathNotFound));
    return *real;
  }

 private:
  // Returns ERROR_SUCCESS and the item `text` names, or the Win32 error code.
  static DWORD Find(std::string_view text, Item& item) {
    ComponentPath path = ParseComponentPath(text);
    if (path.network && path.components.size() < 2) return ERROR_BAD_NETPATH;
    if (path.components.empty() && !path.absolute) return ERROR_PATH_NOT_FOUND;
    item.mustBeFolder = path.trailingSeparator;
    bool driveRoot = path.components.size() == 1 && !path.absolute && IsDrive(path.components[0]);
    item.root = driveRoot || (path.network && path.components.size() == 2) ||
                (path.absolute && !path.network && path.components.empty());
    if (!item.root) {
      item.name = path.components.back();
      path.components.pop_back();
      item.folder = path.Text();
      if (path.components.size() == 1 && !path.absolute && IsDrive(path.components[0])) {
        item.folder += "\\";
      }
      item.path = item.folder.empty() ? item.name : ChildPath(item.folder, item.name);
    } else {
      item.path = path.Text();
      if (!item.path.ends_with('\\')) item.path += "\\";
      if (path.network) item.path.pop_back();  // "\\host\share", as the component writes it
    }
    DWORD error = ERROR_SUCCESS;
    auto data = QueryItem(item.root && path.network ? item.path + "\\" : item.path, error);
    if (!data) return error;
    item.data = *data;
    return ERROR_SUCCESS;
  }
};

}  // namespace
}  // namespace trl::fs::windows

namespace trl::fs {

std::unique_ptr<FileSystem> CreateWindowsFileSystem() {
  return std::make_unique<windows::WindowsFileSystem>();
}

}  // namespace trl::fs
