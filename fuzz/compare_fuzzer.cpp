// A synchronous compare: application options, local files and fingerprint, each a part of the
// input, "{root}" naming the fuzz tree, whose files are read when properties are matched.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz_input.h"
#include "fuzz_tree.h"
#include "trl/compare.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  using namespace trl::fuzz;
  auto parts = SplitInput(data, size, 3);
  trl::Compare compare(TreeFileSystem());
  compare.Asynchronous(false);
  std::string text =
      compare.Start(DocumentOf(parts, 0), DocumentOf(parts, 1, true), DocumentOf(parts, 2, true));
  RequireLoadable(text, "Compare");
  return 0;
}
