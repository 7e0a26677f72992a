#pragma once

#include <string>

namespace trl::cli {

// Replaces the file at `path` with `text` (and a line end) so that a reader, or a crash, sees
// either the old content or the new, never a mix: the text goes to a new file beside it, is flushed
// to disk, and is renamed over `path`. With `keepBackup`, the previous content stays as
// "<path>.bak". A failure leaves `path` as it was and is a CommandError with kExitFailed.
void ReplaceFileAtomically(const std::string& path, const std::string& text, bool keepBackup);

}  // namespace trl::cli
