#pragma once

#include <string_view>
#include <unordered_set>
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

// How many EveryElement would list.
inline size_t CountEveryElement(xml::Document& document, std::string_view tag) {
  if (!document.DocumentElement()) Fail(kObjectNotSet);
  return document.AsNode().CountElementsByTagName(tag);
}

// Hands each of `elements` (every `tag` element, as EveryElement lists them) to `visit`, which
// answers whether to go on, for walks that change the document as they go: one that a visit
// destroyed, with the version it stood in or the application moved away, is passed over, where
// the list alone would hand on a handle to a node that is gone. A visit changes nothing outside
// the element it is given, so only the elements below that one can go.
template <class Visit>
void VisitRemaining(const std::vector<xml::Node>& elements, std::string_view tag, Visit visit) {
  std::unordered_set<const void*> gone;
  for (const xml::Node& element : elements) {
    if (gone.contains(element.Id())) continue;
    std::vector<xml::Node> below = element.GetElementsByTagName(tag);
    bool goOn = visit(element);
    if (!below.empty()) {
      std::unordered_set<const void*> left;
      for (const xml::Node& node : element.GetElementsByTagName(tag)) left.insert(node.Id());
      for (const xml::Node& node : below) {
        if (!left.contains(node.Id())) gone.insert(node.Id());
      }
    }
    if (!goOn) return;
  }
}

}  // namespace trl
