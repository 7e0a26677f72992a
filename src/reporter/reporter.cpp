#include "reporter/reporter.h"

#include <fmt/format.h>

#include <algorithm>
#include <deque>
#include <map>
#include <utility>

#include "platform/clock.h"
#include "platform/failure.h"
#include "reporter/event.h"
#include "reporter/event_xml.h"
#include "reporter/log_file.h"

namespace trl {
namespace {

constexpr int32_t kIgnore = 5;

// A log line holds one entry per line and one field per tab, so neither may appear inside a field.
std::string OneLine(std::string_view text) {
  std::string out(text);
  std::replace_if(
      out.begin(), out.end(), [](char c) { return c == '\t' || c == '\n' || c == '\r'; }, ' ');
  return out;
}

std::string LogLine(const Event& event) {
  return fmt::format("{}\t{}\t{}.{}\t{}\t{}\n", event.time, event.kind, OneLine(event.className),
                     OneLine(event.procedure), event.number, OneLine(event.description));
}

bool IsLogged(int32_t kind) {
  return kind == Reporter::kFailure || kind == Reporter::kWarning || kind == Reporter::kLog;
}

}  // namespace

struct Reporter::Impl {
  std::deque<Event> events;
  std::map<int32_t, int32_t> counts;
  int32_t defaultAction = kIgnore;
  int32_t maxEvents = 0;
  bool echo = false;
  std::FILE* echoStream = stderr;
  int32_t logMode = 0;
  std::string logFileName;
  // Set when the name is set; LogMode 1 empties the file only at the first entry after that.
  bool replacePending = false;
  LogFile log;

  void Trim() {
    if (maxEvents == 0) return;
    while (events.size() > static_cast<size_t>(maxEvents)) events.pop_front();
  }

  void WriteLog(const std::string& line) {
    if (!log.IsOpen()) {
      log.Open(logFileName, logMode == 1 && replacePending);
      replacePending = false;
    }
    log.Append(line);
  }
};

Reporter::Reporter() : impl_(std::make_unique<Impl>()) {}

Reporter::~Reporter() = default;

int32_t Reporter::Report(int32_t number, std::string_view description, int32_t kind,
                         std::string_view component, std::string_view className,
                         std::string_view procedure, bool /*flag1*/, bool /*flag2*/,
                         std::string_view source, int32_t /*lastValue*/) {
  Impl& impl = *impl_;
  Event event{number,
              std::string(description),
              kind,
              std::string(component),
              std::string(className),
              std::string(procedure),
              std::string(source),
              FormatDateTime(Now())};
  bool logged = IsLogged(kind) && !impl.logFileName.empty();
  std::string line = impl.echo || logged ? LogLine(event) : "";
  impl.events.push_back(std::move(event));
  impl.Trim();
  ++impl.counts[kind];
  if (impl.echo) {
    std::fwrite(line.data(), 1, line.size(), impl.echoStream);
    std::fflush(impl.echoStream);
  }
  if (logged) impl.WriteLog(line);
  return impl.defaultAction;
}

std::string Reporter::EventsXML() const { return EventsToXml(impl_->events); }

bool Reporter::ClearEvents() {
  impl_->events.clear();
  return true;
}

bool Reporter::ResetCounts() {
  impl_->counts.clear();
  return true;
}

int32_t Reporter::Count(int32_t kind) const {
  auto found = impl_->counts.find(kind);
  return found == impl_->counts.end() ? 0 : found->second;
}

int32_t Reporter::DefaultAction() const { return impl_->defaultAction; }

void Reporter::DefaultAction(int32_t code) { impl_->defaultAction = code; }

int32_t Reporter::MaxEvents() const { return impl_->maxEvents; }

void Reporter::MaxEvents(int32_t count) {
  if (count < 0) Fail(kInvalidArgument);
  impl_->maxEvents = count;
  impl_->Trim();
}

bool Reporter::Echo() const { return impl_->echo; }

void Reporter::Echo(bool on) { impl_->echo = on; }

void Reporter::SetEchoStream(std::FILE* stream) {
  impl_->echoStream = stream == nullptr ? stderr : stream;
}

int32_t Reporter::LogMode() const { return impl_->logMode; }

void Reporter::LogMode(int32_t mode) {
  if (mode != 0 && mode != 1) Fail(kInvalidArgument);
  impl_->logMode = mode;
}

const std::string& Reporter::LogFileName() const { return impl_->logFileName; }

void Reporter::LogFileName(std::string path) {
  impl_->log.Close();
  impl_->logFileName = std::move(path);
  impl_->replacePending = true;
}

}  // namespace trl
