#pragma once

#include <array>
#include <cstdint>
#include <pugixml.hpp>
#include <string>
#include <string_view>
#include <unordered_map>

#include "platform/xml/child_index.h"
#include "platform/xml/descendant_index.h"
#include "trl/xml.h"

namespace trl::xml {

// The pugixml node behind a handle.
inline pugi::xml_node ToPugi(const Node& node) {
  return pugi::xml_node(static_cast<pugi::xml_node_struct*>(const_cast<void*>(node.Id())));
}

// Fails with kObjectNotSet (91) for a handle to no node; returns the node otherwise.
pugi::xml_node Require(const Node& node);
// Fails with kInvalidArgument (5) unless `name` can name an element or attribute.
void CheckName(std::string_view name);
// Fails with kInvalidArgument (5) unless `text` is UTF-8 that an XML 1.0 document can carry.
void CheckText(std::string_view text);
// pugixml reports a failed allocation as an empty result; this turns it into a failure.
void FailOutOfMemory();

// The state behind a Document and the tree edits shared by Document and Node.
//
// Nodes that are created but not yet placed (CreateElement, CloneNode) must keep their identity
// when they are placed, and pugixml moves a node without copying only within one pugi document.
// So they live under a hidden holder element, the last child of the document node, made on first
// use and kept: pugixml reuses freed memory only once a whole page is free, so a holder made and
// dropped for every new element would leave dead memory behind. Everything that lists, selects or
// writes nodes leaves the holder out.
struct Document::Impl {
  explicit Impl(Document& owner);

  Node Wrap(pugi::xml_node node) { return node ? Node(node.internal_object(), &owner) : Node(); }

  // Empties the document, dropping every index and detached node.
  void Reset(ParseError error);
  bool Load(std::string_view text, const Limits& limits);

  // The holder, created when missing.
  pugi::xml_node Holder();
  // Whether some node is detached (or the name pool exists), so that selections have to be
  // filtered by fragment.
  bool HasDetached() const { return holder && holder.first_child(); }

  // A new element named `tag` under the holder, and a new attribute `name` of `element`, whose
  // names are shared with the name pool instead of copied: millions of elements of a few kinds
  // then carry no copy of their names.
  pugi::xml_node NewElement(std::string_view tag);
  pugi::xml_attribute NewAttribute(pugi::xml_node element, std::string_view name);
  // The top of the fragment `node` belongs to: the document node for a node of the tree, the
  // topmost detached ancestor otherwise (the holder itself for the holder).
  pugi::xml_node FragmentOf(pugi::xml_node node) const;

  // Puts `child` (of this or another document) under `parent`, before `before` (at the end when
  // it is empty), destroying `replacing` if given; returns the node now in place. Validates first,
  // so a failure changes nothing.
  pugi::xml_node Place(pugi::xml_node parent, const Node& child, pugi::xml_node before,
                       pugi::xml_node replacing);
  // A new `tag` element with `attributes`, appended to the element `parent` (see
  // Node::AppendElement).
  pugi::xml_node AppendElement(
      pugi::xml_node parent, std::string_view tag,
      std::initializer_list<std::pair<std::string_view, std::string_view>> attributes);
  // Removes `node` from its parent and frees it with everything below.
  void Destroy(pugi::xml_node node);
  void Changed() { ++modifications; }
  // An element of the tree came or went (or may have).
  void TreeChanged() {
    descendants.Drop();
    Changed();
  }

  Document& owner;
  pugi::xml_document doc;
  pugi::xml_node holder;
  ParseError parseError;
  uint64_t modifications = 0;
  uint64_t serial;
  ChildIndex index;
  DescendantIndex descendants;

 private:
  // The name pool: the holder's first child, unnamed, so no selection can name it. It holds one
  // parsed element per tag and per attribute name; parsed names stay in pugixml's parse buffer,
  // and copies of a parsed node point to that buffer instead of copying the text.
  pugi::xml_node NamePool();
  pugi::xml_node Prototype(std::string_view name, bool attribute);
  pugi::xml_node FindOrAddPrototype(std::string_view name, bool attribute);
  pugi::xml_node pool;
  // Looked up by string_view, without making a string.
  struct NameHash {
    using is_transparent = void;
    size_t operator()(std::string_view name) const { return std::hash<std::string_view>{}(name); }
  };
  using Prototypes = std::unordered_map<std::string, pugi::xml_node, NameHash, std::equal_to<>>;
  Prototypes tagPrototypes;
  Prototypes attributePrototypes;
  // The names last used, by length and last letter: a new element of a kind made a million times
  // then finds its few names without hashing them.
  struct RecentPrototype {
    std::string name;
    bool attribute = false;
    pugi::xml_node prototype;
  };
  std::array<RecentPrototype, 16> recentPrototypes;

  void CheckPlacement(pugi::xml_node parent, pugi::xml_node child, pugi::xml_node replacing) const;
};

}  // namespace trl::xml
