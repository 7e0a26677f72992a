#pragma once

#include <cstdint>
#include <exception>
#include <functional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/failure.h"
#include "platform/fs/long_read.h"
#include "reporter/reporter.h"

namespace trl {

// The component's own error numbers: the object-error base plus an offset.
inline constexpr int32_t kErrUnableToLoadResults = kObjectErrorBase + 513;
inline constexpr int32_t kErrUnableToCreate = kObjectErrorBase + 20200;
inline constexpr int32_t kErrPathNotFound = kObjectErrorBase + 20201;
inline constexpr int32_t kErrNotSupported = kObjectErrorBase + 20202;
inline constexpr int32_t kErrUnknownPropertyType = kObjectErrorBase + 20203;

// Action codes a reporter answers with.
inline constexpr int32_t kActionAbort = 3;
inline constexpr int32_t kActionRetry = 4;
inline constexpr int32_t kActionIgnore = 5;

// The central report of failures and warnings: hands the event to this thread's shared reporter,
// creating it on first use, and answers its action code (ignore when `forceIgnore`). A failure of
// the reporter itself passes out to the caller.
int32_t HandleEvent(int32_t number, std::string_view description, int32_t kind,
                    std::string_view component, std::string_view className,
                    std::string_view procedure, bool flag1, bool flag2, std::string_view source,
                    int32_t lastValue, bool forceIgnore);

// This thread's shared reporter, or nullptr before the first report (never creates it).
Reporter* SharedReporter();
// Releases this thread's shared reporter; the next report creates a new one.
void ReleaseSharedReporter();

// What a host sees of each event this thread reports, as it is reported (the command line prints
// warnings as they come). One observer per thread; an empty function removes it.
struct ReportedEventView {
  int32_t number;
  std::string_view description;
  int32_t kind;
  std::string_view className;
  std::string_view procedure;
  std::string_view subject;  // the path the operation was working on, or "" (see ReportSubject)
};
void ObserveReports(std::function<void(const ReportedEventView&)> observer);
// Shows the observer an event reported to a reporter of its own (Locate's run log).
void ShowObserver(const ReportedEventView& event);

// Names the folder or file (in the "\\" form) this thread is working on while it lives, so that a
// host can say which one a failure reported meanwhile is about. The text must outlive it; subjects
// nest.
class ReportSubject {
 public:
  explicit ReportSubject(std::string_view path);
  ~ReportSubject();
  ReportSubject(const ReportSubject&) = delete;
  ReportSubject& operator=(const ReportSubject&) = delete;

 private:
  std::string_view path_;
  const ReportSubject* outer_;
  friend int32_t HandleEvent(int32_t, std::string_view, int32_t, std::string_view, std::string_view,
                             std::string_view, bool, bool, std::string_view, int32_t, bool);
};

// Reports a warning (kind 2) of `className`.`procedure` through HandleEvent and goes on.
void ReportWarning(int32_t number, std::string_view description, std::string_view className,
                   std::string_view procedure);

// A failure the component raises itself, with the source "trlLocator.<class>.<procedure>".
[[noreturn]] void Raise(int32_t number, std::string description, std::string_view className,
                        std::string_view procedure);

// The handler of one operation: runs each fallible step, reports a failing one as a failure (kind
// 1) of the operation's class and label, and lets the operation go on with its next step. A step
// that fails leaves whatever it was to produce as it was.
class OnError {
 public:
  OnError(std::string_view className, std::string_view label)
      : className_(className), label_(label) {}

  // Runs `step`; returns false when it failed (and was reported).
  template <class Step>
  bool operator()(Step&& step) const {
    try {
      std::forward<Step>(step)();
      return true;
    } catch (const Failure& failure) {
      Report(failure.number, failure.description, failure.source);
    } catch (const fs::ReadAbandoned&) {
      // The run was cancelled during the read: nothing went wrong.
    } catch (const std::exception& error) {
      Report(kInvalidArgument, error.what(), kComponentName);
    }
    return false;
  }

  std::string_view ClassName() const { return className_; }
  std::string_view Label() const { return label_; }

 private:
  void Report(int32_t number, std::string_view description, std::string_view source) const;

  std::string_view className_;
  std::string_view label_;
};

}  // namespace trl
