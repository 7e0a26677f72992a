#include "platform/xml/child_index.h"

#include <algorithm>
#include <optional>

#include "platform/text.h"
#include "platform/xml/tree_walk.h"

namespace trl::xml {
namespace {

std::optional<std::string_view> KeyOf(pugi::xml_node child, std::string_view tag,
                                      const std::string& attr) {
  if (child.type() != pugi::node_element || !TerminatedEquals(child.name(), tag))
    return std::nullopt;
  pugi::xml_attribute key = child.attribute(attr.c_str());
  if (!key) return std::nullopt;
  return std::string_view(key.value());
}

}  // namespace

pugi::xml_node ChildIndex::Find(pugi::xml_node parent, std::string_view tag, std::string_view attr,
                                std::string_view value) {
  std::vector<KeyIndex>* known = IndexesOf(parent.internal_object());
  auto& indexes = known ? *known : byParent_[parent.internal_object()];
  lastIndexes_ = &indexes;
  auto it = std::find_if(indexes.begin(), indexes.end(), [&](const KeyIndex& index) {
    return index.tag == tag && index.first.Attr() == attr;
  });
  if (it == indexes.end()) it = indexes.insert(it, Build(parent, tag, attr));
  return pugi::xml_node(it->first.Find(value));
}

ChildIndex::KeyIndex ChildIndex::Build(pugi::xml_node parent, std::string_view tag,
                                       std::string_view attr) {
  KeyIndex index{std::string(tag), KeyTable(std::string(attr)), false};
  for (pugi::xml_node child : parent.children()) {
    auto key = KeyOf(child, index.tag, index.first.Attr());
    if (key && !index.first.Insert(*key, child.internal_object())) {
      index.hasDuplicates = true;
    }
  }
  return index;
}

bool ChildIndex::Insert(KeyIndex& index, pugi::xml_node child) {
  auto key = KeyOf(child, index.tag, index.first.Attr());
  if (!key || index.first.Insert(*key, child.internal_object())) return true;
  // Another child holds the key already; it surely comes first only when this one is the last.
  if (child.next_sibling()) return false;
  index.hasDuplicates = true;
  return true;
}

bool ChildIndex::Erase(KeyIndex& index, pugi::xml_node child) {
  auto key = KeyOf(child, index.tag, index.first.Attr());
  if (!key) return true;
  // A later holder of a key leaves the answers as they are.
  if (index.first.Find(*key) != child.internal_object()) return true;
  if (index.hasDuplicates) return false;
  return index.first.Erase(*key, child.internal_object());
}

template <typename Change>
void ChildIndex::Update(pugi::xml_node parent, Change change) {
  if (byParent_.empty()) return;
  std::vector<KeyIndex>* indexes = IndexesOf(parent.internal_object());
  if (!indexes) return;
  std::erase_if(*indexes, [&](KeyIndex& index) { return !change(index); });
  if (indexes->empty()) {
    byParent_.erase(parent.internal_object());
    ForgetLastParent();
  }
}

std::vector<ChildIndex::KeyIndex>* ChildIndex::IndexesOf(pugi::xml_node_struct* parent) {
  if (parent != lastParent_) {
    auto it = byParent_.find(parent);
    lastParent_ = parent;
    lastIndexes_ = it == byParent_.end() ? nullptr : &it->second;
  }
  return lastIndexes_;
}

void ChildIndex::ChildArrived(pugi::xml_node parent, pugi::xml_node child) {
  Update(parent, [&](KeyIndex& index) { return Insert(index, child); });
}

void ChildIndex::ChildLeaving(pugi::xml_node parent, pugi::xml_node child) {
  Update(parent, [&](KeyIndex& index) { return Erase(index, child); });
}

void ChildIndex::KeyChanging(pugi::xml_node child, std::string_view attr) {
  Update(child.parent(),
         [&](KeyIndex& index) { return index.first.Attr() != attr || Erase(index, child); });
}

void ChildIndex::KeyChanged(pugi::xml_node child, std::string_view attr) {
  Update(child.parent(),
         [&](KeyIndex& index) { return index.first.Attr() != attr || Insert(index, child); });
}

void ChildIndex::SubtreeDestroying(pugi::xml_node root) {
  ForgetLastParent();  // its memory may come back as a new node
  for (pugi::xml_node node = root; node && !byParent_.empty(); node = NextInSubtree(node, root)) {
    byParent_.erase(node.internal_object());
  }
}

void ChildIndex::ChildrenDestroying(pugi::xml_node parent) {
  ForgetLastParent();
  byParent_.erase(parent.internal_object());
  for (pugi::xml_node child : parent.children()) SubtreeDestroying(child);
}

void ChildIndex::Clear() {
  byParent_.clear();
  ForgetLastParent();
}

}  // namespace trl::xml
