#include "live_progress.h"

#include <fmt/format.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <utility>

#include "frame/vocabulary.h"
#include "trl/xml.h"

namespace trl::cli {
namespace {

constexpr auto kRedrawEvery = std::chrono::milliseconds(100);

const char* StageName(int mode) {
  switch (mode) {
    case 1:
      return "searching";
    case 2:
      return "comparing";
    case 3:
      return "filtering";
    case 4:
      return "merging";
    case 5:
      return "done";
    default:
      return "starting";
  }
}

size_t TerminalWidth(std::FILE* stream) {
  winsize size{};
  if (::ioctl(::fileno(stream), TIOCGWINSZ, &size) == 0 && size.ws_col > 0) return size.ws_col;
  return 80;
}

// The end of a long path, which tells more than its beginning.
std::string Tail(const std::string& text, size_t room) {
  if (text.size() <= room) return text;
  if (room <= 3) return std::string(room, '.');
  return "..." + text.substr(text.size() - (room - 3));
}

}  // namespace

LiveProgress::LiveProgress(std::FILE* stream)
    : stream_(stream),
      active_(::isatty(::fileno(stream)) != 0),
      start_(std::chrono::steady_clock::now()) {}

LiveProgress::~LiveProgress() { Clear(); }

void LiveProgress::Update(const std::string& updateXml) {
  if (!active_) return;
  xml::Document update;
  if (!update.LoadXml(updateXml)) return;
  xml::Node e = update.DocumentElement();
  if (auto mode = e.GetAttribute(vocab::e_mode)) mode_ = std::atoi(mode->c_str());
  if (auto folders = e.GetAttribute(vocab::e_d_count)) folders_ = *folders;
  if (auto files = e.GetAttribute(vocab::e_f_count)) files_ = *files;
  if (auto matched = e.GetAttribute(vocab::e_match_count)) matched_ = *matched;
  if (auto path = e.GetAttribute(vocab::e_d_name)) {
    path_ = *path;
    std::replace(path_.begin(), path_.end(), '\\', '/');  // paths read as this system writes them
  }
  Draw(false);
}

void LiveProgress::Show(std::string stage, std::string detail) {
  if (!active_) return;
  stage_ = std::move(stage);
  detail_ = std::move(detail);
  Draw(false);
}

void LiveProgress::Tick() { Draw(false); }

void LiveProgress::Draw(bool force) {
  if (!active_) return;
  auto now = std::chrono::steady_clock::now();
  if (!force && drawn_ && now - lastDraw_ < kRedrawEvery) return;
  lastDraw_ = now;
  auto seconds = std::chrono::duration_cast<std::chrono::seconds>(now - start_).count();
  std::string line =
      stage_.empty()
          ? fmt::format("{} {}:{:02} | {} folders, {} files | {} matched", StageName(mode_),
                        seconds / 60, seconds % 60, folders_, files_, matched_)
          : fmt::format("{} {}:{:02} | {}", stage_, seconds / 60, seconds % 60, detail_);
  size_t width = TerminalWidth(stream_) - 1;
  if (stage_.empty() && mode_ == 1 && !path_.empty() && line.size() + 3 < width) {
    line += " | " + Tail(path_, width - line.size() - 3);
  }
  if (line.size() > width) line.resize(width);
  fmt::print(stream_, "\r\033[K{}", line);
  std::fflush(stream_);
  drawn_ = true;
}

void LiveProgress::Clear() {
  if (!active_ || !drawn_) return;
  fmt::print(stream_, "\r\033[K");
  std::fflush(stream_);
  drawn_ = false;
}

}  // namespace trl::cli
