#pragma once

#include <cstdint>
#include <pugixml.hpp>
#include <string>
#include <string_view>
#include <vector>

namespace trl::xml {

// A set of child elements keyed by the value of one of their attributes: open addressing with
// linear probing, 12 bytes a slot, no allocation per entry. The keys are not copied: each is read
// from its element when two hashes agree, so a key must not change while its element is in the
// table.
class KeyTable {
 public:
  explicit KeyTable(std::string attr) : attr_(std::move(attr)) {}

  const std::string& Attr() const { return attr_; }
  // The element holding `key`, or nullptr.
  pugi::xml_node_struct* Find(std::string_view key) const;
  // Adds `element` under `key` unless the key is held already; answers whether it was added.
  bool Insert(std::string_view key, pugi::xml_node_struct* element);
  // Removes the entry for `key` if `element` holds it; answers whether it was removed.
  bool Erase(std::string_view key, pugi::xml_node_struct* element);
  size_t Size() const { return size_; }

 private:
  static uint32_t Hash(std::string_view key);
  std::string_view KeyAt(size_t slot) const;
  // The slot holding `key`, or the empty slot where it would go.
  size_t Probe(std::string_view key, uint32_t hash) const;
  void Grow();

  std::string attr_;
  std::vector<pugi::xml_node_struct*> elements_;  // nullptr: empty slot
  std::vector<uint32_t> hashes_;
  size_t size_ = 0;
};

}  // namespace trl::xml
