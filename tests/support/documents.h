#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "support/reported_events.h"
#include "trl/xml.h"

// Helpers for tests that build documents from text and read results back.
namespace trl::testing {

inline xml::DocumentPtr Parse(std::string_view text) {
  auto document = std::make_shared<xml::Document>();
  EXPECT_TRUE(document->LoadXml(text)) << document->LastParseError().reason << " in " << text;
  return document;
}

// The words of `text`, for short tables.
inline std::vector<std::string> Words(std::string_view text) {
  std::vector<std::string> words;
  for (size_t start = 0, end = 0; start < text.size(); start = end + 1) {
    end = std::min(text.find(' ', start), text.size());
    if (end > start) words.emplace_back(text.substr(start, end - start));
  }
  return words;
}

// The values of `attribute` on what `xpath` selects, in document order.
inline std::vector<std::string> ValuesOf(xml::Document& document, std::string_view xpath,
                                         std::string_view attribute) {
  std::vector<std::string> values;
  for (const xml::Node& node : document.AsNode().SelectNodes(xpath)) {
    values.push_back(node.GetAttribute(attribute).value_or("<absent>"));
  }
  return values;
}

// The events a run appended to its results.
inline std::vector<ReportedEvent> EventsIn(xml::Document& document) {
  std::vector<ReportedEvent> events;
  for (const xml::Node& e : document.AsNode().SelectNodes("/*/events/event")) {
    events.push_back(
        {std::stoi(e.GetAttribute("number").value_or("0")),
         std::stoi(e.GetAttribute("kind").value_or("0")), e.GetAttribute("class").value_or(""),
         e.GetAttribute("procedure").value_or(""), e.GetAttribute("description").value_or(""),
         e.GetAttribute("source").value_or("")});
  }
  return events;
}

inline std::string Lower(std::string text) {
  for (char& c : text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return text;
}

}  // namespace trl::testing
