#include "platform/fs/long_read.h"

namespace trl::fs {
namespace {

thread_local const LongReadPoll* currentPoll = nullptr;

}  // namespace

LongReadPoll::LongReadPoll(std::function<bool()> poll)
    : poll_(std::move(poll)), outer_(currentPoll) {
  currentPoll = this;
}

LongReadPoll::~LongReadPoll() { currentPoll = outer_; }

void PollLongRead() {
  if (currentPoll != nullptr && currentPoll->poll_()) throw ReadAbandoned();
}

}  // namespace trl::fs
