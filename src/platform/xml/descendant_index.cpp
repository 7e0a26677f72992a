#include "platform/xml/descendant_index.h"

#include <algorithm>

#include "platform/text.h"

namespace trl::xml {

std::optional<std::span<const uint32_t>> DescendantIndex::Below(pugi::xml_node node,
                                                                std::string_view tag) {
  if (!built_) return std::nullopt;
  uint32_t first = 0;
  auto last = static_cast<uint32_t>(elements_.size());
  if (node != document_) {
    auto address = reinterpret_cast<uintptr_t>(node.internal_object());
    auto found = std::lower_bound(positions_.begin(), positions_.end(),
                                  std::pair<uintptr_t, uint32_t>(address, 0));
    if (found == positions_.end() || found->first != address) return std::nullopt;
    first = found->second + 1;
    last = ends_[found->second];
  }
  const std::vector<uint32_t>& tagged = Tagged(tag);
  auto from = std::lower_bound(tagged.begin(), tagged.end(), first);
  auto to = std::lower_bound(from, tagged.end(), last);
  return std::span<const uint32_t>(from, to);
}

void DescendantIndex::Walked(pugi::xml_node node, size_t visited, pugi::xml_node document,
                             pugi::xml_node holder) {
  if (node == document || (node.parent() == document && node.type() == pugi::node_element)) {
    treeSize_ = visited;
    walked_ = 0;
    return;
  }
  if (built_) return;  // a walk the index cannot answer: one of a detached subtree
  walked_ += visited;
  if (walked_ > kWalks * std::max(treeSize_, kSmallestTree)) Build(document, holder);
}

void DescendantIndex::Drop() {
  built_ = false;
  // Given back: a tree that keeps changing would otherwise hold an index it cannot use.
  elements_ = {};
  ends_ = {};
  positions_ = {};
  tagged_ = {};
}

void DescendantIndex::Reset(size_t elements) {
  Drop();
  treeSize_ = elements;
  walked_ = 0;
}

void DescendantIndex::Build(pugi::xml_node document, pugi::xml_node holder) {
  std::vector<uint32_t> open;  // the elements entered and not yet left
  for (pugi::xml_node at = document.first_child(); at && at != holder;) {
    bool element = at.type() == pugi::node_element;
    if (element) {
      open.push_back(static_cast<uint32_t>(elements_.size()));
      elements_.push_back(at.internal_object());
      ends_.push_back(0);
      if (at.first_child()) {
        at = at.first_child();
        continue;
      }
    }
    // `at` ends here, and so does every ancestor whose last child it is.
    for (;;) {
      if (at.type() == pugi::node_element) {
        ends_[open.back()] = static_cast<uint32_t>(elements_.size());
        open.pop_back();
      }
      if (at.next_sibling()) {
        at = at.next_sibling();
        break;
      }
      at = at.parent();
      if (at == document) {
        at = pugi::xml_node();
        break;
      }
    }
  }
  positions_.reserve(elements_.size());
  for (uint32_t k = 0; k < elements_.size(); ++k) {
    positions_.emplace_back(reinterpret_cast<uintptr_t>(elements_[k]), k);
  }
  std::sort(positions_.begin(), positions_.end());
  document_ = document;
  treeSize_ = elements_.size();
  walked_ = 0;
  built_ = true;
}

const std::vector<uint32_t>& DescendantIndex::Tagged(std::string_view tag) {
  auto found = tagged_.find(std::string(tag));
  if (found != tagged_.end()) return found->second;
  std::vector<uint32_t> positions;
  for (uint32_t k = 0; k < elements_.size(); ++k) {
    if (tag == "*" || TerminatedEquals(At(k).name(), tag)) positions.push_back(k);
  }
  return tagged_.emplace(std::string(tag), std::move(positions)).first->second;
}

}  // namespace trl::xml
