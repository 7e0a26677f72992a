#include "platform/event_loop.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "platform/failure.h"

namespace trl {
namespace {

using std::chrono::milliseconds;
using Clock = std::chrono::steady_clock;
using testing::ElementsAre;

void SleepFor(int ms) { std::this_thread::sleep_for(milliseconds(ms)); }

void Start(Timer& timer, uint32_t interval) {
  timer.Interval(interval);
  timer.Enabled(true);
}

// A pass runs what was due when it began, each once: ticks by deadline, then calls in order; what
// they add waits for the next pass. A nested pass (as Cancel arrives) does not repeat a tick whose
// timer is re-armed, nor a call that is running, nor one it ran itself.
TEST(EventLoopTest, APassRunsWhatWasDueOnce) {
  auto& loop = EventLoop::Current();
  std::vector<std::string> order;
  Timer slow([&] { order.push_back("slow"); });
  Timer fast([&] {
    order.push_back("fast");
    Yield();
  });
  Start(slow, 20);
  Start(fast, 10);
  loop.Post([&] {
    order.push_back("a");
    Yield();
    loop.Post([&] { order.push_back("c"); });
  });
  loop.Post([&] { order.push_back("b"); });
  SleepFor(25);
  EXPECT_TRUE(order.empty());
  Yield();
  EXPECT_THAT(order, ElementsAre("fast", "slow", "a", "b"));
  slow.Enabled(false);
  fast.Enabled(false);
  Yield();
  EXPECT_THAT(order, ElementsAre("fast", "slow", "a", "b", "c"));
  EXPECT_THROW(loop.Post({}), Failure);
}

// Stopped by the tick of a timer due just before it in the same pass.
TEST(EventLoopTest, StoppedTimerNeverTicks) {
  const std::function<void(std::unique_ptr<Timer>&)> stops[] = {
      [](auto& timer) { timer->Enabled(false); }, [](auto& timer) { timer->Interval(0); },
      [](auto& timer) { timer.reset(); }, [](auto& timer) { timer->Interval(1000); }};
  for (size_t i = 0; i < std::size(stops); ++i) {
    int ticks = 0;
    auto victim = std::make_unique<Timer>([&] { ++ticks; });
    Timer first([&] { stops[i](victim); });
    Start(first, 1);
    Start(*victim, 1);
    SleepFor(5);
    Yield();
    EXPECT_EQ(ticks, 0) << "stop " << i;
  }
}

// A new interval on an enabled timer counts from the change.
TEST(EventLoopTest, ANewIntervalReArmsAnEnabledTimer) {
  int ticks = 0;
  Timer timer([&] { ++ticks; });
  Start(timer, 1000);
  timer.Interval(1);
  SleepFor(5);
  Yield();
  EXPECT_EQ(ticks, 1);
}

// Timers re-armed in one pass share a deadline and keep the order in which they were armed (1
// before 0, so an order by address would differ), pass after pass.
TEST(EventLoopTest, TiedTimersTickInArmingOrder) {
  std::vector<int> order;
  Timer timers[2];
  for (int i : {1, 0}) {
    timers[i].Tick([&order, i] { order.push_back(i); });
    Start(timers[i], 10);
  }
  for (int pass = 0; pass < 3; ++pass) {
    SleepFor(15);
    Yield();
  }
  EXPECT_THAT(order, ElementsAre(1, 0, 1, 0, 1, 0));
}

// RunUntil sleeps until a timer is due, the timeout passes or another thread wakes it.
TEST(EventLoopTest, RunUntilEndsOnTimeoutOrWake) {
  auto& loop = EventLoop::Current();
  int ticks = 0;
  Timer timer([&] { ++ticks; });
  Start(timer, 50);
  auto start = Clock::now();
  EXPECT_TRUE(loop.RunUntil([&] { return ticks == 1; }, milliseconds(5000)));
  EXPECT_LT(Clock::now() - start, milliseconds(2000));  // woken for the tick, not at the timeout
  timer.Enabled(false);

  start = Clock::now();
  EXPECT_FALSE(loop.RunUntil([] { return false; }, milliseconds(30)));
  EXPECT_GE(Clock::now() - start, milliseconds(30));

  std::atomic<bool> done = false;
  std::thread other([&] {
    SleepFor(30);
    done = true;
    loop.Wake();
  });
  start = Clock::now();
  EXPECT_TRUE(loop.RunUntil([&] { return done.load(); }, milliseconds(60000)));
  other.join();
  EXPECT_LT(Clock::now() - start, milliseconds(5000));  // not the full minute
}

}  // namespace
}  // namespace trl
