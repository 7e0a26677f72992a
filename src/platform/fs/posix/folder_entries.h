#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace trl::fs::posix {

// The entries of one folder as the kernel hands them out, in its order, "." and ".." left out.
// Read in large batches straight from getdents64: unlike a DIR stream there is no stat of the
// folder and no buffer to allocate per folder, which a walk of many small folders pays for.
class FolderEntries {
 public:
  // Opens the folder at `native` ("" is the working folder); Error() says why it could not be.
  explicit FolderEntries(const std::string& native);
  // Opens the folder `name` of the open folder `parent`.
  FolderEntries(int parent, std::string_view name);
  ~FolderEntries();
  FolderEntries(const FolderEntries&) = delete;
  FolderEntries& operator=(const FolderEntries&) = delete;

  // The next entry's name (valid until the next call) and d_type; false at the end or on an error.
  bool Next(std::string_view& name, unsigned char& type);
  // The errno value that stopped the listing, 0 when it is complete so far.
  int Error() const { return error_; }
  // The folder's descriptor, now the caller's to close; -1 when it is not open.
  int Release();

 private:
  struct Buffer;
  void TakeBuffer();
  // Buffers of listings that ended, for the next listing on this thread.
  static std::vector<std::unique_ptr<Buffer>>& SpareBuffers();

  int descriptor_;
  int error_ = 0;
  std::unique_ptr<Buffer> buffer_;
  size_t at_ = 0;
  size_t end_ = 0;
};

}  // namespace trl::fs::posix
