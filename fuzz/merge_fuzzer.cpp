// A synchronous merge: search options, application options, user data and new results, each a
// part of the input.
#include <cstddef>
#include <cstdint>

#include "fuzz_input.h"
#include "trl/merge.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  using namespace trl::fuzz;
  auto parts = SplitInput(data, size, 4);
  trl::Merge merge;
  merge.Asynchronous(false);
  RequireLoadable(merge.Start(DocumentOf(parts, 0), DocumentOf(parts, 1), DocumentOf(parts, 2),
                              DocumentOf(parts, 3)),
                  "Merge");
  return 0;
}
