#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl::xml {

// Reads the file at `path` (native) to its end into `bytes`, or fails once it holds more than
// `limit` bytes: a device or a pipe that never ends is never read further.
std::optional<ParseError> ReadFileBytes(const std::string& path, size_t limit, std::string& bytes);

// `bytes` in `encoding` as UTF-8 into `text`; on failure the reason, and the text converted so far.
std::optional<std::string> ConvertToUtf8(std::string_view bytes, const std::string& encoding,
                                         std::string& text);

// A file that could not be read, for `reason`.
ParseError Unreadable(std::string reason);

}  // namespace trl::xml
