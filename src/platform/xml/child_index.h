#pragma once

#include <pugixml.hpp>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/xml/key_table.h"

namespace trl::xml {

// Finds the first `tag` child of a parent whose attribute `attr` holds a given value, through an
// index per (parent, tag, attr) built on first use. The document layer calls the hooks below around
// every change it makes, so an index stays exact; where an update would need a scan, the index is
// dropped instead and rebuilt by the next Find.
class ChildIndex {
 public:
  pugi::xml_node Find(pugi::xml_node parent, std::string_view tag, std::string_view attr,
                      std::string_view value);

  // After `child` was put under `parent` (appended, inserted before a sibling or moved there).
  void ChildArrived(pugi::xml_node parent, pugi::xml_node child);
  // When `child` leaves `parent`: after it moved away, or before it is destroyed.
  void ChildLeaving(pugi::xml_node parent, pugi::xml_node child);
  // Before the attribute `attr` of `child` is rewritten or removed, and after it was written.
  void KeyChanging(pugi::xml_node child, std::string_view attr);
  void KeyChanged(pugi::xml_node child, std::string_view attr);
  // Before `root` and everything below it is freed: the memory of a freed node may come back as a
  // new node, which must not inherit an index.
  void SubtreeDestroying(pugi::xml_node root);
  // Before every child of `parent` is freed.
  void ChildrenDestroying(pugi::xml_node parent);
  void Clear();

 private:
  struct KeyIndex {
    std::string tag;
    // Key -> the first child holding it. The keys are the children's attribute values in place;
    // every rewrite of such a value goes through KeyChanging first, which removes the key.
    KeyTable first;
    // Set once a child arrived behind another with the same key: erasing a key may then uncover
    // a later holder that only a scan finds.
    bool hasDuplicates = false;
  };

  static KeyIndex Build(pugi::xml_node parent, std::string_view tag, std::string_view attr);
  static bool Insert(KeyIndex& index, pugi::xml_node child);
  static bool Erase(KeyIndex& index, pugi::xml_node child);
  // Applies `change` to every index of `parent`, dropping those for which it returns false.
  template <typename Change>
  void Update(pugi::xml_node parent, Change change);

  // The indexes of `parent`, or none. Appends and attribute writes come in runs under one parent:
  // the last answer is kept, as a map lookup for each was a good part of building a large
  // document.
  std::vector<KeyIndex>* IndexesOf(pugi::xml_node_struct* parent);
  void ForgetLastParent() { lastParent_ = nullptr; }

  std::unordered_map<pugi::xml_node_struct*, std::vector<KeyIndex>> byParent_;
  pugi::xml_node_struct* lastParent_ = nullptr;
  std::vector<KeyIndex>* lastIndexes_ = nullptr;  // byParent_'s entry for it, or none
};

}  // namespace trl::xml
