#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace trl::cli {

// A regular file of a package, as the package records it.
struct PackageFile {
  std::string path;              // relative to the root, "/"-separated: "usr/bin/tar"
  std::string digest;            // MD5 in lower-case hex; empty when the package gives none
  std::optional<uint64_t> size;  // known from a .deb's listing; an installed file's is on disk
  bool conffile = false;
};

// One version of a package: an installed one, or one in a .deb.
struct PackageVersion {
  std::string package, architecture, version;
  bool multiArchSame = false;
  bool installed = false;
  std::vector<PackageFile> files;

  // Instances of a Multi-Arch: same package for several architectures are different installs, so
  // they carry the architecture, as the package manager names them: "libc6:amd64".
  std::string Instance() const;
};

// The fields of one control stanza ("Package: tar"); a continuation line is kept with its field.
using ControlFields = std::unordered_map<std::string, std::string>;
std::vector<ControlFields> ParseControlStanzas(std::string_view text);
// A version's package, architecture, version and Multi-Arch from its control fields.
PackageVersion VersionFromControl(const ControlFields& fields);

// The lines "<md5>  <path>" of an md5sums file, as files of `version`.
void AddMd5sums(PackageVersion& version, std::string_view text);
// Marks `path` (absolute or relative) as a conffile of `version`, adding it when not listed yet;
// `digest` is its packaged MD5 when known.
void AddConffile(PackageVersion& version, std::string_view path, std::string_view digest);

// Where dpkg moved a path for every package but `by` (":" for a local diversion).
struct Diversion {
  std::string to, by;
};
using Diversions = std::unordered_map<std::string, Diversion>;  // by original path, relative

// The package manager's records under its admin dir (/var/lib/dpkg).
class DpkgDatabase {
 public:
  // Reads the status file and, for each installed package, its md5sums; a status file that cannot
  // be read is a CommandError.
  explicit DpkgDatabase(const std::string& adminDir);

  const std::vector<PackageVersion>& Installed() const { return installed_; }
  const Diversions& Diverted() const { return diversions_; }

 private:
  std::vector<PackageVersion> installed_;
  Diversions diversions_;
};

// A path as packages write it ("/usr/bin/tar", "./usr/bin/tar") relative to the root:
// "usr/bin/tar".
std::string RelativePackagePath(std::string_view path);

// The text of a whole file, or nothing when it cannot be read.
std::optional<std::string> ReadWholeFile(const std::string& path);

}  // namespace trl::cli
