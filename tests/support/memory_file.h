#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "platform/failure.h"
#include "platform/fs/file_system.h"

namespace trl::testing {

// An fs::File whose content lives in memory, for code that reads files. Reads can be made short
// (at most `maxRead` bytes per call, as a real file may give) and can be made to fail from a given
// offset on, as a failing disk would.
class MemoryFile : public fs::File {
 public:
  MemoryFile(std::string name, std::string content, DateTime modified = {})
      : name_(std::move(name)), content_(std::move(content)), modified_(modified) {}

  void SetMaxRead(size_t maxRead) { maxRead_ = maxRead; }
  void FailReadsFrom(uint64_t offset, int32_t number) { failure_ = {offset, number}; }

  std::string Name() const override { return name_; }
  std::string Path() const override { return "\\memory\\" + name_; }
  uint16_t Attributes(uint16_t) const override { return 0; }
  uint64_t Size() const override { return content_.size(); }
  DateTime DateLastModified() const override { return modified_; }
  std::unique_ptr<fs::FileReader> Open() const override { return std::make_unique<Reader>(*this); }

 private:
  class Reader : public fs::FileReader {
   public:
    explicit Reader(const MemoryFile& file) : file_(file) {}
    uint64_t Size() override { return file_.content_.size(); }
    size_t ReadAt(uint64_t offset, void* buffer, size_t size) override {
      if (file_.failure_ && offset + size > file_.failure_->first) {
        Fail(file_.failure_->second);
      }
      if (offset >= file_.content_.size()) return 0;
      size_t count = std::min({size, file_.maxRead_, file_.content_.size() - offset});
      std::memcpy(buffer, file_.content_.data() + offset, count);
      return count;
    }

   private:
    const MemoryFile& file_;
  };

  std::string name_;
  std::string content_;
  DateTime modified_;
  size_t maxRead_ = SIZE_MAX;
  std::optional<std::pair<uint64_t, int32_t>> failure_;
};

}  // namespace trl::testing
