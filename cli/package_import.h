#pragma once

#include <set>
#include <string>
#include <string_view>
#include <unordered_map>

#include "dpkg_database.h"
#include "trl/xml.h"

namespace trl::cli {

// Whether a package path only documents: anything below usr/share/doc, man, info, locale or
// lintian, wherever that usr/share stands.
bool IsDocumentationPath(std::string_view path);

// What an import did, for its summary.
struct ImportCounts {
  int added = 0, refreshed = 0, withoutFiles = 0, files = 0, missingOnDisk = 0;
};

// Describes package versions in a fingerprint database: one application per package instance
// (a_name "tar", or "libc6:amd64" for Multi-Arch: same), one version per package version, each
// file placed relative to the root folder "\". Ids already in the database never change: an
// application is found by a_name and a version by v_name; new ones take the next free id.
class PackageImporter {
 public:
  // `dpkg` gives the diversions and which paths several installed packages list; `root` is where
  // the files of installed packages are read from ("/", or a copy of a system).
  PackageImporter(xml::Document& database, const DpkgDatabase& dpkg, std::string root);

  // Adds the version, or describes an existing one again in its place (same v_id).
  void Import(const PackageVersion& version);
  // Numbers the versions of every application this import touched 1..n in Debian version order.
  void Finish();

  const ImportCounts& Counts() const { return counts_; }

 private:
  xml::Node Application(const std::string& name);
  void AddFiles(xml::Node v, const PackageVersion& version);

  xml::Document& database_;
  const Diversions& diversions_;
  std::unordered_map<std::string, std::string> owners_;  // path -> instance, "" for several
  std::string root_;
  xml::Node rootElement_;
  long nextAppId_ = 1;
  std::set<std::string> touched_;
  ImportCounts counts_;
};

}  // namespace trl::cli
