#pragma once

#include <string>

namespace trl::cli {

// Keeps other runs from saving the same file while it lives, from the reading of the file to the
// replacing of it, so that no run's findings are lost: an advisory lock on "<file>.lock" beside the
// file (the file itself is replaced on save, so it cannot carry the lock). A second run waits for
// the first, and says so on standard error.
class SaveLock {
 public:
  explicit SaveLock(const std::string& path);
  ~SaveLock();
  SaveLock(const SaveLock&) = delete;
  SaveLock& operator=(const SaveLock&) = delete;

 private:
  int fd_;
};

}  // namespace trl::cli
