#include "compare/read_ahead.h"

#include <algorithm>
#include <chrono>

#include "platform/fs/long_read.h"
#include "schema/schema.h"

namespace trl {
namespace {

constexpr std::chrono::milliseconds kPollInterval{10};

}  // namespace

ReadAhead::ReadAhead(const Schema& schema, unsigned threads, size_t window,
                     std::function<bool()> planMore)
    : schema_(schema), window_(window), planMore_(std::move(planMore)) {
  threads_.reserve(threads);
  for (unsigned i = 0; i < threads; ++i) threads_.emplace_back([this] { Work(); });
}

unsigned ReadAhead::DefaultThreads() { return std::max(1u, std::thread::hardware_concurrency()); }

ReadAhead::~ReadAhead() {
  {
    std::lock_guard lock(mutex_);
    stopping_ = true;
  }
  work_.notify_all();
  for (std::thread& thread : threads_) thread.join();
}

std::shared_ptr<ReadAhead::Planned> ReadAhead::Plan(const fs::File& file, unsigned wanted) {
  auto planned = std::make_shared<Planned>(file, wanted);
  {
    std::lock_guard lock(mutex_);
    waiting_.push_back(planned);
  }
  work_.notify_one();
  return planned;
}

void ReadAhead::Widen(Planned& planned, unsigned wanted) {
  std::lock_guard lock(mutex_);
  if (planned.state_ == Planned::State::kWaiting) planned.wanted_ |= wanted;
}

void ReadAhead::KeepAhead(size_t files) {
  if (files == 0) files = window_;
  while (planning_) {
    {
      std::lock_guard lock(mutex_);
      if (waiting_.size() >= files) return;
    }
    planning_ = planMore_();
  }
}

std::string ReadAhead::Take(Planned& planned, int kind, bool& exhausted) {
  KeepAhead();
  unsigned bit = 1u << kind;
  std::unique_lock lock(mutex_);
  planned.taken_ |= bit;
  exhausted = (planned.wanted_ & ~planned.taken_) == 0;
  if ((planned.wanted_ & bit) == 0) {
    lock.unlock();
    return ReadNow(planned.file_, kind);
  }
  if (planned.state_ == Planned::State::kWaiting) {
    // Nobody has begun it: waiting for a worker to get there would leave this thread idle.
    planned.state_ = Planned::State::kReading;
    lock.unlock();
    Read(planned);
    lock.lock();
    planned.state_ = Planned::State::kRead;
  } else {
    // A worker reads it: waited for as the run would wait in a long read of its own, so that a
    // cancel still reaches the run.
    while (!done_.wait_for(lock, kPollInterval,
                           [&] { return planned.state_ == Planned::State::kRead; })) {
      lock.unlock();
      fs::PollLongRead();
      lock.lock();
    }
  }
  const Planned::Value& value = kind == kVersion ? planned.version_ : planned.digest_;
  if (value.failure) std::rethrow_exception(value.failure);
  return value.text;
}

void ReadAhead::Work() {
  // A run that ends stops its workers within one step of a long read.
  fs::LongReadPoll poll([this] { return stopping_.load(); });
  // The plans whose digests are being hashed on this thread.
  std::vector<std::shared_ptr<Planned>> hashing;
  auto next = [&]() -> const fs::File* {
    while (true) {
      std::shared_ptr<Planned> planned;
      {
        std::lock_guard lock(mutex_);
        if (stopping_ || waiting_.empty()) return nullptr;
        planned = std::move(waiting_.front());
        waiting_.pop_front();
        if (planned->state_ != Planned::State::kWaiting) continue;
        planned->state_ = Planned::State::kReading;
      }
      ReadKind(*planned, kVersion);
      if ((planned->wanted_ & (1u << kDigest)) != 0) {
        hashing.push_back(std::move(planned));
        return &hashing.back()->file_;
      }
      Finished(*planned);
    }
  };
  auto done = [&](const fs::File& file, std::string digest, std::exception_ptr failure) {
    auto at = std::find_if(hashing.begin(), hashing.end(),
                           [&](const auto& planned) { return &planned->file_ == &file; });
    std::shared_ptr<Planned> planned = std::move(*at);
    hashing.erase(at);
    planned->digest_ = {std::move(digest), failure};
    Finished(*planned);
  };
  std::unique_lock lock(mutex_);
  while (true) {
    work_.wait(lock, [&] { return stopping_ || !waiting_.empty(); });
    if (stopping_) return;
    lock.unlock();
    try {
      // Many files at once: their digests are hashed side by side on this one core.
      schema_.ReadPropertyType3Together(next, done);
    } catch (const fs::ReadAbandoned&) {
      return;
    }
    lock.lock();
  }
}

void ReadAhead::Finished(Planned& planned) {
  std::lock_guard lock(mutex_);
  planned.state_ = Planned::State::kRead;
  done_.notify_all();
}

void ReadAhead::ReadKind(Planned& planned, int kind) const {
  if ((planned.wanted_ & (1u << kind)) == 0) return;
  Planned::Value& value = kind == kVersion ? planned.version_ : planned.digest_;
  try {
    value.text = ReadNow(planned.file_, kind);
  } catch (const fs::ReadAbandoned&) {
    throw;
  } catch (...) {
    value.failure = std::current_exception();
  }
}

void ReadAhead::Read(Planned& planned) const {
  ReadKind(planned, kVersion);
  ReadKind(planned, kDigest);
}

std::string ReadAhead::ReadNow(const fs::File& file, int kind) const {
  return kind == kVersion ? schema_.ReadPropertyType1(file) : schema_.ReadPropertyType3(file);
}

}  // namespace trl
