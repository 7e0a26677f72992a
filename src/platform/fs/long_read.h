#pragma once

#include <cstdint>
#include <exception>
#include <functional>

namespace trl::fs {

// Ends a read that its poll gave up on (the run was cancelled meanwhile); not a failure of the
// file, so nobody reports it.
struct ReadAbandoned : std::exception {
  const char* what() const noexcept override { return "read abandoned"; }
};

// Lets a long read be interrupted while it lives on this thread: a reader of a large file calls
// PollLongRead every kLongReadStep bytes, which runs `poll` (it may handle pending events) and
// throws ReadAbandoned when `poll` answers true. Polls nest.
class LongReadPoll {
 public:
  explicit LongReadPoll(std::function<bool()> poll);
  ~LongReadPoll();
  LongReadPoll(const LongReadPoll&) = delete;
  LongReadPoll& operator=(const LongReadPoll&) = delete;

 private:
  std::function<bool()> poll_;
  const LongReadPoll* outer_;
  friend void PollLongRead();
};

inline constexpr uint64_t kLongReadStep = uint64_t{8} << 20;

void PollLongRead();

}  // namespace trl::fs
