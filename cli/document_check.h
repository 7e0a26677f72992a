#pragma once

#include <string>
#include <vector>

#include "document_kind.h"
#include "trl/xml.h"

namespace trl::cli {

// What would go wrong when a document of `kind` is used: required attributes missing, ids that are
// not numbers or repeat where they must be unique, weights out of range, values with apostrophes
// (selections place them between apostrophes unescaped), and versions of one fingerprint
// application that no file or property tells apart. One line each, with the element's place.
std::vector<std::string> CheckDocument(xml::Document& document, DocumentKind kind);

}  // namespace trl::cli
