#pragma once

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <deque>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "platform/fs/file_system.h"

namespace trl {

class Schema;

// Reads the version resources and digests of the files Compare is going to test on worker
// threads, in the order it will ask for them and a bounded number of files ahead of it, so that
// hashing uses every core while the documents stay on Compare's own thread. A value, or the
// failure reading it gave, reaches Compare as if its own thread had read the file when it asked.
class ReadAhead {
 public:
  // The kinds of property a planned file is read for.
  static constexpr int kVersion = 1;
  static constexpr int kDigest = 3;

  // One planned file and what was read of it.
  class Planned;

  // `planMore` is called on Compare's thread whenever fewer than `window` planned files wait for
  // a reader; it plans some more and returns false once nothing is left to plan.
  ReadAhead(const Schema& schema, unsigned threads, size_t window, std::function<bool()> planMore);
  // One per core.
  static unsigned DefaultThreads();

  ~ReadAhead();  // abandons the reads in progress and waits for the threads
  ReadAhead(const ReadAhead&) = delete;
  ReadAhead& operator=(const ReadAhead&) = delete;

  // Plans the reading of `file`, which must outlive this object, for the kinds `wanted` (a set of
  // bits 1 << kind). Called on Compare's thread in the order it will ask for the values.
  std::shared_ptr<Planned> Plan(const fs::File& file, unsigned wanted);
  // Adds kinds to a plan no thread has begun; does nothing to one already begun.
  void Widen(Planned& planned, unsigned wanted);

  // The value of the kind (kVersion or kDigest) of a planned file: as a worker read it, once it
  // has; read on this thread when no worker has begun it; raises the failure reading it gave.
  // A kind the plan did not want is read on this thread. `exhausted` tells whether every kind
  // planned has been taken now, so that the plan can be let go.
  std::string Take(Planned& planned, int kind, bool& exhausted);

  // Plans ahead until `files` planned files (the window unless given) wait for a thread; Compare
  // calls it as it moves on.
  void KeepAhead(size_t files = 0);

 private:
  void Work();
  // Reads everything planned of `planned` on the calling thread.
  void Read(Planned& planned) const;
  // Reads `kind` of `planned` when the plan wants it; a failure is kept as its value.
  void ReadKind(Planned& planned, int kind) const;
  // Marks a plan a worker began as read.
  void Finished(Planned& planned);
  std::string ReadNow(const fs::File& file, int kind) const;

  const Schema& schema_;
  size_t window_;
  std::function<bool()> planMore_;
  bool planning_ = true;

  std::mutex mutex_;
  std::condition_variable work_, done_;
  std::deque<std::shared_ptr<Planned>> waiting_;
  std::atomic<bool> stopping_ = false;
  std::vector<std::thread> threads_;
};

class ReadAhead::Planned {
 public:
  Planned(const fs::File& file, unsigned wanted) : file_(file), wanted_(wanted) {}

 private:
  friend class ReadAhead;
  enum class State { kWaiting, kReading, kRead };
  struct Value {
    std::string text;
    std::exception_ptr failure;
  };

  const fs::File& file_;
  unsigned wanted_;
  unsigned taken_ = 0;
  State state_ = State::kWaiting;  // these three guarded by the ReadAhead's mutex
  Value version_, digest_;
};

}  // namespace trl
