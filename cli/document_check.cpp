#include "document_check.h"

#include <fmt/format.h>

#include <algorithm>
#include <map>
#include <set>

#include "frame/vocabulary.h"

namespace trl::cli {
namespace {

// An element's place for a person: its tag and ids up from the root, "a[a_id=3]/v[v_id=2]".
std::string Place(const xml::Node& node) {
  std::string place;
  for (xml::Node at = node; at && at.ParentNode() && at.ParentNode().ParentNode();
       at = at.ParentNode()) {
    std::string step = at.NodeName();
    auto attributes = at.Attributes();
    if (!attributes.empty() && attributes.front().first.ends_with("_id")) {
      step += "[" + attributes.front().first + "=" + attributes.front().second + "]";
    }
    place = place.empty() ? step : step + "/" + place;
  }
  return place;
}

bool IsWholeNumber(const std::string& text) {
  return !text.empty() && std::all_of(text.begin() + (text[0] == '-' ? 1 : 0), text.end(),
                                      [](char c) { return c >= '0' && c <= '9'; });
}

struct Rule {
  const char* tag;
  std::vector<const char*> required;
  const char* id;       // unique among the element's siblings of its tag; nullptr: none
  const char* weight;   // 0 to 15; nullptr: none
  bool unique = false;  // the id is unique in the whole document
};

class Checker {
 public:
  explicit Checker(std::vector<std::string>& findings) : findings_(findings) {}

  void Apply(xml::Node root, const Rule& rule) {
    std::map<std::pair<const void*, std::string>, int> seen;  // by parent and id
    for (const xml::Node& e : root.SelectNodes(std::string("//") + rule.tag)) {
      for (const char* attribute : rule.required) {
        if (!e.GetAttribute(attribute)) Find(e, fmt::format("has no {}", attribute));
      }
      for (const auto& [name, value] : e.Attributes()) {
        if (value.find('\'') != std::string::npos &&
            (name.ends_with("_id") || name.ends_with("_name"))) {
          Find(e, fmt::format("{} holds an apostrophe, which breaks the selections it is used in",
                              name));
        }
      }
      if (rule.id) {
        if (auto id = e.GetAttribute(rule.id)) {
          if (!IsWholeNumber(*id)) Find(e, fmt::format("{} '{}' is not a number", rule.id, *id));
          const void* scope = rule.unique ? nullptr : e.ParentNode().Id();
          if (++seen[{scope, *id}] == 2) {
            Find(e, fmt::format("{} {} is used twice {}", rule.id, *id,
                                rule.unique ? "in the document" : "under one parent"));
          }
        }
      }
      if (rule.weight) {
        if (auto weight = e.GetAttribute(rule.weight)) {
          if (!IsWholeNumber(*weight) || std::stoll(*weight) < 0 || std::stoll(*weight) > 15) {
            Find(e,
                 fmt::format("{} '{}' is not a whole number from 0 to 15", rule.weight, *weight));
          }
        }
      }
    }
  }

  // Versions of one application with the same files, places and properties can never be told
  // apart: they can only come out as several matches.
  void Indistinct(xml::Node root) {
    for (const xml::Node& a : root.SelectNodes("//a")) {
      std::map<std::set<std::string>, std::string> versions;
      for (const xml::Node& v : a.ChildElements(vocab::v)) {
        std::set<std::string> files;
        for (const xml::Node& f : v.SelectNodes(".//f")) {
          std::string file = f.GetAttribute(vocab::f_name).value_or("") + "|" +
                             f.GetAttribute(vocab::f_relpath).value_or("");
          for (const xml::Node& p : f.ChildElements(vocab::p)) {
            file += "|" + p.GetAttribute("p_type").value_or("") + "=" +
                    p.GetAttribute("p_value").value_or("");
          }
          files.insert(file);
        }
        auto [known, added] = versions.try_emplace(files, Place(v));
        if (!added) Find(v, "cannot be told apart from " + known->second + " by any file");
      }
    }
  }

 private:
  void Find(const xml::Node& e, const std::string& what) {
    findings_.push_back(Place(e) + ": " + what);
  }
  std::vector<std::string>& findings_;
};

}  // namespace

std::vector<std::string> CheckDocument(xml::Document& document, DocumentKind kind) {
  std::vector<std::string> findings;
  Checker check(findings);
  xml::Node root = document.DocumentElement();
  if (!root) return findings;
  switch (kind) {
    case DocumentKind::kFingerprint:
      check.Apply(root, {"a", {"a_id", "a_name"}, "a_id", nullptr, true});
      check.Apply(root, {"v", {"v_id", "v_name", "v_seq"}, "v_id", nullptr});
      check.Apply(root, {"f", {"f_id", "f_name", "f_weight"}, "f_id", "f_weight"});
      check.Apply(root, {"p", {"p_type", "p_weight", "p_value"}, nullptr, "p_weight"});
      check.Indistinct(root);
      break;
    case DocumentKind::kSearchOptions:
      check.Apply(root, {"c", {"c_text", "c_name"}, "c_id", nullptr});
      check.Apply(root, {"m", {"m_text", "m_name"}, "m_id", nullptr});
      check.Apply(root, {"d", {"d_text"}, "d_id", nullptr});
      check.Apply(root, {"a", {"a_id"}, nullptr, nullptr});
      break;
    case DocumentKind::kResults:
    case DocumentKind::kLocalFiles:
      check.Apply(root, {"c", {"c_text", "c_name"}, "c_id", nullptr});
      check.Apply(root, {"m", {"m_text", "m_name"}, "m_id", nullptr});
      check.Apply(root, {"d", {"d_text", "d_name"}, "d_id", nullptr});
      break;
    default:
      check.Apply(root, {"a", {"a_id"}, nullptr, nullptr});
      break;
  }
  return findings;
}

}  // namespace trl::cli
