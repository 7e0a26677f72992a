#include "platform/event_loop.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <deque>
#include <limits>
#include <map>
#include <unordered_map>
#include <utility>
#include <vector>

#include "platform/failure.h"

namespace trl {
namespace {

using Clock = std::chrono::steady_clock;
using TimePoint = Clock::time_point;

// poll() timeout for a wait: rounded up so a sleep never ends just before a deadline and spins.
int PollTimeout(Clock::duration wait) {
  if (wait <= Clock::duration::zero()) return 0;
  auto milliseconds = std::chrono::ceil<std::chrono::milliseconds>(wait).count();
  return static_cast<int>(
      std::min<decltype(milliseconds)>(milliseconds, std::numeric_limits<int>::max()));
}

}  // namespace

struct EventLoop::State {
  State() : wakeFd(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (wakeFd < 0) Fail(kDeviceIoError, "Cannot create the event loop's wake-up descriptor");
  }
  ~State() { close(wakeFd); }
  State(const State&) = delete;
  State& operator=(const State&) = delete;

  // Arms `timer` for `deadline`; returns its new id (ids grow, so they give the arming order).
  uint64_t Add(Timer* timer, TimePoint deadline) {
    uint64_t id = ++lastTimerId;
    timers.emplace(std::pair{deadline, id}, timer);
    deadlines.emplace(id, deadline);
    return id;
  }

  // Removes the timer armed under `id` and returns it; null when nothing is armed under it.
  Timer* Remove(uint64_t id) {
    auto found = deadlines.find(id);
    if (found == deadlines.end()) return nullptr;
    auto node = timers.find({found->second, id});
    Timer* timer = node->second;
    timers.erase(node);
    deadlines.erase(found);
    return timer;
  }

  struct Call {
    uint64_t sequence;
    std::function<void()> run;
  };
  std::deque<Call> posted;
  uint64_t lastPosted = 0;

  // Armed timers in the order they fall due: deadline, then arming order.
  std::map<std::pair<TimePoint, uint64_t>, Timer*> timers;
  std::unordered_map<uint64_t, TimePoint> deadlines;
  uint64_t lastTimerId = 0;

  int wakeFd;
};

Timer::Timer(std::function<void()> tick) : tick_(std::move(tick)) {}

Timer::~Timer() { Disarm(); }

void Timer::Enabled(bool enabled) {
  if (enabled == enabled_) return;
  enabled_ = enabled;
  if (enabled_ && interval_ > 0) {
    Arm();
  } else {
    Disarm();
  }
}

void Timer::Interval(uint32_t milliseconds) {
  interval_ = milliseconds;
  Disarm();
  if (enabled_ && interval_ > 0) Arm();
}

void Timer::Arm() {
  id_ = EventLoop::Current().state_->Add(this, Clock::now() + std::chrono::milliseconds(interval_));
}

void Timer::Disarm() {
  if (id_ == 0) return;
  EventLoop::Current().state_->Remove(id_);
  id_ = 0;
}

EventLoop& EventLoop::Current() {
  thread_local EventLoop loop;
  return loop;
}

EventLoop::EventLoop() : state_(new State) {}

EventLoop::~EventLoop() {
  // Timers that outlive the loop (thread teardown) must not reach back into it.
  for (auto& [key, timer] : state_->timers) timer->id_ = 0;
  delete state_;
}

void EventLoop::Post(std::function<void()> call) {
  if (!call) Fail(kInvalidArgument);
  state_->posted.push_back({++state_->lastPosted, std::move(call)});
}

void EventLoop::Yield() {
  State& state = *state_;
  TimePoint now = Clock::now();
  uint64_t lastCall = state.lastPosted;
  std::vector<uint64_t> due;
  for (const auto& [key, timer] : state.timers) {
    if (key.first > now) break;
    due.push_back(key.second);
  }

  // Each timer is looked up again by id: a callback before it (or a nested pass) may have
  // disarmed, re-armed or destroyed it, and then it is no longer armed under that id.
  for (uint64_t id : due) {
    Timer* timer = state.Remove(id);
    if (timer == nullptr) continue;
    timer->id_ = state.Add(timer, now + std::chrono::milliseconds(timer->interval_));
    auto tick = timer->tick_;  // a copy: the handler may destroy its timer
    if (tick) RunDispatched(tick);
  }

  // Calls are taken off the queue before they run, so a nested pass never runs one twice.
  while (!state.posted.empty() && state.posted.front().sequence <= lastCall) {
    auto call = std::move(state.posted.front().run);
    state.posted.pop_front();
    RunDispatched(call);
  }
}

bool EventLoop::RunUntil(const std::function<bool()>& done, std::chrono::milliseconds timeout) {
  TimePoint start = Clock::now();
  TimePoint limit =
      timeout >= std::chrono::duration_cast<std::chrono::milliseconds>(TimePoint::max() - start)
          ? TimePoint::max()
          : start + timeout;
  for (;;) {
    Yield();
    if (done()) return true;
    TimePoint now = Clock::now();
    if (now >= limit) return false;
    TimePoint wakeAt = limit;
    if (!state_->posted.empty()) {
      wakeAt = now;
    } else if (!state_->timers.empty()) {
      wakeAt = std::min(wakeAt, state_->timers.begin()->first.first);
    }
    pollfd wake{state_->wakeFd, POLLIN, 0};
    if (poll(&wake, 1, PollTimeout(wakeAt - now)) > 0) {
      uint64_t count = 0;
      [[maybe_unused]] auto drained = read(state_->wakeFd, &count, sizeof count);
    }
  }
}

void EventLoop::Wake() {
  uint64_t one = 1;
  // A failed write means the counter is already non-zero: the loop wakes anyway.
  [[maybe_unused]] auto written = write(state_->wakeFd, &one, sizeof one);
}

void Yield() { EventLoop::Current().Yield(); }

}  // namespace trl
