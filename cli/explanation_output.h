#pragma once

#include <string>

#include "explanation.h"

namespace trl::cli {

// The explanation in plain sentences, an application to a paragraph.
std::string ExplanationText(const Explanation& explanation);
// The same for scripts: stable snake_case keys, every file of every version.
std::string ExplanationJson(const Explanation& explanation);

}  // namespace trl::cli
