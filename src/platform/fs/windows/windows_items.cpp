#include "platform/fs/windows/windows_items.h"

#include <algorithm>
#include <chrono>

#include "platform/failure.h"
#include "platform/fs/windows/wide_path.h"
#include "platform/windows/system_error.h"
#include "platform/windows/wide_text.h"

namespace trl::fs::windows {
namespace {

using HandleCloser = decltype(&CloseHandle);
using UniqueHandle = std::unique_ptr<void, HandleCloser>;

// FILETIME counts 100 ns from 1601; FileIdentity counts nanoseconds from 1970.
constexpr int64_t kEpochDifference = 116444736000000000;

int64_t Nanoseconds(int64_t fileTime) { return (fileTime - kEpochDifference) * 100; }

int64_t FileTimeValue(const FILETIME& time) {
  return static_cast<int64_t>((uint64_t{time.dwHighDateTime} << 32) | time.dwLowDateTime);
}

// Opens `native` to read its data or attributes; a folder opens too, links are followed.
UniqueHandle OpenItem(const std::string& native, DWORD access) {
  HANDLE handle = CreateFileW(LongPath(native).c_str(), access,
                              FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr,
                              OPEN_EXISTING, FILE_FLAG_BACKUP_SEMANTICS, nullptr);
  return UniqueHandle(handle == INVALID_HANDLE_VALUE ? nullptr : handle, &CloseHandle);
}

// A junction or a symbolic link: an item standing for another. Other reparse points (files kept
// in the cloud, deduplicated ones) are the items themselves.
bool IsNameSurrogate(DWORD attributes, DWORD tag) {
  return (attributes & FILE_ATTRIBUTE_REPARSE_POINT) != 0 && IsReparseTagNameSurrogate(tag);
}

class WindowsFileReader final : public FileReader {
 public:
  explicit WindowsFileReader(UniqueHandle handle) : handle_(std::move(handle)) {}

  uint64_t Size() override {
    LARGE_INTEGER size{};
    if (!GetFileSizeEx(handle_.get(), &size)) Fail(kDeviceIoError);
    return static_cast<uint64_t>(size.QuadPart);
  }

  size_t ReadAt(uint64_t offset, void* buffer, size_t size) override {
    OVERLAPPED at{};
    at.Offset = static_cast<DWORD>(offset);
    at.OffsetHigh = static_cast<DWORD>(offset >> 32);
    DWORD got = 0;
    DWORD want = static_cast<DWORD>(std::min<size_t>(size, DWORD{1} << 30));
    if (!ReadFile(handle_.get(), buffer, want, &got, &at)) {
      DWORD error = GetLastError();
      if (error == ERROR_HANDLE_EOF) return 0;
      Fail(FailureNumberOf(error, kFileNotFound));
    }
    return got;
  }

  std::optional<FileIdentity> Identity() override {
    BY_HANDLE_FILE_INFORMATION information{};
    if (!GetFileInformationByHandle(handle_.get(), &information)) return std::nullopt;
    FileIdentity identity;
    identity.device = information.dwVolumeSerialNumber;
    identity.inode = (uint64_t{information.nFileIndexHigh} << 32) | information.nFileIndexLow;
    identity.size = (uint64_t{information.nFileSizeHigh} << 32) | information.nFileSizeLow;
    identity.modified = Nanoseconds(FileTimeValue(information.ftLastWriteTime));
    // The change time also moves when links, attributes or security change.
    FILE_BASIC_INFO basic{};
    identity.changed =
        GetFileInformationByHandleEx(handle_.get(), FileBasicInfo, &basic, sizeof basic)
            ? Nanoseconds(basic.ChangeTime.QuadPart)
            : identity.modified;
    return identity;
  }

