#include "merge/place_index.h"

#include <algorithm>

#include "frame/vocabulary.h"
#include "platform/failure.h"

namespace trl::merge {
namespace {

// The parent of `node` when it is a `tag` element.
xml::Node ParentNamed(const xml::Node& node, std::string_view tag) {
  xml::Node parent = node.ParentNode();
  return parent && parent.Type() == xml::NodeType::kElement && parent.NodeName() == tag
             ? parent
             : xml::Node();
}

// The `tag` elements among `node` and its descendants.
std::vector<xml::Node> InOrBelow(const xml::Node& node, std::string_view tag) {
  std::vector<xml::Node> found = node.GetElementsByTagName(tag);
  if (node.NodeName() == tag) found.push_back(node);
  return found;
}

}  // namespace

PlaceIndex::PlaceIndex(xml::Document& document) : document_(document) {
  if (!document.DocumentElement()) return;
  for (const xml::Node& d : document.AsNode().GetElementsByTagName(vocab::d)) {
    if (auto key = KeyOf(d)) folders_[*key].push_back(d);
  }
}

std::optional<std::string> PlaceIndex::KeyOf(const xml::Node& folder) {
  xml::Node m = ParentNamed(folder, vocab::m);
  xml::Node c = m ? ParentNamed(m, vocab::c) : xml::Node();
  if (!c) return std::nullopt;
  auto computer = c.GetAttribute(vocab::c_name);
  auto drive = m.GetAttribute(vocab::m_name);
  auto name = folder.GetAttribute(vocab::d_name);
  if (!computer || !drive || !name) return std::nullopt;
  // XML text never holds a NUL, so it separates the parts unambiguously.
  return *computer + '\0' + *drive + '\0' + *name;
}

xml::Node PlaceIndex::Find(const std::string& computer, const std::string& drive,
                           const std::string& folder, const std::string& id) {
  auto select = [&] {
    return document_.DocumentElement().SelectSingleNode(
        "//c[@c_name='" + computer + "']/m[@m_name='" + drive + "']/d[@d_name='" + folder +
        "']/a[@a_id='" + id + "']");
  };
  for (const std::string* part : {&computer, &drive, &folder, &id}) {
    if (part->find('\'') != std::string::npos) return select();
  }
  if (!document_.DocumentElement()) Fail(kObjectNotSet);
  auto found = folders_.find(computer + '\0' + drive + '\0' + folder);
  if (found == folders_.end() || found->second.empty()) return xml::Node();
  if (found->second.size() > 1) return select();
  return document_.FindChild(found->second.front(), vocab::a, vocab::a_id, id);
}

void PlaceIndex::Removing(const xml::Node& node) {
  for (const xml::Node& d : InOrBelow(node, vocab::d)) {
    auto key = KeyOf(d);
    if (!key) continue;
    auto found = folders_.find(*key);
    if (found == folders_.end()) continue;
    std::vector<xml::Node>& list = found->second;
    list.erase(std::remove(list.begin(), list.end(), d), list.end());
  }
  if (computers_) *computers_ -= std::min(*computers_, InOrBelow(node, vocab::c).size());
}

void PlaceIndex::Added(const xml::Node& node) {
  for (const xml::Node& d : InOrBelow(node, vocab::d)) {
    if (auto key = KeyOf(d)) folders_[*key].push_back(d);
  }
  if (computers_) *computers_ += InOrBelow(node, vocab::c).size();
}

size_t PlaceIndex::Computers() {
  if (!computers_) {
    computers_ =
        document_.DocumentElement() ? document_.AsNode().GetElementsByTagName(vocab::c).size() : 0;
  }
  return *computers_;
}

}  // namespace trl::merge
