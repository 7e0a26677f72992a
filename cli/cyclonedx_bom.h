#pragma once

#include <string>
#include <vector>

#include "findings_table.h"

namespace trl::cli {

// The identified applications among `findings` as a CycloneDX 1.6 JSON bill of materials: one
// component each, with a reference stable across runs (computer, folder and application id) and
// evidence of where it was found and how it was identified, with a confidence of score over most
// possible score. Unidentified ones (marked so, at half the confidence of their best guess) only
// when `includeUnidentified`; missing ones never.
std::string CycloneDxBom(const std::vector<Finding>& findings, bool includeUnidentified);

// How sure a finding's verdict is, from 0 to 1.
double Confidence(const Finding& finding);

}  // namespace trl::cli
