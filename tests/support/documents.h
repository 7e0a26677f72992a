#pragma once

#include <gtest/gtest.h>

#include <cctype>
#include <iterator>
#include <memory>
#include <sstream>
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
  std::istringstream in{std::string(text)};
  return {std::istream_iterator<std::string>(in), {}};
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

inline std::string Lower(std::string text) {
  for (char& c : text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return text;
}

}  // namespace trl::testing
