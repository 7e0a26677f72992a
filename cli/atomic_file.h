#pragma once

#include <string>

namespace trl::cli {

// Replaces the file at `path` with `text` so that a reader sees the old content or the new, never
// a mix: the text goes to a new file beside it, is flushed to the disk, and the new file is renamed
// over the old one, keeping its permissions. Failure is a CommandError with code kExitFailed and
// leaves the old file as it was.
void ReplaceFileAtomically(const std::string& path, const std::string& text);

}  // namespace trl::cli
