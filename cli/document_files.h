#pragma once

#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl::cli {

// Loads the XML document at `path`; `role` names it in messages ("search options"). A file that
// is missing or unreadable, or not well-formed XML (with line and column), is a CommandError.
xml::DocumentPtr LoadDocumentFile(const std::string& path, std::string_view role);
// The same, or null when `path` is empty (the option was not given).
xml::DocumentPtr LoadOptionalDocumentFile(const std::string& path, std::string_view role);

// Writes `text` and a line end to the file at `path`, or to standard output when `path` is empty.
// A file that cannot be written is a CommandError with exit code kExitFailed.
void WriteTextOutput(const std::string& text, const std::string& path);

}  // namespace trl::cli
