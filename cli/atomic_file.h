#pragma once

#include <functional>
#include <string>
#include <string_view>

namespace trl::cli {

// Where a save of `path` goes: the file a link at `path` leads to (a linked user-data file is
// updated through its link, deliberately), or `path` itself.
std::string SaveTarget(const std::string& path);

struct Replacement {
  // The previous content stays as "<file>.bak", replaced only once the new backup exists.
  bool keepBackup = false;
  // A link at the path is written through to its file (saves); otherwise the link itself is
  // replaced, never what it leads to (outputs).
  bool throughLink = true;
  // The file holds the text (and its line end) gzip-compressed.
  bool compress = false;
  // A file that already holds exactly what would be written is left as it is, backup included.
  bool keepSame = false;
};

// Replaces the file at `path` with `text` (and a line end) so that a reader, or a crash, sees
// either the old content or the new, never a mix: the text goes to a new file beside it, is flushed
// to disk, and is renamed over the file. The replacement keeps the owner, group and permissions of
// the file it replaces. Temporaries an earlier run left behind when it was killed are removed
// first. A failure leaves the file as it was and is a CommandError with kExitFailed. Answers
// whether the file was replaced (false only when `how` keeps a file that is the same).
bool ReplaceFileAtomically(const std::string& path, const std::string& text,
                           const Replacement& how);

// A text made piece by piece: hands each piece, in order, to `put`.
using TextPieces = std::function<void(const std::function<void(std::string_view)>& put)>;

// The same for a text that is never held whole.
bool ReplaceFileAtomically(const std::string& path, const TextPieces& text, const Replacement& how);

}  // namespace trl::cli
