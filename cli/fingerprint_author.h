#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/fs/file_system.h"
#include "trl/xml.h"

namespace trl::cli {

// One version of an application, to be described in a fingerprint database from a reference
// installation of it.
struct ReferenceVersion {
  std::string folder;  // the installation, in the component's "\" form
  std::string appId;
  std::optional<std::string> appName;  // needed when the application is new
  std::optional<std::string> parentId;
  std::string versionId;
  std::string versionName;
  std::string seq;
  int docWeight = 0;     // files that only document the application
  int fileWeight = 1;    // every other file
  bool replace = false;  // an existing version with the same id gives way instead of failing
};

// Whether a file only documents its application (README*, CHANGELOG*, LICENSE*, *.md, any letter
// case): installers often leave such files out, so they should not decide a match.
bool IsDocumentationFile(std::string_view name);

// Adds the version to `database`: the application element with the version's app id under the
// root, or a new one, and under it one `v` holding an `f` per file below the folder (sorted by
// name, a folder's files before its subfolders), with the file's folder relative to the
// installation as f_relpath and its size and MD5 digest as properties. A version id the application
// already holds is a CommandError unless `replace` is set, and so is a folder that cannot be read
// or holds no file. Answers the new `v`.
xml::Node AddReferenceVersion(xml::Document& database, const ReferenceVersion& version,
                              fs::FileSystem& fileSystem);

}  // namespace trl::cli
