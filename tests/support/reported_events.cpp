#include "support/reported_events.h"

#include <gtest/gtest.h>

#include "frame/error_handler.h"
#include "trl/xml.h"

namespace trl::testing {

std::vector<ReportedEvent> TakeReportedEvents() {
  std::vector<ReportedEvent> events;
  Reporter* reporter = SharedReporter();
  if (reporter == nullptr) return events;
  xml::Document document;
  EXPECT_TRUE(document.LoadXml(reporter->EventsXML()));
  for (xml::Node e : document.AsNode().SelectNodes("//event")) {
    events.push_back(
        {std::stoi(e.GetAttribute("number").value_or("0")),
         std::stoi(e.GetAttribute("kind").value_or("0")), e.GetAttribute("class").value_or(""),
         e.GetAttribute("procedure").value_or(""), e.GetAttribute("description").value_or(""),
         e.GetAttribute("source").value_or("")});
  }
  reporter->ClearEvents();
  return events;
}

}  // namespace trl::testing
