#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

namespace trl {

// The reporter that receives every failure, warning and run-log entry of the component: it keeps
// them as "event" elements under an "events" root, answers each report with an action code and,
// when given a log file, appends one line per entry to it.
class Reporter {
 public:
  enum Kind : int32_t { kFailure = 1, kWarning = 2, kLog = 4 };

  Reporter();
  ~Reporter();
  Reporter(const Reporter&) = delete;
  Reporter& operator=(const Reporter&) = delete;

  // Records the event and answers DefaultAction(). With LogFileName set, kinds 1, 2 and 4 append
  // one tab-separated line (time, kind, class.procedure, number, description) to the log; a log
  // that cannot be written fails with kPermissionDenied (70) or kPathNotFound (76) after the event
  // was recorded.
  int32_t Report(int32_t number, std::string_view description, int32_t kind,
                 std::string_view component, std::string_view className, std::string_view procedure,
                 bool flag1, bool flag2, std::string_view source, int32_t lastValue);

  // The recorded events: "<events><event number=... description=... kind=... component=...
  // class=... procedure=... source=... time=.../>...</events>".
  std::string EventsXML() const;

  bool ClearEvents();  // first reset: empties the event list
  bool ResetCounts();  // second reset: the per-kind counts start again from 0

  // How many reports of a kind arrived since the last ResetCounts.
  int32_t Count(int32_t kind) const;

  // First setting: the action code Report answers (5, ignore, by default).
  int32_t DefaultAction() const;
  void DefaultAction(int32_t code);
  // Second setting: the most events the list keeps, oldest dropped first; 0 keeps all.
  int32_t MaxEvents() const;
  void MaxEvents(int32_t count);
  // Third setting: also write each report as one line to the echo stream (standard error unless
  // SetEchoStream names another).
  bool Echo() const;
  void Echo(bool on);
  void SetEchoStream(std::FILE* stream);
  // Fourth setting: 0 appends to an existing log file, 1 replaces it at the first entry written
  // after LogFileName was set.
  int32_t LogMode() const;
  void LogMode(int32_t mode);

  const std::string& LogFileName() const;
  void LogFileName(std::string path);

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace trl
