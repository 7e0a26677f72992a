#pragma once

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "platform/xml/file_text.h"
#include "trl/xml.h"

namespace trl::xml {

// Reads the file at `path` (native) to its end into `bytes`, or fails once it holds more than
// `limit` bytes: a device or a pipe that never ends is never read further.
std::optional<ParseError> ReadFileBytes(const std::string& path, size_t limit, std::string& bytes);

// The growth and the limit of ReadFileBytes around the system's own read: `read(into, room, got)`
// puts up to `room` bytes at `into` and their count in `got` (0 at the end), or fails. `expected`
// is the first size to read for: a regular file's size and one more, to see the end at once.
template <class Read>
std::optional<ParseError> ReadUpToLimit(size_t expected, size_t limit, std::string& bytes,
                                        Read read) {
  // One byte past the limit, to see that it was passed (unless there is none).
  const size_t most = std::max(limit, limit + 1);
  bytes.resize(std::min(expected, most));
  size_t used = 0;
  for (;;) {
    if (used == bytes.size()) bytes.resize(std::min(bytes.size() * 2, most));
    size_t got = 0;
    if (std::optional<ParseError> failed = read(bytes.data() + used, bytes.size() - used, got)) {
      return failed;
    }
    if (got == 0) break;
    used += got;
    if (used > limit) return TooLarge(limit);
  }
  bytes.resize(used);
  return std::nullopt;
}

// `bytes` in `encoding` as UTF-8 into `text`; on failure the reason, and the text converted so far.
std::optional<std::string> ConvertToUtf8(std::string_view bytes, const std::string& encoding,
                                         std::string& text);

// A file that could not be read, for `reason`.
ParseError Unreadable(std::string reason);

}  // namespace trl::xml
