#include "filter/filter_versions.h"

#include <vector>

#include "filter/filter_names.h"
#include "filter/filter_rules.h"
#include "filter/version_values.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/general.h"
#include "frame/vocabulary.h"
#include "trl/filter.h"

namespace trl::filter {
namespace {

// What the removal rules measure the versions against. They are taken once, before any rule
// runs, so a threshold may come from a version an earlier rule removes.
struct Thresholds {
  double bestWeight = 0.0;
  int32_t fewestMissing = -1;  // -1: none seen yet
  int32_t mostFiles = 0;
};

// A version whose value cannot be read sets no threshold.
Thresholds ThresholdsOf(const OnError& on, const std::vector<xml::Node>& versions) {
  Thresholds t;
  for (const xml::Node& v : versions) {
    on([&] {
      double weight = WeightOf(v);
      if (weight > t.bestWeight) t.bestWeight = weight;
    });
    on([&] {
      int32_t missing = MissingFilesOf(v);
      if (t.fewestMissing == -1 || missing < t.fewestMissing) t.fewestMissing = missing;
    });
    on([&] {
      int32_t files = FileCountOf(v);
      if (files > t.mostFiles) t.mostFiles = files;
    });
  }
  return t;
}

void WriteVerdict(const OnError& on, xml::Node a, std::string_view id, std::string_view name,
                  std::string_view seq) {
  on([&] { a.SetAttribute(vocab::v_id, id); });
  on([&] { a.SetAttribute(vocab::v_name, name); });
  on([&] { a.SetAttribute(vocab::v_seq, seq); });
}

// The application takes the identity of its only version, and the version's n and o children.
void TakeOnlyVersion(const OnError& on, xml::Node a, xml::Node v) {
  for (std::string_view tag : {vocab::n, vocab::o}) {
    std::vector<xml::Node> children;
    on([&] { children = v.ChildElements(tag); });
    for (const xml::Node& child : children) on([&] { a.InsertBefore(child, v); });
  }
  for (std::string_view attribute : {vocab::v_id, vocab::v_name, vocab::v_seq}) {
    on([&] { a.SetAttribute(attribute, TextOf(v, attribute)); });
  }
}

}  // namespace

std::string FilterVersions(xml::Node a, int16_t intFilterOptions) {
  OnError on{kClass, kFilterVersionsLabel};
  on([&] { a.SetAttribute(vocab::a_manage, kManaged); });
  std::vector<xml::Node> versions;
  on([&] { versions = a.ChildElements(vocab::v); });
  Thresholds t = ThresholdsOf(on, versions);

  if (intFilterOptions & LowWeights) RemoveLowestVersionWeights(a, t.bestWeight);
  if (intFilterOptions & MissingFiles) RemoveHighestMissingFiles(a, t.fewestMissing);
  if (intFilterOptions & LowFileCount) RemoveLowestFileCount(a, t.mostFiles);
  if (intFilterOptions & DuplicateMatches) RemoveDuplicateMatches(a);
  if (intFilterOptions & FlagUnknowns) FlagAsUnknown(a);
  if (intFilterOptions & FlagUnmanaged) FlagAsUnmanaged(a);

  std::vector<xml::Node> left;
  on([&] { left = a.ChildElements(vocab::v); });
  if (left.empty()) {
    WriteVerdict(on, a, kNoVersionId, kNoVersionName, kNoVersionId);
  } else if (left.size() == 1) {
    TakeOnlyVersion(on, a, left.front());
  } else {
    WriteVerdict(on, a, kUnidentified, kUnsupportedVersion, kUnidentified);
  }
  std::string id;
  on([&] { id = FixNulls<std::string>(a.GetAttribute(vocab::v_id), ""); });
  return id;
}

}  // namespace trl::filter
