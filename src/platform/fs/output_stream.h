#pragma once

#include <cstdio>
#include <string>

namespace trl::fs {

// Opens the file at `path` (native) for writing entries at its end, creating it when missing and
// emptying it first when `replace` is set. A link planted in its place is not written through.
// Answers the stream, or null with errno set.
std::FILE* OpenOutputStream(const std::string& path, bool replace);

}  // namespace trl::fs
