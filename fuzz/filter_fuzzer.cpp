// A synchronous filter: the option bits as decimal text, then the matches document.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "fuzz_input.h"
#include "trl/filter.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  using namespace trl::fuzz;
  auto parts = SplitInput(data, size, 2);
  // Any 16-bit value a client could pass, bits no rule knows included.
  auto options = static_cast<int16_t>(std::strtol(std::string(parts[0]).c_str(), nullptr, 10));
  trl::Filter filter;
  filter.Asynchronous(false);
  RequireLoadable(filter.Start(options, DocumentOf(parts, 1)), "Filter");
  return 0;
}
