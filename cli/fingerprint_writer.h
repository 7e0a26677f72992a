#pragma once

#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl::cli {

// Property weights of every fingerprint file: distinct, so that any combination of agreeing
// properties gives its own mask.
inline constexpr int kSizeWeight = 1;
inline constexpr int kDigestWeight = 2;

// Appends a fingerprint file `f` to the version `v`; its properties follow with the two below.
xml::Node AppendFileElement(xml::Node v, int id, std::string_view name, std::string_view relpath,
                            int weight);
// The file's size in bytes (kind 2) and its MD5 digest in lower-case hex (kind 3).
void AppendSizeProperty(xml::Node f, std::string_view size);
void AppendDigestProperty(xml::Node f, std::string_view digest);

// The fingerprint database at `path`, or a new, empty document when no file is there; a file that
// cannot be read or is not well-formed XML is a CommandError.
xml::DocumentPtr LoadOrCreateDatabase(const std::string& path);
// The database's root element, made when the document has none.
xml::Node DatabaseRoot(xml::Document& database);

}  // namespace trl::cli
