// The --filter text: a number or a comma list of names gives only bits that rules know, the same
// bits as its number gives, and a list the bits of its names together; anything else is refused as
// a command error, never another failure.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "command_error.h"
#include "filter_names.h"
#include "fuzz_input.h"

namespace {

using trl::fuzz::Require;

constexpr int16_t kAllFilters = 63;

bool Accepted(std::string_view text, int16_t& options) {
  try {
    options = trl::cli::ParseFilterOptions(text);
    return true;
  } catch (const trl::cli::CommandError&) {
    return false;
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view text(reinterpret_cast<const char*>(data), size);
  int16_t options = 0;
  if (!Accepted(text, options)) return 0;
  Require(options >= 0 && options <= kAllFilters, "bits no rule knows");
  int16_t again = -1;
  Require(Accepted(std::to_string(options), again) && again == options,
          "the number of the options reads otherwise");
  if (std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; })) {
    return 0;
  }
  int16_t joined = 0;
  for (size_t start = 0, end = 0; end != std::string_view::npos; start = end + 1) {
    end = text.find(',', start);
    int16_t one = -1;
    Require(Accepted(text.substr(start, end - start), one), "a name of an accepted list refused");
    joined = static_cast<int16_t>(joined | one);
  }
  Require(joined == options, "a list is not the bits of its names");
  return 0;
}
