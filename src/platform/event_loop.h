#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <limits>

namespace trl {

// A timer on the creating thread's event loop: while enabled with a non-zero interval it raises
// Tick each time the interval has passed. A destroyed timer never ticks again, also when it is
// destroyed from inside its own Tick.
class Timer {
 public:
  explicit Timer(std::function<void()> tick = {});
  ~Timer();
  Timer(const Timer&) = delete;
  Timer& operator=(const Timer&) = delete;

  bool Enabled() const { return enabled_; }
  void Enabled(bool enabled);
  uint32_t Interval() const { return interval_; }
  void Interval(uint32_t milliseconds);
  void Tick(std::function<void()> handler) { tick_ = std::move(handler); }

 private:
  friend class EventLoop;
  void Arm();
  void Disarm();

  std::function<void()> tick_;
  bool enabled_ = false;
  uint32_t interval_ = 0;
  uint64_t id_ = 0;  // non-zero while armed on the loop
};

// One loop per thread: posted calls and timer ticks run on it, never inside the call that posts or
// arms them.
class EventLoop {
 public:
  static EventLoop& Current();

  // Runs `call` on a later pass of the loop.
  void Post(std::function<void()> call);

  // One pass: reads the clock once and runs the posted calls and timer ticks that are due at that
  // moment (not those they add), then returns. A call it runs may yield again.
  void Yield();

  // Passes until `done` is true (checked after each pass) or the timeout has passed; sleeps while
  // nothing is due. Returns whether `done` became true.
  bool RunUntil(const std::function<bool()>& done,
                std::chrono::milliseconds timeout = std::chrono::milliseconds::max());

  // Ends a sleep of RunUntil early; safe to call from a signal handler.
  void Wake();

  ~EventLoop();
  EventLoop(const EventLoop&) = delete;
  EventLoop& operator=(const EventLoop&) = delete;

 private:
  friend class Timer;
  struct State;
  EventLoop();
  State* state_;
};

// Yield() of the current thread's loop: lets pending calls and ticks run, then returns.
void Yield();

// What every tick and posted call of every loop runs inside, set once by a host that must know
// when the component's code runs: a server whose client pumps the loop itself (the thread's
// message queue on Windows) defers the destruction of objects its client lets go of inside an
// event until the tick that raised it has returned. None by default.
using DispatchScope = std::function<void(const std::function<void()>& run)>;
void SetDispatchScope(DispatchScope scope);
// Runs `run` inside the scope, if one is set.
void RunDispatched(const std::function<void()>& run);

}  // namespace trl
