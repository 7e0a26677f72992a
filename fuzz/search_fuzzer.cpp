// A synchronous search over the fuzz tree: search options, application options, fingerprint and
// a local-files document to add to, each a part of the input, "{root}" naming the tree. Whatever
// they hold, the run reports and goes on, and its result loads again.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz_input.h"
#include "fuzz_tree.h"
#include "trl/search.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  using namespace trl::fuzz;
  auto parts = SplitInput(data, size, 4);
  auto results = DocumentOf(parts, 3, true);
  trl::Search search(TreeFileSystem());
  search.Asynchronous(false);
  std::string text = search.Start(DocumentOf(parts, 0, true), DocumentOf(parts, 1),
                                  DocumentOf(parts, 2, true), results);
  RequireLoadable(text, "Search");
  return 0;
}
