#include "interrupt.h"

#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <condition_variable>
#include <csignal>
#include <cstdio>
#include <mutex>

#include "command_error.h"
#include "detached_end.h"
#include "platform/event_loop.h"

namespace trl::cli {
namespace {

std::atomic<int> interrupts{0};
std::atomic<EventLoop*> loop{nullptr};
// Written to by the signal handler (a write is safe there) to wake the watchdog.
int alarmPipe[2] = {-1, -1};
struct sigaction previous {};

std::mutex mutex;
std::condition_variable changed;
bool stopped = false;  // the guard goes away: the run it guards has ended

void OnInterrupt(int) {
  if (interrupts.fetch_add(1) > 0) EndFromSignalHandler(kExitInterrupted);
  if (EventLoop* current = loop.load()) current->Wake();
  if (alarmPipe[1] >= 0) {
    char byte = 1;
    [[maybe_unused]] ssize_t written = ::write(alarmPipe[1], &byte, 1);
  }
}

void Stopped() {
  {
    std::lock_guard lock(mutex);
    stopped = true;
  }
  changed.notify_all();
}

}  // namespace

InterruptGuard::InterruptGuard(std::function<std::string()> farewell,
                               std::optional<std::chrono::milliseconds> grace)
    : farewell_(std::move(farewell)), grace_(grace) {
  interrupts = 0;
  stopped = false;
  loop = &EventLoop::Current();
  if (grace_ && ::pipe(alarmPipe) == 0) watchdog_ = std::thread([this] { Watch(); });
  struct sigaction action {};
  action.sa_handler = OnInterrupt;
  sigemptyset(&action.sa_mask);
  sigaction(SIGINT, &action, &previous);
}

InterruptGuard::~InterruptGuard() {
  sigaction(SIGINT, &previous, nullptr);
  loop = nullptr;
  Stopped();
  if (watchdog_.joinable()) {
    char byte = 0;
    [[maybe_unused]] ssize_t written = ::write(alarmPipe[1], &byte, 1);
    watchdog_.join();
  }
  for (int& end : alarmPipe) {
    if (end >= 0) ::close(end);
    end = -1;
  }
}

bool InterruptGuard::Requested() { return interrupts.load() > 0; }

void InterruptGuard::Watch() {
  char byte = 0;
  ssize_t got = 0;
  do {
    got = ::read(alarmPipe[0], &byte, 1);
  } while (got < 0 && errno == EINTR);
  if (got != 1 || byte != 1) return;  // the guard goes away
  std::unique_lock lock(mutex);
  if (changed.wait_for(lock, *grace_, [] { return stopped; })) return;
  // From the start of the line: a progress line may be drawn there.
  std::string message =
      (::isatty(STDERR_FILENO) ? "\r\x1b[K" : "") + ("trllocator: " + farewell_()) + "\n";
  std::fwrite(message.data(), 1, message.size(), stderr);
  EndNow(kExitInterrupted);
}

}  // namespace trl::cli
