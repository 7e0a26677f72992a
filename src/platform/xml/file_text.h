#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "trl/xml.h"

namespace trl::xml {

// The text of the XML file at `path` as UTF-8, read to its end or to `limit` bytes, whichever
// comes first, and converted from the encoding its byte order mark, its UTF-16 or UTF-32 spelling
// of "<?xml" or its declaration names (UTF-8 when none does). `error` says why it could not be
// read or converted: a failure of the system, a file over the limit, an encoding that is unknown
// or bytes that are not in it (then with where, in the text converted so far).
struct FileText {
  std::string text;
  std::optional<ParseError> error;
};
FileText ReadXmlFile(const std::string& path, size_t limit);

// A document over `limit` bytes, refused.
ParseError TooLarge(size_t limit);

// Line and byte column (both 1-based) of `offset` in `text`.
ParseError ErrorAt(std::string_view text, size_t offset, std::string reason);

}  // namespace trl::xml
