#include "filter_names.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <string>
#include <utility>

#include "command_error.h"
#include "trl/filter.h"

namespace trl::cli {
namespace {

constexpr int16_t kAllFilters =
    LowWeights | MissingFiles | LowFileCount | DuplicateMatches | FlagUnknowns | FlagUnmanaged;

constexpr std::array<std::pair<std::string_view, int16_t>, 7> kFilterNames{{
    {"low-weights", LowWeights},
    {"missing-files", MissingFiles},
    {"low-file-count", LowFileCount},
    {"duplicate-matches", DuplicateMatches},
    {"flag-unknowns", FlagUnknowns},
    {"flag-unmanaged", FlagUnmanaged},
    {"all", kAllFilters},
}};

[[noreturn]] void Reject(std::string_view text) {
  throw CommandError(fmt::format(
      "--filter '{}' is not a filter: give a number from 0 to {} or a comma list of low-weights, "
      "missing-files, low-file-count, duplicate-matches, flag-unknowns, flag-unmanaged or all",
      text, kAllFilters));
}

int16_t ParseNumber(std::string_view text) {
  int value = 0;
  auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size() || value > kAllFilters) {
    Reject(text);
  }
  return static_cast<int16_t>(value);
}

}  // namespace

std::string_view FilterName(int16_t bit) {
  auto known = std::find_if(kFilterNames.begin(), kFilterNames.end(),
                            [&](const auto& entry) { return entry.second == bit; });
  return known != kFilterNames.end() ? known->first : "";
}

std::vector<std::string_view> FilterNames() {
  std::vector<std::string_view> names;
  for (const auto& entry : kFilterNames) names.push_back(entry.first);
  return names;
}

int16_t ParseFilterOptions(std::string_view text) {
  if (!text.empty() &&
      std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; })) {
    return ParseNumber(text);
  }
  int16_t options = None;
  for (size_t start = 0, end = 0; end != std::string_view::npos; start = end + 1) {
    end = text.find(',', start);
    std::string_view name = text.substr(start, end - start);
    auto known = std::find_if(kFilterNames.begin(), kFilterNames.end(),
                              [&](const auto& entry) { return entry.first == name; });
    if (known == kFilterNames.end()) Reject(text);
    options = static_cast<int16_t>(options | known->second);
  }
  return options;
}

}  // namespace trl::cli
