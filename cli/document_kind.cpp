#include "document_kind.h"

#include <fmt/format.h>

#include <algorithm>

#include "command_error.h"

namespace trl::cli {

DocumentKind KindOf(xml::Document& document) {
  xml::Node root = document.DocumentElement();
  if (!root) return DocumentKind::kUnknown;
  const std::string name = root.NodeName();
  auto has = [&](const char* path) { return static_cast<bool>(root.SelectSingleNode(path)); };
  if (name == "trl_applicationdata") {
    if (has("c/m/d/a") || has("a_missing")) return DocumentKind::kResults;
    if (has("c/m/d/f")) return DocumentKind::kLocalFiles;
    return DocumentKind::kEmptyResults;
  }
  if (name == "events" || name == "e") return DocumentKind::kOther;
  if (name == "trl_machine") return DocumentKind::kMachineResults;
  if (name == "trl_fingerprint" || has("a/v") || has("a/f") || has("a/a")) {
    return DocumentKind::kFingerprint;
  }
  if (has("c")) return DocumentKind::kSearchOptions;
  if (name == "trl_applicationoptions" || root.GetAttribute("a_selected") ||
      has("a[@a_selected]")) {
    return DocumentKind::kApplicationOptions;
  }
  return DocumentKind::kUnknown;
}

std::string_view KindName(DocumentKind kind) {
  switch (kind) {
    case DocumentKind::kSearchOptions:
      return "search options (computers, drives and folders to search)";
    case DocumentKind::kApplicationOptions:
      return "application options";
    case DocumentKind::kFingerprint:
      return "a fingerprint database (applications with versions)";
    case DocumentKind::kLocalFiles:
      return "a local-files document (the files a search recorded)";
    case DocumentKind::kResults:
      return "results or user data (applications found)";
    case DocumentKind::kEmptyResults:
      return "an empty results document";
    case DocumentKind::kMachineResults:
      return "the results of one machine (what collect writes)";
    case DocumentKind::kOther:
      return "a document of events or progress";
    case DocumentKind::kUnknown:
      break;
  }
  return "a document of no known kind";
}

void RequireKind(xml::Document& document, std::string_view path, const DocumentRole& role) {
  DocumentKind kind = KindOf(document);
  if (kind == DocumentKind::kUnknown ||
      std::find(role.accepts.begin(), role.accepts.end(), kind) != role.accepts.end()) {
    return;
  }
  throw CommandError(fmt::format("'{}' was given as the {}, but it holds {}; nothing was written",
                                 path, role.name, KindName(kind)));
}

}  // namespace trl::cli
