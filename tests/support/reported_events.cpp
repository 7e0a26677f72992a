#include "support/reported_events.h"

#include <gtest/gtest.h>

#include "frame/error_handler.h"

namespace trl::testing {

std::vector<ReportedEvent> EventsIn(xml::Document& document, std::string_view xpath) {
  std::vector<ReportedEvent> events;
  for (const xml::Node& e : document.AsNode().SelectNodes(xpath)) {
    auto text = [&](const char* name) { return e.GetAttribute(name).value_or(""); };
    events.push_back({std::stoi(e.GetAttribute("number").value_or("0")),
                      std::stoi(e.GetAttribute("kind").value_or("0")), text("class"),
                      text("procedure"), text("description"), text("source")});
  }
  return events;
}

std::vector<ReportedEvent> TakeReportedEvents() {
  Reporter* reporter = SharedReporter();
  if (reporter == nullptr) return {};
  xml::Document document;
  EXPECT_TRUE(document.LoadXml(reporter->EventsXML()));
  reporter->ClearEvents();
  return EventsIn(document, "//event");
}

}  // namespace trl::testing
