// Taking back the versions that lack a weighted file, and the results branches that leaves empty.
#include <algorithm>
#include <optional>
#include <string_view>
#include <tuple>

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
  bool removed = true;
  while (removed) {
    removed = false;
    on([&] { removed = RemoveEmptiedCopy(id); });
  }
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
      on([&] { filesMax = ToInt32(TextOf(v, vocab::f_max)); });
      on([&] { filesFound = ToInt32(TextOf(v, vocab::f_act)); });
      if (filesFound >= filesMax) continue;
      size_t missing = 0;
      on([&] {
        for (const xml::Node& f : v.ChildElements(vocab::f)) {
          if (f.GetAttribute(vocab::f_exists) == "0" && CarriesWeight(f)) ++missing;
        }
      });
      // A version goes only when a file that carries weight was not found; the selection is then
      // made afresh.
      if (missing != 0 && on([&] { copy.RemoveChild(v); })) {
        removed = true;
        break;
      }
    }
  }
  on([&] { copy.SetAttribute(vocab::a_max_seq, std::to_string(highestSequence)); });
}

bool Compare::RemoveEmptiedCopy(const std::string& id) {
  auto copies = copiesById_.find(id);
  if (copies == copiesById_.end() || id.find('\'') != std::string::npos) return false;
  xml::Node copy;
  for (const ApplicationCopy& candidate : copies->second) {
    if (candidate.element.CountChildElements(vocab::v, 1) == 0) {
      copy = candidate.element;
      break;
    }
  }
  if (!copy) return false;
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
  ForgetCopy(id, copy);
  return true;
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

void Compare::ForgetCopy(const std::string& id, xml::Node copy) {
  knownCopies_.erase(copy.Id());
  auto& copies = copiesById_[id];
  std::erase_if(copies, [&](const ApplicationCopy& entry) { return entry.element == copy; });
}

}  // namespace trl
