#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

#include "findings_table.h"
#include "trl/xml.h"

namespace trl::cli {

// How the findings of a run or an inventory are shown.
struct FindingsFormat {
  std::string format = "xml";        // xml (the document itself), table, json or cyclonedx
  int minScore = 0;                  // findings scoring below this share (in %) are left out
  bool includeUnidentified = false;  // cyclonedx: unidentified applications too
};

// Adds --format (with `xmlMeaning` said of xml), --min-score and --include-unidentified.
void AddFindingsFormatOptions(CLI::App& command, FindingsFormat& options,
                              const std::string& xmlMeaning);

// The findings in any format but xml; `results` gives the events of a run (null: none).
std::string RenderFindings(const FindingsFormat& options, const std::vector<Finding>& findings,
                           xml::Document* results);

}  // namespace trl::cli
