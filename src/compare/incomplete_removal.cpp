// Taking back the versions that lack a weighted file, and the results branches that leaves empty.
#include <algorithm>
#include <optional>
#include <string_view>
#include <tuple>
#include <utility>

#include "compare/compare_names.h"
#include "compare/version_draft.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/vocabulary.h"
#include "platform/convert.h"
#include "trl/compare.h"

namespace trl {

using compare::kClass;

namespace {

// The number in an element's id attribute, as the numbering wrote it.
int32_t IdOf(const xml::Node& element, std::string_view attribute) {
  return ToInt32(element.GetAttribute(attribute).value_or("0"));
}

}  // namespace

int16_t Compare::RemoveIncompleteApplications(const std::string& id, int32_t highestSequence) {
  OnError on{kClass, compare::kRemoveIncompleteLabel};
  std::vector<xml::Node> copies;
  on([&] { copies = CopiesOf(id); });
  for (const xml::Node& copy : copies) RemoveIncompleteVersions(copy, highestSequence);
  on([&] { RemoveEmptiedCopies(id); });
  int16_t remaining = 0;
  on([&] { remaining = ToInt16(static_cast<double>(CopiesOf(id).size())); });
  return remaining;
}

void Compare::RemoveIncompleteVersions(xml::Node copy, int32_t highestSequence) {
  OnError on{kClass, compare::kRemoveIncompleteLabel};
  int32_t filesMax = 0, filesFound = 0;
  bool removed = true;
  while (removed) {
    removed = false;
    std::vector<xml::Node> versions;
    on([&] { versions = copy.ChildElements(vocab::v); });
    for (xml::Node& v : versions) {
      on([&] { filesMax = ToInt32(TextViewOf(v, vocab::f_max)); });
      on([&] { filesFound = ToInt32(TextViewOf(v, vocab::f_act)); });
      if (filesFound >= filesMax) continue;
      size_t missing = 0;
      on([&] {
        for (const xml::Node& f : v.ChildElements(vocab::f)) {
          if (f.GetAttribute(vocab::f_exists) == "0" && CarriesWeight(f)) ++missing;
        }
      });
      // A version goes only when a file that carries weight was not found; the selection is then
      // made afresh.
      if (missing != 0 && explaining_) on([&] { KeepTakenBack(copy, v); });
      if (missing != 0 && on([&] { copy.RemoveChild(v); })) {
        removed = true;
        break;
      }
    }
  }
  on([&] { copy.SetAttribute(vocab::a_max_seq, std::to_string(highestSequence)); });
}

void Compare::KeepTakenBack(const xml::Node& copy, const xml::Node& v) {
  xml::Node d = copy.ParentNode();
  xml::Node m = d.ParentNode();
  xml::Node c = m.ParentNode();
  // The place's shown names: the compare may take the place itself out once it is empty.
  xml::Node kept = objResultsDOM->CreateElement(vocab::taken_back);
  const std::pair<xml::Node, std::string_view> names[] = {
      {c, vocab::c_text}, {c, vocab::c_local}, {m, vocab::m_text},
      {d, vocab::d_text}, {copy, vocab::a_id}, {copy, vocab::a_name}};
  for (const auto& [element, attribute] : names) {
    if (auto value = element.GetAttribute(attribute)) kept.SetAttribute(attribute, *value);
  }
  kept.AppendChild(v.CloneNode(true));
  takenBack_.push_back(kept);
}

void Compare::RemoveEmptiedCopies(const std::string& id) {
  auto found = copiesById_.find(id);
  if (found == copiesById_.end() || id.find('\'') != std::string::npos) return;
  // Taking a copy out empties no other, so one pass in document order takes out what picking the
  // first empty copy again and again would, without a scan from the start each time. A failure
  // stops it there, the copies from that one on staying.
  std::vector<ApplicationCopy>& copies = found->second;
  size_t kept = 0, at = 0;
  auto close = [&] {
    copies.erase(std::move(copies.begin() + static_cast<ptrdiff_t>(at), copies.end(),
                           copies.begin() + static_cast<ptrdiff_t>(kept)),
                 copies.end());
  };
  try {
    for (; at < copies.size(); ++at) {
      xml::Node copy = copies[at].element;
      if (copy.CountChildElements(vocab::v, 1) != 0) {
        copies[kept++] = copies[at];
        continue;
      }
      RemoveEmptiedCopy(copy);
      knownCopies_.erase(copy.Id());
    }
  } catch (...) {
    close();
    throw;
  }
  close();
}

void Compare::RemoveEmptiedCopy(xml::Node copy) {
  // With a single computer in the results, the computer goes with its last drive; with several,
  // only the drive goes and the computer stays.
  xml::Node d = copy.ParentNode();
  xml::Node m = d.ParentNode();
  xml::Node c = m.ParentNode();
  xml::Node root = c.ParentNode();
  // Counting stops at two: "exactly one" is all that is asked, and a drive may hold many folders.
  auto one = [](const xml::Node& parent, std::string_view tag) {
    return parent.CountChildElements(tag, 2) == 1;
  };
  if (!one(d, vocab::a)) {
    d.RemoveChild(copy);
  } else if (!one(m, vocab::d)) {
    m.RemoveChild(d);
  } else if (one(c, vocab::m) && one(root, vocab::c)) {
    root.RemoveChild(c);
  } else {
    c.RemoveChild(m);
  }
}

void Compare::RememberCopy(xml::Node copy) {
  if (knownCopies_.contains(copy.Id())) return;
  // A copy without an a_id is one no selection by a_id would find.
  std::optional<std::string> id = copy.GetAttribute(vocab::a_id);
  if (!id) return;
  xml::Node d = copy.ParentNode();
  xml::Node m = d.ParentNode();
  ApplicationCopy entry{IdOf(m.ParentNode(), vocab::c_id), IdOf(m, vocab::m_id),
                        IdOf(d, vocab::d_id), copy};
  auto before = [](const ApplicationCopy& x, const ApplicationCopy& y) {
    return std::tie(x.computer, x.drive, x.folder) < std::tie(y.computer, y.drive, y.folder);
  };
  auto& copies = copiesById_[*id];
  copies.insert(std::upper_bound(copies.begin(), copies.end(), entry, before), entry);
  knownCopies_.insert(copy.Id());
}

std::vector<xml::Node> Compare::CopiesOf(const std::string& id) const {
  // The selection cannot carry an apostrophe; such an id matches nothing, as it does in a search.
  std::vector<xml::Node> copies;
  if (id.find('\'') != std::string::npos) return copies;
  auto found = copiesById_.find(id);
  if (found == copiesById_.end()) return copies;
  for (const ApplicationCopy& copy : found->second) copies.push_back(copy.element);
  return copies;
}

}  // namespace trl
