#pragma once

#include <chrono>
#include <cstdio>
#include <string>

namespace trl::cli {

// One status line on a terminal that follows a locate run: the stage, folders and files walked,
// applications matched, the folder being searched and the time so far. It redraws at most ten
// times a second and is cleared before anything else is printed and at the end.
class LiveProgress {
 public:
  // Draws only when `stream` is a terminal.
  explicit LiveProgress(std::FILE* stream = stderr);
  ~LiveProgress();
  LiveProgress(const LiveProgress&) = delete;
  LiveProgress& operator=(const LiveProgress&) = delete;

  bool Active() const { return active_; }
  // Takes in a progress element's text (a stage's "e"), and redraws when it is time.
  void Update(const std::string& updateXml);
  // Shows another command's own stage and what it is at, in place of a locate run's counts.
  void Show(std::string stage, std::string detail);
  // Redraws when it is time (for the clock).
  void Tick();
  // Removes the line, so that other output starts on a clean line; the next update draws again.
  void Clear();

 private:
  void Draw(bool force);

  std::FILE* stream_;
  bool active_;
  bool drawn_ = false;
  std::chrono::steady_clock::time_point start_, lastDraw_;
  int mode_ = 0;
  std::string folders_ = "0", files_ = "0", matched_ = "0", path_;
  std::string stage_, detail_;
};

}  // namespace trl::cli
