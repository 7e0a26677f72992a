#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "trl/xml.h"

namespace trl {

inline constexpr std::string_view kGeneralModule = "basGeneral";

// The value, or `fallback` when it is absent. An empty text is a value and stays empty.
template <class T>
T FixNulls(const std::optional<T>& value, T fallback) {
  return value ? *value : std::move(fallback);
}

// Appends a copy of the shared reporter's event list as the last child of the results root, then
// clears the reporter's list and counts. False when there is no shared reporter yet (it is never
// created here) or its list cannot be read.
bool AddEventsXML(xml::Document& results);

// The bit value of a weight: 0 for 0 or less, 2^(w-1) for 1..15, 16384 for 15 and above.
int32_t CalculateWeightMask(int32_t weight);

}  // namespace trl
