#pragma once

#include <string>
#include <vector>

#include "findings_table.h"
#include "trl/xml.h"

namespace trl::cli {

// The findings and the run's events as JSON for scripts (`jq`): an object with "applications",
// one object per finding under stable snake_case keys, and "events" from the `events` element of
// `results` (none when it is null).
std::string FindingsJson(const std::vector<Finding>& findings, xml::Document* results);

}  // namespace trl::cli
