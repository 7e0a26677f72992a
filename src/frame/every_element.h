#pragma once

#include <string_view>
#include <vector>

#include "platform/failure.h"
#include "trl/xml.h"

namespace trl {

// Every `tag` element of the document, as a selection of "//tag" from its root gives them; a
// document without a root fails (91), as that selection would.
inline std::vector<xml::Node> EveryElement(xml::Document& document, std::string_view tag) {
  if (!document.DocumentElement()) Fail(kObjectNotSet);
  return document.AsNode().GetElementsByTagName(tag);
}

}  // namespace trl
