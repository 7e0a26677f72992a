#pragma once

namespace trl::cli {

// Turns Ctrl-C into a request to stop while it lives: the first one is only noted (and wakes the
// event loop), so that the run can be cancelled and still write what it has; a second one ends
// the process at once with kExitInterrupted.
class InterruptGuard {
 public:
  InterruptGuard();
  ~InterruptGuard();
  InterruptGuard(const InterruptGuard&) = delete;
  InterruptGuard& operator=(const InterruptGuard&) = delete;

  // Whether Ctrl-C was pressed since the guard was made.
  static bool Requested();
};

}  // namespace trl::cli
