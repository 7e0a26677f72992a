#include "compare/candidates.h"

#include <algorithm>

namespace trl {

void CandidatePlaces(const FolderFit& fit, const LocalFileIndex& index,
                     const LocalFileRecord& record, std::vector<CandidatePlace>& places) {
  places.clear();
  for (const FolderAlias& alias : index.AliasesOf(record)) {
    std::string place = fit.AppFolder(alias.folder);
    if (!place.empty() && place.size() < alias.linkEnd &&
        std::none_of(places.begin(), places.end(),
                     [&](const CandidatePlace& known) { return known.folder == place; })) {
      places.push_back({std::move(place)});
    }
  }
  if (places.empty()) {
    std::string place = fit.AppFolder(record.Folder());
    if (place.empty()) return;
    // The application folder begins the local folder, letter case aside; it keeps its case when
    // it holds the folder with a case sibling.
    const std::string& exact = record.ExactFolder();
    size_t from = record.CaseExactFrom();
    if (from != std::string::npos && place.size() > from &&
        exact.size() == record.Folder().size()) {
      places.push_back({exact.substr(0, place.size()), from});
    } else {
      places.push_back({std::move(place)});
    }
  }
}

bool SpeltOtherwiseHere(const std::vector<LocalFileRecord>& candidates, size_t at,
                        std::string_view spelled) {
  if (candidates[at].Filename() == spelled) return false;
  uint32_t folder = candidates[at].FolderIndex();
  for (size_t i = at; i-- > 0 && candidates[i].FolderIndex() == folder;) {
    if (candidates[i].Filename() == spelled) return true;
  }
  for (size_t i = at + 1; i < candidates.size() && candidates[i].FolderIndex() == folder; ++i) {
    if (candidates[i].Filename() == spelled) return true;
  }
  return false;
}

}  // namespace trl
