#include "platform/fs/posix/folder_entries.h"

#include <dirent.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "platform/fs/posix/sys_calls.h"

namespace trl::fs::posix {

// Large enough for a folder of hundreds of entries at one call.
struct FolderEntries::Buffer {
  alignas(dirent64) char bytes[1 << 16];
};

std::vector<std::unique_ptr<FolderEntries::Buffer>>& FolderEntries::SpareBuffers() {
  thread_local std::vector<std::unique_ptr<Buffer>> spare;
  return spare;
}

FolderEntries::FolderEntries(const std::string& native) : descriptor_(OpenFolder(native)) {
  TakeBuffer();
}

FolderEntries::FolderEntries(int parent, std::string_view name)
    : descriptor_(OpenFolderAt(parent, std::string(name))) {
  TakeBuffer();
}

int FolderEntries::Release() { return std::exchange(descriptor_, -1); }

void FolderEntries::TakeBuffer() {
  if (descriptor_ < 0) {
    error_ = errno;
    return;
  }
  auto& spare = SpareBuffers();
  if (spare.empty()) {
    buffer_ = std::make_unique<Buffer>();
  } else {
    buffer_ = std::move(spare.back());
    spare.pop_back();
  }
}

FolderEntries::~FolderEntries() {
  if (descriptor_ >= 0) ::close(descriptor_);
  if (buffer_) SpareBuffers().push_back(std::move(buffer_));
}

bool FolderEntries::Next(std::string_view& name, unsigned char& type) {
  if (descriptor_ < 0 || error_ != 0) return false;
  for (;;) {
    if (at_ == end_) {
      ssize_t got = ::getdents64(descriptor_, buffer_->bytes, sizeof buffer_->bytes);
      if (got < 0) error_ = errno;
      if (got <= 0) return false;
      at_ = 0;
      end_ = static_cast<size_t>(got);
    }
    const auto* entry = reinterpret_cast<const dirent64*>(buffer_->bytes + at_);
    at_ += entry->d_reclen;
    const char* text = entry->d_name;
    if (text[0] == '.' && (text[1] == '\0' || (text[1] == '.' && text[2] == '\0'))) continue;
    name = std::string_view(text, std::strlen(text));
    type = entry->d_type;
    return true;
  }
}

}  // namespace trl::fs::posix
