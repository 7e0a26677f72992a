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

// Runs the loop until `done`, within a timeout far beyond any interval used here.
void RunUntil(const std::function<bool()>& done) {
  ASSERT_TRUE(EventLoop::Current().RunUntil(done, milliseconds(5000)));
}

TEST(EventLoopTest, CallsAndTicksWaitForTheNextPass) {
  auto& loop = EventLoop::Current();
  std::vector<std::string> order;
  loop.Post([&] {
    order.push_back("a");
    loop.Post([&] { order.push_back("c"); });
  });
  loop.Post([&] { order.push_back("b"); });
  Timer timer([&] { order.push_back("tick"); });
  timer.Interval(1);
  timer.Enabled(true);
  SleepFor(5);
  EXPECT_TRUE(order.empty());
  Yield();
  EXPECT_THAT(order, ElementsAre("tick", "a", "b"));
  timer.Enabled(false);
  Yield();
  EXPECT_THAT(order, ElementsAre("tick", "a", "b", "c"));
  EXPECT_THROW(loop.Post({}), Failure);
}

TEST(EventLoopTest, StoppedTimerNeverTicks) {
  struct Case {
    const char* how;
    std::function<void(std::unique_ptr<Timer>&)> stop;
  };
  const Case cases[] = {
      {"disabled", [](auto& timer) { timer->Enabled(false); }},
      {"interval 0", [](auto& timer) { timer->Interval(0); }},
      {"destroyed", [](auto& timer) { timer.reset(); }},
      {"re-armed", [](auto& timer) { timer->Interval(1000); }},
  };
  // Stopped before the pass, or by the tick of a timer due just before it in the same pass.
  for (bool duringPass : {false, true}) {
    for (const auto& c : cases) {
      int ticks = 0;
      auto victim = std::make_unique<Timer>([&] { ++ticks; });
      Timer first([&] {
        if (duringPass && victim) c.stop(victim);
      });
      first.Interval(1);
      first.Enabled(true);
      victim->Interval(1);
      victim->Enabled(true);
      if (!duringPass) c.stop(victim);
      SleepFor(5);
      Yield();
      EXPECT_EQ(ticks, 0) << c.how << (duringPass ? " during the pass" : " before it");
    }
  }
}

TEST(EventLoopTest, OneShotPatternTicksOnce) {
  int ticks = 0;
  auto timer = std::make_unique<Timer>();
  timer->Tick([&] {
    ++ticks;
    timer->Interval(0);
    timer->Enabled(false);
    timer.reset();
  });
  timer->Interval(5);
  timer->Enabled(true);
  RunUntil([&] { return ticks > 0; });
  SleepFor(15);
  Yield();
  EXPECT_EQ(ticks, 1);
}

TEST(EventLoopTest, DueTimersTickInDeadlineThenArmingOrder) {
  std::vector<std::string> order;
  Timer slow([&] { order.push_back("slow"); });
  Timer middle([&] { order.push_back("middle"); });
  Timer fast([&] { order.push_back("fast"); });
  for (auto [timer, interval] : {std::pair{&slow, 30}, {&middle, 20}, {&fast, 10}}) {
    timer->Interval(interval);
    timer->Enabled(true);
  }
  SleepFor(40);
  Yield();
  EXPECT_THAT(order, ElementsAre("fast", "middle", "slow"));

  // Timers ticking in one pass re-arm for the same deadline; later passes keep their order. The
  // second element is armed first, so an order by address would differ.
  std::vector<int> ties;
  Timer timers[2];
  for (int i : {1, 0}) {
    timers[i].Tick([&ties, i] { ties.push_back(i); });
    timers[i].Interval(10);
    timers[i].Enabled(true);
  }
  slow.Enabled(false);
  middle.Enabled(false);
  fast.Enabled(false);
  for (int pass = 0; pass < 3; ++pass) {
    SleepFor(15);
    Yield();
  }
  EXPECT_THAT(ties, ElementsAre(1, 0, 1, 0, 1, 0));
}

TEST(EventLoopTest, ReentrantYieldRunsEachCallAndTickOnce) {
  auto& loop = EventLoop::Current();
  std::vector<std::string> order;
  loop.Post([&] {
    order.push_back("a");
    Yield();
  });
  loop.Post([&] { order.push_back("b"); });
  loop.Post([&] { order.push_back("c"); });
  Yield();
  Yield();
  EXPECT_THAT(order, ElementsAre("a", "b", "c"));

  int outerTicks = 0;
  int otherTicks = 0;
  Timer outer([&] {
    ++outerTicks;
    Yield();  // `outer` is already re-armed: it must not tick again in here
  });
  Timer other([&] { ++otherTicks; });
  for (Timer* timer : {&outer, &other}) {
    timer->Interval(20);
    timer->Enabled(true);
  }
  SleepFor(25);
  Yield();
  EXPECT_EQ(outerTicks, 1);
  EXPECT_EQ(otherTicks, 1);
  RunUntil([&] { return outerTicks == 2; });  // and it stays periodic
}

TEST(EventLoopTest, IntervalChangeRearmsFromNow) {
  int ticks = 0;
  Timer timer([&] { ++ticks; });
  timer.Interval(300);
  timer.Enabled(true);
  SleepFor(150);
  timer.Interval(300);
  SleepFor(200);  // past the first deadline, before the new one
  Yield();
  EXPECT_EQ(ticks, 0);
  RunUntil([&] { return ticks == 1; });
}

TEST(EventLoopTest, RunUntilSleepsUntilTheTimerOrTheTimeout) {
  bool ticked = false;
  Timer timer([&] {
    ticked = true;
    timer.Enabled(false);
  });
  auto start = Clock::now();
  timer.Interval(50);
  timer.Enabled(true);
  RunUntil([&] { return ticked; });
  EXPECT_GE(Clock::now() - start, milliseconds(45));
  EXPECT_LT(Clock::now() - start, milliseconds(2000));

  start = Clock::now();
  EXPECT_FALSE(EventLoop::Current().RunUntil([] { return false; }, milliseconds(30)));
  EXPECT_GE(Clock::now() - start, milliseconds(30));
  EXPECT_LT(Clock::now() - start, milliseconds(2000));
}

TEST(EventLoopTest, WakeEndsTheSleep) {
  auto& loop = EventLoop::Current();
  std::atomic<bool> done = false;
  std::thread other([&] {
    SleepFor(30);
    done = true;
    loop.Wake();
  });
  auto start = Clock::now();
  // Nothing is due: without the wake-up this would sleep the full minute.
  bool finished = loop.RunUntil([&] { return done.load(); }, milliseconds(60000));
  auto elapsed = Clock::now() - start;
  other.join();
  EXPECT_TRUE(finished);
  EXPECT_LT(elapsed, milliseconds(5000));
}

}  // namespace
}  // namespace trl
