#pragma once

#include <stdexcept>
#include <string>

namespace trl::cli {

// Exit codes of every command.
inline constexpr int kExitOk = 0;
inline constexpr int kExitFailed = 1;    // the run did not complete, or its output was not written
inline constexpr int kExitBadInput = 2;  // a bad command line, or an input document unusable
inline constexpr int kExitFailuresReported = 3;  // the run completed, but failures were reported
inline constexpr int kExitInterrupted = 130;     // stopped by Ctrl-C, as shells report it

// A problem the user must fix before a command can run; the message says which and where.
class CommandError : public std::runtime_error {
 public:
  CommandError(const std::string& message, int exitCode = kExitBadInput)
      : std::runtime_error(message), exitCode_(exitCode) {}
  int ExitCode() const { return exitCode_; }

 private:
  int exitCode_;
};

}  // namespace trl::cli
