#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <pugixml.hpp>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace trl::xml {

// Answers "the `tag` elements below this node" for the tree of a document from one walk of it,
// once walks of subtrees have cost far more than walks of the whole tree. A tree of nested
// elements, each asked for what lies below it, is walked once instead of once per level; trees
// of the usual shape never build it. It holds until an element of the tree comes or goes.
class DescendantIndex {
 public:
  // Positions of the `tag` elements below `node` ("*": every element), in document order; none
  // when the index is not built or cannot tell (`node` is not an element of the tree, nor the
  // document node).
  std::optional<std::span<const uint32_t>> Below(pugi::xml_node node, std::string_view tag);
  pugi::xml_node At(uint32_t position) const { return pugi::xml_node(elements_[position]); }

  // Notes a walk of the subtree of `node` that visited `visited` nodes. A walk of the whole tree
  // (from the document node or the document element) measures it and starts the count again;
  // once the other walks since have visited more nodes than kWalks such walks would, the index is
  // built over the tree of `document` (the holder of detached nodes left out).
  void Walked(pugi::xml_node node, size_t visited, pugi::xml_node document, pugi::xml_node holder);
  // An element of the tree came or went: the index goes, emptied.
  void Drop();
  // A new tree of `elements` elements (0: not known).
  void Reset(size_t elements);

 private:
  static constexpr size_t kWalks = 16;
  static constexpr size_t kSmallestTree = 4096;

  void Build(pugi::xml_node document, pugi::xml_node holder);
  const std::vector<uint32_t>& Tagged(std::string_view tag);

  size_t treeSize_ = 0;
  size_t walked_ = 0;
  bool built_ = false;
  pugi::xml_node document_;
  std::vector<pugi::xml_node_struct*> elements_;  // the tree's elements in document order
  std::vector<uint32_t> ends_;  // for each, the position after its last descendant
  std::vector<std::pair<uintptr_t, uint32_t>> positions_;          // by address
  std::unordered_map<std::string, std::vector<uint32_t>> tagged_;  // made on first ask
};

}  // namespace trl::xml
