#include <functional>
#include <string_view>
#include <vector>

#include "filter/filter_names.h"
#include "filter/filter_rules.h"
#include "filter/version_values.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/vocabulary.h"

namespace trl::filter {
namespace {

// What a removal rule does with one version of the application.
using VersionStep = std::function<void(const OnError& on, xml::Node a, xml::Node v)>;

// The procedure the removal rules share: `step` on each version of an application that has two or
// more. A single pass removes what a rescan after each removal would, since whether a version goes
// depends on that version alone.
int16_t RemoveVersions(xml::Node a, std::string_view label, const VersionStep& step) {
  OnError on{kClass, label};
  int16_t count = 0;
  on([&] { count = CountVersions(a); });
  if (count <= 1) return -1;
  std::vector<xml::Node> versions;
  on([&] { versions = a.ChildElements(vocab::v); });
  for (const xml::Node& v : versions) step(on, a, v);
  int16_t removed = 0;
  on([&] { removed = static_cast<int16_t>(count - CountVersions(a)); });
  return removed;
}

// Removes a version that `fallsShort` says falls short; one it cannot judge stays.
template <class FallsShort>
VersionStep RemoveWhen(FallsShort fallsShort) {
  return [fallsShort](const OnError& on, xml::Node a, xml::Node v) {
    bool remove = false;
    on([&] { remove = fallsShort(v); });
    if (remove) on([&] { a.RemoveChild(v); });
  };
}

}  // namespace

int16_t RemoveLowestVersionWeights(xml::Node a, double bestWeight) {
  return RemoveVersions(a, kRemoveLowestVersionWeightsLabel, RemoveWhen([bestWeight](auto& v) {
                          return bestWeight - 0.00001 > WeightOf(v);
                        }));
}

int16_t RemoveHighestMissingFiles(xml::Node a, int32_t fewestMissing) {
  return RemoveVersions(a, kRemoveHighestMissingFilesLabel, RemoveWhen([fewestMissing](auto& v) {
                          return MissingFilesOf(v) > fewestMissing;
                        }));
}

int16_t RemoveLowestFileCount(xml::Node a, int32_t mostFiles) {
  return RemoveVersions(a, kRemoveLowestFileCountLabel,
                        RemoveWhen([mostFiles](auto& v) { return FileCountOf(v) < mostFiles; }));
}

int16_t RemoveDuplicateMatches(xml::Node a) {
  bool kept = false;
  return RemoveVersions(a, kRemoveDuplicateMatchesLabel,
                        [&kept](const OnError& on, xml::Node parent, xml::Node v) {
                          if (kept) {
                            // A version relabelled before this rule stays beside the kept one.
                            if (v.GetAttribute(vocab::v_id) != kUnidentified) {
                              on([&] { parent.RemoveChild(v); });
                            }
                            return;
                          }
                          // The first version is kept, whatever its score.
                          kept = true;
                          on([&] { v.SetAttribute(vocab::v_guess, TextOf(v, vocab::v_id)); });
                          bool full = false;  // scores that cannot be read make no full match
                          on([&] { full = !PartlyMatched(v); });
                          Relabel(on, v, full ? kMultipleMatches : kUnsupportedVersion);
                        });
}

}  // namespace trl::filter
