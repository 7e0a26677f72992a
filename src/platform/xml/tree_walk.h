#pragma once

#include <pugixml.hpp>

namespace trl::xml {

// The node after `node` in document order within the subtree of `root`, or null past its end.
inline pugi::xml_node NextInSubtree(pugi::xml_node node, pugi::xml_node root) {
  if (node.first_child()) return node.first_child();
  while (node != root && !node.next_sibling()) node = node.parent();
  return node == root ? pugi::xml_node() : node.next_sibling();
}

}  // namespace trl::xml
