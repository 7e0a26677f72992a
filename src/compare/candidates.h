#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "compare/folder_fit.h"
#include "compare/local_file_index.h"

namespace trl {

// An application folder a candidate stands for; exact when it holds a folder that has a case
// sibling, keeps its letter case and must be told apart from the sibling's.
struct CandidatePlace {
  std::string folder;
  size_t exactFrom = std::string::npos;  // where the case-kept part begins
  bool exact() const { return exactFrom != std::string::npos; }
};

// The application folders a candidate's file stands for, given where the fingerprint file expects
// to lie: the places its folder has through links, where a link lies in the part of the path the
// fingerprint names (`bin\tar` found as \usr\bin\tar behind the link \bin), else its own place. A
// place that only puts a link in the application folder itself is left to the real folder, so an
// application behind a link is found once, where it really is. `places` is replaced.
void CandidatePlaces(const FolderFit& fit, const LocalFileIndex& index,
                     const LocalFileRecord& record, std::vector<CandidatePlace>& places);

// Whether the candidate at `at` is spelt otherwise than the fingerprint's `spelled` while another
// candidate of its folder is spelt so: a name spelt exactly stands for the fingerprint file, and
// its case variants only where it is absent. The candidates of one folder are adjacent.
bool SpeltOtherwiseHere(const std::vector<LocalFileRecord>& candidates, size_t at,
                        std::string_view spelled);

}  // namespace trl
