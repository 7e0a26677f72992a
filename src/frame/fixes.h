#pragma once

#include <string_view>

#include "trl/xml.h"

namespace trl {

inline constexpr std::string_view kFixesModule = "basFixes";

// Brings search options and results kept from older runs to the current form, in place: plain
// names move from c_name/m_name to c_text/m_text with the encoded names in their place, and every
// application gets its place key a_guid ("c1m1d2a3"). Running it twice changes nothing more.
void UpgradeUserData(xml::Document& document);
// The same for one computer `c` and what it holds.
void UpgradeComputer(xml::Node computer);

// Writes the bit values the scores need into a fingerprint database, in place: p_bitmask and
// f_bitmask from the weights, p_max per file and v_max per version.
void UpgradeFingerprintData(xml::Document& fingerprint);

}  // namespace trl
