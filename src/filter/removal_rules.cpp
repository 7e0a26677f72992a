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

// The procedure the removal rules share. A single pass removes what a rescan after each removal
// would: whether a version falls short depends on that version alone.
int16_t RemoveVersions(std::string_view label,
                       const std::function<void(const OnError&, xml::Node)>& removeIfShort,
                       xml::Node a) {
  OnError on{kClass, label};
  int16_t count = 0;
  on([&] { count = CountVersions(a); });
  if (count <= 1) return -1;
  std::vector<xml::Node> versions;
  on([&] { versions = a.ChildElements(vocab::v); });
  for (const xml::Node& v : versions) removeIfShort(on, v);
  int16_t removed = 0;
  on([&] { removed = static_cast<int16_t>(count - CountVersions(a)); });
  return removed;
}

// Removes `v` from `a` when `fallsShort` says so; a version it cannot judge stays.
template <class FallsShort>
auto Remover(xml::Node a, FallsShort fallsShort) {
  return [a, fallsShort](const OnError& on, xml::Node v) mutable {
    bool remove = false;
    on([&] { remove = fallsShort(v); });
    if (remove) on([&] { a.RemoveChild(v); });
  };
}

}  // namespace

int16_t RemoveLowestVersionWeights(xml::Node a, double bestWeight) {
  return RemoveVersions(
      kRemoveLowestVersionWeightsLabel,
      Remover(a, [bestWeight](const xml::Node& v) { return bestWeight - 0.00001 > WeightOf(v); }),
      a);
}

int16_t RemoveHighestMissingFiles(xml::Node a, int32_t fewestMissing) {
  return RemoveVersions(
      kRemoveHighestMissingFilesLabel,
      Remover(a, [fewestMissing](const xml::Node& v) { return MissingFilesOf(v) > fewestMissing; }),
      a);
}

int16_t RemoveLowestFileCount(xml::Node a, int32_t mostFiles) {
  return RemoveVersions(
      kRemoveLowestFileCountLabel,
      Remover(a, [mostFiles](const xml::Node& v) { return FileCountOf(v) < mostFiles; }), a);
}

int16_t RemoveDuplicateMatches(xml::Node a) {
  bool labelled = false;
  return RemoveVersions(
      kRemoveDuplicateMatchesLabel,
      [&](const OnError& on, xml::Node v) {
        if (!labelled) {
          // The first version is the one kept, whatever its score.
          labelled = true;
          on([&] { v.SetAttribute(vocab::v_guess, TextOf(v, vocab::v_id)); });
          bool full = false;  // scores that cannot be read do not make a full match
          on([&] { full = !PartlyMatched(v); });
          Relabel(on, v, full ? kMultipleMatches : kUnsupportedVersion);
          return;
        }
        if (v.GetAttribute(vocab::v_id) != kUnidentified) on([&] { a.RemoveChild(v); });
      },
      a);
}

}  // namespace trl::filter
