#pragma once

#include <cstdint>
#include <string_view>

#include "trl/locate.h"

namespace trl::locate {

// What Locate says and logs of one stage.
struct StageNames {
  int16_t mode;
  std::string_view eventList;  // the stage's element in the gathered events
  std::string_view beginLabel, endLabel;
  std::string_view statusLabel, progressLabel;  // labels of the handlers of its events
  std::string_view about, complete;             // run-log messages
};

inline constexpr StageNames kSearchStage{Locate::kSearchStage,
                                         "search",
                                         "SearchBegin",
                                         "SearchEnd",
                                         "trlSearch_StatusUpdate",
                                         "trlSearch_ProgressUpdate",
                                         "About to search...",
                                         "Search complete"};
inline constexpr StageNames kCompareStage{Locate::kCompareStage,
                                          "compare",
                                          "CompareBegin",
                                          "CompareEnd",
                                          "trlCompare_StatusUpdate",
                                          "trlCompare_ProgressUpdate",
                                          "About to compare...",
                                          "Compare complete"};
inline constexpr StageNames kFilterStage{Locate::kFilterStage,
                                         "filter",
                                         "FilterBegin",
                                         "FilterEnd",
                                         "trlFilter_StatusUpdate",
                                         "trlFilter_ProgressUpdate",
                                         "About to filter...",
                                         "Filter complete"};
inline constexpr StageNames kMergeStage{Locate::kMergeStage,
                                        "merge",
                                        "MergeBegin",
                                        "MergeEnd",
                                        "trlMerge_StatusUpdate",
                                        "trlMerge_ProgressUpdate",
                                        "About to merge...",
                                        "Merge complete"};

}  // namespace trl::locate

namespace trl {

// One stage of the chain: its names, its worker and the Locate field that holds its results.
struct Locate::Stage {
  Stage(const locate::StageNames& stageNames, Worker* stageWorker, xml::DocumentPtr* resultsField)
      : names(stageNames), worker(stageWorker), results(resultsField) {}

  const locate::StageNames& names;
  Worker* worker;
  xml::DocumentPtr* results;
};

}  // namespace trl
