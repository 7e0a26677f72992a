#include <string>
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

// The scan the removal rules share: versions in document order, each value read into one local
// that a failed read leaves as it was (so a version that cannot be read is judged by the value
// read before it), and after each removal the scan starts again from the first version. Versions
// before the removed one whose reads all succeeded would be read again to the same values without
// a report, so the scan resumes after them; a failed read among them makes it start over, since
// that version may now be judged by another value and is reported again.
template <class T, class Read, class FallsShort>
void ScanAndRemove(const OnError& on, xml::Node a, T value, Read read, FallsShort fallsShort) {
  std::vector<xml::Node> versions;
  on([&] { versions = a.ChildElements(vocab::v); });
  std::vector<T> readBefore;  // the value after each version scanned since the scan began
  bool failedBefore = false;  // whether a read failed since the scan began
  for (size_t i = 0; i < versions.size();) {
    if (!on([&] { value = read(versions[i]); })) failedBefore = true;
    if (!fallsShort(value)) {
      readBefore.push_back(value);
      ++i;
      continue;
    }
    if (!on([&] { a.RemoveChild(versions[i]); })) {
      readBefore.push_back(value);
      ++i;
      continue;
    }
    versions.erase(versions.begin() + i);
    if (failedBefore) {
      i = 0;
      readBefore.clear();
      failedBefore = false;
    } else if (i > 0) {
      value = readBefore.back();
    }
  }
}

int16_t Removed(const OnError& on, xml::Node a, int16_t count) {
  int16_t removed = 0;
  on([&] { removed = static_cast<int16_t>(count - CountVersions(a)); });
  return removed;
}

// A removal rule: an application with two or more versions loses those that fall short.
template <class T, class Read, class FallsShort>
int16_t RemoveVersions(xml::Node a, std::string_view label, T value, Read read,
                       FallsShort fallsShort) {
  OnError on{kClass, label};
  int16_t count = 0;
  on([&] { count = CountVersions(a); });
  if (count <= 1) return -1;
  ScanAndRemove(on, a, value, read, fallsShort);
  return Removed(on, a, count);
}

}  // namespace

int16_t RemoveLowestVersionWeights(xml::Node a, double bestWeight) {
  return RemoveVersions(a, kRemoveLowestVersionWeightsLabel, 0.0, WeightOf,
                        [bestWeight](double weight) { return bestWeight - 0.00001 > weight; });
}

int16_t RemoveHighestMissingFiles(xml::Node a, int32_t fewestMissing) {
  return RemoveVersions(a, kRemoveHighestMissingFilesLabel, int32_t{0}, MissingFilesOf,
                        [fewestMissing](int32_t missing) { return missing > fewestMissing; });
}

int16_t RemoveLowestFileCount(xml::Node a, int32_t mostFiles) {
  return RemoveVersions(a, kRemoveLowestFileCountLabel, int32_t{0}, FileCountOf,
                        [mostFiles](int32_t files) { return files < mostFiles; });
}

int16_t RemoveDuplicateMatches(xml::Node a) {
  OnError on{kClass, kRemoveDuplicateMatchesLabel};
  int16_t count = 0;
  on([&] { count = CountVersions(a); });
  if (count <= 1) return -1;
  // The first version is kept, whatever its score.
  xml::Node kept;
  on([&] { kept = a.ChildElements(vocab::v).at(0); });
  std::string id;
  int32_t most = 0, reached = 0;
  on([&] { id = TextOf(kept, vocab::v_id); });
  on([&] { most = Int32Of(kept, vocab::v_max); });
  on([&] { reached = Int32Of(kept, vocab::v_act); });
  on([&] { kept.SetAttribute(vocab::v_guess, id); });
  Relabel(on, kept, most == reached ? kMultipleMatches : kUnsupportedVersion);
  // A version relabelled before this rule stays beside the kept one.
  ScanAndRemove(
      on, a, std::string(), [](const xml::Node& v) { return TextOf(v, vocab::v_id); },
      [](const std::string& versionId) { return versionId != kUnidentified; });
  return Removed(on, a, count);
}

}  // namespace trl::filter
