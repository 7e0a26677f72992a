#pragma once

#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

namespace trl {

// The run log: a file kept open between entries, each entry written and flushed at once so that a
// crash loses nothing already reported. Failures name the file: kPermissionDenied (70),
// kPathNotFound (76) for a missing folder, kPathFileAccessError (75) otherwise.
class LogFile {
 public:
  // Opens `path` for appending, emptying it first when `replace` is set.
  void Open(const std::string& path, bool replace);
  bool IsOpen() const { return file_ != nullptr; }
  void Close();
  // Writes `line` and flushes it; after a failed write the file is closed, so the next entry
  // opens it again.
  void Append(std::string_view line);

 private:
  struct Closer {
    void operator()(std::FILE* file) const { std::fclose(file); }
  };

  [[noreturn]] void FailFromErrno(int error) const;

  std::unique_ptr<std::FILE, Closer> file_;
  std::string path_;
};

}  // namespace trl
