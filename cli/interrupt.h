#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <thread>

namespace trl::cli {

// Turns Ctrl-C into a request to stop while it lives: the first one is only noted (and wakes the
// event loop), so that the run can be cancelled and still write what it has. Given a grace
// period, a run that has not stopped within it (it may be inside a long step that checks for
// cancel only after it) is not waited for: the process ends with kExitInterrupted, saving nothing,
// after printing `farewell()`. A second Ctrl-C ends the process at once.
class InterruptGuard {
 public:
  // `farewell` is called on another thread: it may only read what is safe to read from there.
  explicit InterruptGuard(std::function<std::string()> farewell = {},
                          std::optional<std::chrono::milliseconds> grace = std::nullopt);
  ~InterruptGuard();
  InterruptGuard(const InterruptGuard&) = delete;
  InterruptGuard& operator=(const InterruptGuard&) = delete;

  // Whether Ctrl-C was pressed since the guard was made.
  static bool Requested();

 private:
  void Watch();

  std::function<std::string()> farewell_;
  std::optional<std::chrono::milliseconds> grace_;
  std::thread watchdog_;
};

}  // namespace trl::cli
