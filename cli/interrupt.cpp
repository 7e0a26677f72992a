#include "interrupt.h"

#include <unistd.h>

#include <atomic>
#include <csignal>

#include "command_error.h"
#include "platform/event_loop.h"

namespace trl::cli {
namespace {

std::atomic<int> interrupts{0};
std::atomic<EventLoop*> loop{nullptr};
struct sigaction previous {};

void OnInterrupt(int) {
  if (interrupts.fetch_add(1) > 0) ::_exit(kExitInterrupted);
  if (EventLoop* current = loop.load()) current->Wake();
}

}  // namespace

InterruptGuard::InterruptGuard() {
  interrupts = 0;
  loop = &EventLoop::Current();
  struct sigaction action {};
  action.sa_handler = OnInterrupt;
  sigemptyset(&action.sa_mask);
  sigaction(SIGINT, &action, &previous);
}

InterruptGuard::~InterruptGuard() {
  sigaction(SIGINT, &previous, nullptr);
  loop = nullptr;
}

bool InterruptGuard::Requested() { return interrupts.load() > 0; }

}  // namespace trl::cli
