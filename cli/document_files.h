#pragma once

#include <string>
#include <string_view>

#include "atomic_file.h"
#include "document_kind.h"
#include "trl/xml.h"

namespace trl::cli {

// Loads the XML document at `path` for `role`, which names it in messages. A file that is missing,
// unreadable, empty or a device, not well-formed XML or over a limit of the document layer (with
// line and column where there are), or of a kind the role does not accept is a CommandError.
xml::DocumentPtr LoadDocumentFile(const std::string& path, const DocumentRole& role);
// The same, or null when `path` is empty (the option was not given).
xml::DocumentPtr LoadOptionalDocumentFile(const std::string& path, const DocumentRole& role);

// Writes `text` and a line end to the file at `path`, or to standard output when `path` is empty.
// A file that cannot be written is a CommandError with exit code kExitFailed.
void WriteTextOutput(const std::string& text, const std::string& path);
// The same for a text made piece by piece.
void WriteTextOutput(const TextPieces& text, const std::string& path);

}  // namespace trl::cli
