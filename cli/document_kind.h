#pragma once

#include <initializer_list>
#include <string_view>

#include "trl/xml.h"

namespace trl::cli {

// The kinds of document the command line reads, told apart by their root and what lies below it,
// so that a file given for the wrong option is refused before anything is written.
enum class DocumentKind {
  kUnknown,  // nothing in it tells (an empty root): accepted wherever a document is
  kSearchOptions,
  kApplicationOptions,
  kFingerprint,
  kLocalFiles,
  kResults,         // matches or user data: applications found
  kEmptyResults,    // a results root with nothing in it: local files, matches or user data
  kMachineResults,  // what `collect` wrote on one machine: its search options and filtered results
  kOther,           // events, progress: never an input
};

// What a document option takes: its name in messages, the kinds it accepts, and whether its file
// may be gzip-compressed.
struct DocumentRole {
  std::string_view name;
  std::initializer_list<DocumentKind> accepts;
  bool compressed = false;
};

inline constexpr DocumentRole kSearchOptionsRole{"search options", {DocumentKind::kSearchOptions}};
inline constexpr DocumentRole kApplicationOptionsRole{"application options",
                                                      {DocumentKind::kApplicationOptions}};
inline constexpr DocumentRole kFingerprintRole{"fingerprint database",
                                               {DocumentKind::kFingerprint}};
inline constexpr DocumentRole kLocalFilesRole{
    "local-files document", {DocumentKind::kLocalFiles, DocumentKind::kEmptyResults}};
inline constexpr DocumentRole kResultsRole{"results document",
                                           {DocumentKind::kResults, DocumentKind::kEmptyResults}};
inline constexpr DocumentRole kNewResultsRole{
    "new results", {DocumentKind::kResults, DocumentKind::kEmptyResults}};
inline constexpr DocumentRole kUserDataRole{"user data",
                                            {DocumentKind::kResults, DocumentKind::kEmptyResults}};
inline constexpr DocumentRole kMachineResultsRole{
    "machine results", {DocumentKind::kMachineResults}, true};

DocumentKind KindOf(xml::Document& document);
// How a kind is named in messages: "a fingerprint database".
std::string_view KindName(DocumentKind kind);

// Fails with a CommandError naming `path`, what `role` expects and what the document is, when
// the document is of a kind the role does not accept.
void RequireKind(xml::Document& document, std::string_view path, const DocumentRole& role);

}  // namespace trl::cli
