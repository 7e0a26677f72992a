#include "frame/error_handler.h"

#include <memory>
#include <string>

namespace trl {
namespace {

thread_local std::unique_ptr<Reporter> sharedReporter;
thread_local std::function<void(const ReportedEventView&)> reportObserver;
thread_local const ReportSubject* currentSubject = nullptr;

}  // namespace

Reporter* SharedReporter() { return sharedReporter.get(); }

void ReleaseSharedReporter() { sharedReporter.reset(); }

void ObserveReports(std::function<void(const ReportedEventView&)> observer) {
  reportObserver = std::move(observer);
}

ReportSubject::ReportSubject(std::string_view path) : path_(path), outer_(currentSubject) {
  currentSubject = this;
}

ReportSubject::~ReportSubject() { currentSubject = outer_; }

void ShowObserver(const ReportedEventView& event) {
  if (reportObserver) reportObserver(event);
}

int32_t HandleEvent(int32_t number, std::string_view description, int32_t kind,
                    std::string_view component, std::string_view className,
                    std::string_view procedure, bool flag1, bool flag2, std::string_view source,
                    int32_t lastValue, bool forceIgnore) {
  if (!sharedReporter) {
    auto reporter = std::make_unique<Reporter>();
    reporter->MaxEvents(0);
    sharedReporter = std::move(reporter);
  }
  int32_t action = sharedReporter->Report(number, description, kind, component, className,
                                          procedure, flag1, flag2, source, lastValue);
  if (reportObserver) {
    std::string_view subject = currentSubject != nullptr ? currentSubject->path_ : "";
    reportObserver({number, description, kind, className, procedure, subject});
  }
  return forceIgnore ? kActionIgnore : action;
}

void ReportWarning(int32_t number, std::string_view description, std::string_view className,
                   std::string_view procedure) {
  HandleEvent(number, description, Reporter::kWarning, kComponentName, className, procedure, true,
              true, "", 0, false);
}

void Raise(int32_t number, std::string description, std::string_view className,
           std::string_view procedure) {
  std::string source(kComponentName);
  source.append(".").append(className).append(".").append(procedure);
  throw Failure(number, std::move(description), std::move(source));
}

void OnError::Report(int32_t number, std::string_view description, std::string_view source) const {
  // Every call site forces "ignore": the failure is reported and the operation goes on.
  HandleEvent(number, description, Reporter::kFailure, kComponentName, className_, label_, false,
              false, source, 0, true);
}

}  // namespace trl
