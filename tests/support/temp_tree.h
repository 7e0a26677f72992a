#pragma once

#include <sys/types.h>

#include <string>
#include <string_view>

namespace trl::testing {

// A fresh folder under the system's temporary folder, removed with everything in it (permissions
// restored first) when the tree goes away. Relative paths given to the helpers use "/" and raw
// bytes, so names that are not valid UTF-8 or that hold "\" or control characters can be made.
// Helpers throw std::runtime_error when the file system refuses.
class TempTree {
 public:
  TempTree();
  ~TempTree();
  TempTree(const TempTree&) = delete;
  TempTree& operator=(const TempTree&) = delete;

  const std::string& Root() const { return root_; }  // native, "/tmp/trl-Ab12Cd"
  std::string Native(std::string_view relative) const;
  // The component's "\" form of the root or of an item in the tree, names encoded as the file
  // system layer gives them: "\tmp\trl-Ab12Cd\sub\name".
  std::string Path(std::string_view relative = "") const;

  void AddFile(std::string_view relative, std::string_view content = "") const;
  void AddFolder(std::string_view relative) const;  // with missing parents
  void AddLink(std::string_view relative, std::string_view target) const;
  void AddFifo(std::string_view relative) const;
  void SetMode(std::string_view relative, mode_t mode) const;

 private:
  std::string root_;
};

}  // namespace trl::testing
