#pragma once

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl::cli {

// The v_id an application or version has when the filter could not decide its version.
inline constexpr std::string_view kUnidentifiedVersion = "-1";

// An attribute as what a person or a script is shown reads it: "" when absent.
inline std::string AttributeText(const xml::Node& node, std::string_view name) {
  return node.GetAttribute(name).value_or("");
}

// A numeric attribute (a score, a count, an id): 0 when absent or not a number.
inline int64_t AttributeNumber(const xml::Node& node, std::string_view name) {
  return std::strtoll(AttributeText(node, name).c_str(), nullptr, 10);
}

}  // namespace trl::cli
