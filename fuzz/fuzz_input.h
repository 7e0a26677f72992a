#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "trl/xml.h"

namespace trl::fuzz {

// Documents of one input are separated by a line of three "=".
inline constexpr std::string_view kPartSeparator = "\n===\n";

// The first `count` parts of the input; the last of them keeps any further separators.
std::vector<std::string_view> SplitInput(const uint8_t* data, size_t size, size_t count);

// The document of part `index`: null when the input has no such part (a client passing none),
// otherwise what loading the part gave, which is an empty document when it is not XML.
// `rooted` parts have each "{root}" replaced by the fuzz tree's path first.
xml::DocumentPtr DocumentOf(const std::vector<std::string_view>& parts, size_t index,
                            bool rooted = false);

// Stops the run, so that the fuzzer keeps the input, when `holds` is false.
void Require(bool holds, std::string_view what);

// A stage's result: "" or a document the layer loads again.
void RequireLoadable(const std::string& text, std::string_view stage);

}  // namespace trl::fuzz
