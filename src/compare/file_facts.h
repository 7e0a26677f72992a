#pragma once

#include <cstdint>
#include <exception>
#include <memory>
#include <optional>
#include <string>

#include "compare/read_ahead.h"
#include "platform/fs/file_system.h"

namespace trl {

// One thing learnt of a local file: the value read, or the failure reading it gave, which is
// raised again at every later use so that each use reports as a fresh read would.
template <class T>
class Learnt {
 public:
  template <class Read>
  const T& Get(Read&& read) {
    if (failure_) std::rethrow_exception(failure_);
    if (!value_) {
      try {
        value_.emplace(read());
      } catch (...) {
        failure_ = std::current_exception();
        throw;
      }
    }
    return *value_;
  }
  // The value read so far, or null.
  const T* Known() const { return value_ ? &*value_ : nullptr; }
  // Whether it was read, or failed to be.
  bool Settled() const { return value_ || failure_; }

 private:
  std::optional<T> value_;
  std::exception_ptr failure_;
};

// What a run has learnt of one local file it tested. A common file name is tested against the
// files of many fingerprint versions, so each file is looked at, opened and hashed once a run.
struct LocalFileFacts {
  Learnt<bool> exists;
  Learnt<std::unique_ptr<fs::File>> file;
  // The property values in the form their kinds compare.
  Learnt<std::string> version;  // kind 1, lower case
  Learnt<int32_t> size;         // kind 2
  Learnt<std::string> digest;   // kind 3, lower case
  Learnt<std::string> written;  // kind 4, formatted
  // The reading ahead of its version and digest, until both are taken.
  std::shared_ptr<ReadAhead::Planned> planned;
};

}  // namespace trl
