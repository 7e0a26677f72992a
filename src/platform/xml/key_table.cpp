#include "platform/xml/key_table.h"

#include <functional>

namespace trl::xml {

uint32_t KeyTable::Hash(std::string_view key) {
  uint64_t hash = std::hash<std::string_view>{}(key);
  return static_cast<uint32_t>(hash ^ (hash >> 32));
}

std::string_view KeyTable::KeyAt(size_t slot) const {
  return pugi::xml_node(elements_[slot]).attribute(attr_.c_str()).value();
}

size_t KeyTable::Probe(std::string_view key, uint32_t hash) const {
  size_t mask = elements_.size() - 1;
  for (size_t slot = hash & mask;; slot = (slot + 1) & mask) {
    if (elements_[slot] == nullptr) return slot;
    if (hashes_[slot] == hash && KeyAt(slot) == key) return slot;
  }
}

pugi::xml_node_struct* KeyTable::Find(std::string_view key) const {
  if (size_ == 0) return nullptr;
  return elements_[Probe(key, Hash(key))];
}

bool KeyTable::Insert(std::string_view key, pugi::xml_node_struct* element) {
  // At most three quarters full, so that a probe soon meets an empty slot.
  if ((size_ + 1) * 4 > elements_.size() * 3) Grow();
  uint32_t hash = Hash(key);
  size_t slot = Probe(key, hash);
  if (elements_[slot] != nullptr) return false;
  elements_[slot] = element;
  hashes_[slot] = hash;
  ++size_;
  return true;
}

bool KeyTable::Erase(std::string_view key, pugi::xml_node_struct* element) {
  if (size_ == 0) return false;
  size_t slot = Probe(key, Hash(key));
  if (elements_[slot] != element) return false;
  // Backward shift: moves later entries of the run into the gap, so no probe stops early.
  size_t mask = elements_.size() - 1;
  for (size_t next = (slot + 1) & mask; elements_[next] != nullptr; next = (next + 1) & mask) {
    size_t home = hashes_[next] & mask;
    bool between = slot <= next ? (slot < home && home <= next) : (slot < home || home <= next);
    if (between) continue;
    elements_[slot] = elements_[next];
    hashes_[slot] = hashes_[next];
    slot = next;
  }
  elements_[slot] = nullptr;
  --size_;
  return true;
}

void KeyTable::Grow() {
  std::vector<pugi::xml_node_struct*> elements(elements_.empty() ? 8 : elements_.size() * 2);
  std::vector<uint32_t> hashes(elements.size());
  size_t mask = elements.size() - 1;
  for (size_t from = 0; from < elements_.size(); ++from) {
    if (elements_[from] == nullptr) continue;
    size_t slot = hashes_[from] & mask;
    while (elements[slot] != nullptr) slot = (slot + 1) & mask;
    elements[slot] = elements_[from];
    hashes[slot] = hashes_[from];
  }
  elements_ = std::move(elements);
  hashes_ = std::move(hashes);
}

}  // namespace trl::xml
