#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "trl/xml.h"

namespace trl::testing {

// One event of the thread's shared reporter, as the tests compare them.
struct ReportedEvent {
  int32_t number;
  int32_t kind;
  std::string className;
  std::string procedure;
  std::string description;
  std::string source;

  bool operator==(const ReportedEvent&) const = default;
};

// The events `xpath` selects, by default those a run appended to its results.
std::vector<ReportedEvent> EventsIn(xml::Document& document,
                                    std::string_view xpath = "/*/events/event");

// The events the thread's shared reporter holds (none when it does not exist), then clears them.
std::vector<ReportedEvent> TakeReportedEvents();

}  // namespace trl::testing
