#pragma once

#include <cstddef>
#include <vector>

#include "compare/candidates.h"
#include "compare/local_file_index.h"
#include "trl/compare.h"
#include "trl/xml.h"

namespace trl {

// Where the planning of reads ahead of the match stands.
struct Compare::ReadPlan {
  std::vector<xml::Node> applications;
  size_t nextApplication = 0;
  std::vector<xml::Node> files;  // of the application being planned, as the match visits them
  size_t nextFile = 0;
  std::vector<LocalFileRecord> candidates;
  std::vector<CandidatePlace> places;
};

}  // namespace trl