 private:
  UniqueHandle handle_;
};

ItemData FromFindData(const WIN32_FIND_DATAW& found) {
  ItemData data;
  data.attributes = found.dwFileAttributes;
  data.size = (uint64_t{found.nFileSizeHigh} << 32) | found.nFileSizeLow;
  data.modified = found.ftLastWriteTime;
  return data;
}

}  // namespace

std::optional<ItemData> QueryItem(const std::string& native, DWORD& error) {
  WIN32_FILE_ATTRIBUTE_DATA attributes{};
  if (!GetFileAttributesExW(LongPath(native).c_str(), GetFileExInfoStandard, &attributes)) {
    error = GetLastError();
    return std::nullopt;
  }
  ItemData data;
  data.attributes = attributes.dwFileAttributes;
  data.size = (uint64_t{attributes.nFileSizeHigh} << 32) | attributes.nFileSizeLow;
  data.modified = attributes.ftLastWriteTime;
  if ((data.attributes & FILE_ATTRIBUTE_REPARSE_POINT) == 0) return data;
  // A link: the item is what it leads to (a dangling one is nothing).
  UniqueHandle handle = OpenItem(native, FILE_READ_ATTRIBUTES);
  BY_HANDLE_FILE_INFORMATION information{};
  if (!handle || !GetFileInformationByHandle(handle.get(), &information)) {
    error = GetLastError();
    return std::nullopt;
  }
  data.link = true;
  data.attributes = information.dwFileAttributes;
  data.size = (uint64_t{information.nFileSizeHigh} << 32) | information.nFileSizeLow;
  data.modified = information.ftLastWriteTime;
  return data;
}

std::optional<std::string> FinalPath(const std::string& native, DWORD& error) {
  UniqueHandle handle = OpenItem(native, FILE_READ_ATTRIBUTES);
  if (!handle) {
    error = GetLastError();
    return std::nullopt;
  }
  std::wstring path(MAX_PATH, L'\0');
  for (;;) {
    DWORD size = GetFinalPathNameByHandleW(handle.get(), path.data(),
                                           static_cast<DWORD>(path.size()), VOLUME_NAME_DOS);
    if (size == 0) {
      error = GetLastError();
      return std::nullopt;
    }
    if (size < path.size()) {
      path.resize(size);
      break;
    }
    path.resize(size);
  }
  std::string text = FromWide(ShortForm(std::move(path)));
  // A root keeps its "\", no other folder ends with one.
  if (text.size() > 3 && text.ends_with('\\')) text.pop_back();
  return text;
}

std::string ChildPath(const std::string& folder, const std::string& name) {
  if (folder.ends_with('\\')) return folder + name;
  return folder + "\\" + name;
}

uint16_t WindowsFile::Attributes(uint16_t wanted) const {
  return static_cast<uint16_t>(data_.attributes & wanted & kAllAttributes);
}

DateTime WindowsFile::DateLastModified() const {
  SYSTEMTIME universal{};
  SYSTEMTIME local{};
  if (!FileTimeToSystemTime(&data_.modified, &universal) ||
      !SystemTimeToTzSpecificLocalTime(nullptr, &universal, &local)) {
    Fail(kOverflow);
  }
  return DateTime{local.wYear, local.wMonth, local.wDay, local.wHour, local.wMinute, local.wSecond};
}

std::unique_ptr<FileReader> WindowsFile::Open() const {
  UniqueHandle handle = OpenItem(Path(), GENERIC_READ);
  if (!handle) Fail(FailureNumberOf(GetLastError(), kFileNotFound));
  return std::make_unique<WindowsFileReader>(std::move(handle));
}

uint16_t WindowsFolder::Attributes(uint16_t wanted) const {
  return static_cast<uint16_t>(attributes_ & wanted & kAllAttributes);
}

// The root of a drive, of a share, or a volume mounted in a folder.
bool WindowsFolder::IsRootFolder() const {
  std::wstring path = LongPath(path_);
  std::wstring volume(path.size() + 2, L'\0');
  if (!GetVolumePathNameW(path.c_str(), volume.data(), static_cast<DWORD>(volume.size()))) {
    Fail(FailureNumberOf(GetLastError(), kPathNotFound));
  }
  volume.resize(wcslen(volume.c_str()));
  if (!path.ends_with(L'\\')) path += L'\\';
  return ShortForm(volume) == ShortForm(path) || _wcsicmp(volume.c_str(), path.c_str()) == 0;
}

const Collection<File>& WindowsFolder::Files() {
  List();
  return files_;
}

const Collection<Folder>& WindowsFolder::SubFolders() {
  List();
  return subFolders_;
}

const std::vector<FolderLink>& WindowsFolder::FolderLinks() {
  List();
  if (!links_) {
    links_.emplace();
    for (const auto& name : linkNames_) {
      DWORD error = 0;
      // A link that no longer leads anywhere is no link to a folder.
      if (auto target = FinalPath(ChildPath(path_, name), error)) {
        links_->push_back({name, std::move(*target)});
      }
    }
  }
  return *links_;
}

void WindowsFolder::List() {
  if (listed_) {
    if (listingFailure_ != 0) Fail(listingFailure_);
    return;
  }
  listed_ = true;
  WIN32_FIND_DATAW found{};
  HANDLE search = FindFirstFileExW(LongPath(ChildPath(path_, "*")).c_str(), FindExInfoBasic, &found,
                                   FindExSearchNameMatch, nullptr, FIND_FIRST_EX_LARGE_FETCH);
  if (search == INVALID_HANDLE_VALUE) {
    DWORD error = GetLastError();
    if (error == ERROR_FILE_NOT_FOUND || error == ERROR_NO_MORE_FILES) return;  // nothing in it
    listingFailure_ = error == ERROR_ACCESS_DENIED ? kPermissionDenied : kPathNotFound;
    Fail(listingFailure_);
  }
  do {
    std::wstring_view wide(found.cFileName);
    if (wide == L"." || wide == L"..") continue;
    std::string name = FromWide(wide);
    bool surrogate = IsNameSurrogate(found.dwFileAttributes, found.dwReserved0);
    if ((found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) != 0) {
      if (surrogate) {
        linkNames_.push_back(std::move(name));
      } else {
        subFolders_.push_back(
            std::make_unique<WindowsFolder>(ChildPath(path_, name), name, found.dwFileAttributes));
      }
    } else if (!surrogate) {
      files_.push_back(std::make_unique<WindowsFile>(path_, std::move(name), FromFindData(found)));
    } else {
      // A link to a file is the file it leads to; a dangling one is nothing.
      DWORD error = 0;
      if (auto data = QueryItem(ChildPath(path_, name), error)) {
        if ((data->attributes & FILE_ATTRIBUTE_DIRECTORY) == 0) {
          files_.push_back(std::make_unique<WindowsFile>(path_, std::move(name), *data));
        }
      }
    }
  } while (FindNextFileW(search, &found));
  FindClose(search);
}

}  // namespace trl::fs::windows
