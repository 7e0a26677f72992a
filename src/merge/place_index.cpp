#include "merge/place_index.h"

#include <algorithm>

#include "frame/vocabulary.h"
#include "platform/failure.h"

namespace trl::merge {
namespace {

std::string Key(std::string_view computer, std::string_view drive, std::string_view folder,
                std::string_view id) {
  // XML text never holds a NUL, so it separates the parts unambiguously.
  std::string key;
  key.reserve(computer.size() + drive.size() + folder.size() + id.size() + 3);
  key.append(computer).append(1, '\0').append(drive).append(1, '\0');
  key.append(folder).append(1, '\0').append(id);
  return key;
}

// The parent of `node` when it is a `tag` element.
xml::Node ParentNamed(const xml::Node& node, std::string_view tag) {
  xml::Node parent = node.ParentNode();
  return parent && parent.Type() == xml::NodeType::kElement && parent.NodeName() == tag
             ? parent
             : xml::Node();
}

}  // namespace

PlaceIndex::PlaceIndex(xml::Document& document) : document_(document) {
  if (!document.DocumentElement()) return;
  for (const xml::Node& a : document.AsNode().GetElementsByTagName(vocab::a)) {
    if (auto key = KeyOf(a)) byPlace_[*key].push_back(a);
  }
}

std::optional<std::string> PlaceIndex::KeyOf(const xml::Node& application) {
  xml::Node d = ParentNamed(application, vocab::d);
  xml::Node m = d ? ParentNamed(d, vocab::m) : xml::Node();
  xml::Node c = m ? ParentNamed(m, vocab::c) : xml::Node();
  if (!c) return std::nullopt;
  auto computer = c.GetAttribute(vocab::c_name);
  auto drive = m.GetAttribute(vocab::m_name);
  auto folder = d.GetAttribute(vocab::d_name);
  auto id = application.GetAttribute(vocab::a_id);
  if (!computer || !drive || !folder || !id) return std::nullopt;
  return Key(*computer, *drive, *folder, *id);
}

xml::Node PlaceIndex::Find(const std::string& computer, const std::string& drive,
                           const std::string& folder, const std::string& id) {
  for (const std::string* part : {&computer, &drive, &folder, &id}) {
    if (part->find('\'') != std::string::npos) {
      return document_.DocumentElement().SelectSingleNode(
          "//c[@c_name='" + computer + "']/m[@m_name='" + drive + "']/d[@d_name='" + folder +
          "']/a[@a_id='" + id + "']");
    }
  }
  if (!document_.DocumentElement()) Fail(kObjectNotSet);
  auto found = byPlace_.find(Key(computer, drive, folder, id));
  return found == byPlace_.end() || found->second.empty() ? xml::Node() : found->second.front();
}

void PlaceIndex::Forget(const xml::Node& application) {
  auto key = KeyOf(application);
  if (!key) return;
  auto found = byPlace_.find(*key);
  if (found == byPlace_.end()) return;
  std::vector<xml::Node>& nodes = found->second;
  nodes.erase(std::remove(nodes.begin(), nodes.end(), application), nodes.end());
}

size_t PlaceIndex::Computers() {
  if (!computers_) {
    computers_ =
        document_.DocumentElement() ? document_.AsNode().GetElementsByTagName(vocab::c).size() : 0;
  }
  return *computers_;
}

void PlaceIndex::ComputerRemoved() {
  if (computers_ && *computers_ > 0) --*computers_;
}

}  // namespace trl::merge
