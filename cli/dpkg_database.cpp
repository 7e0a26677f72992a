#include "dpkg_database.h"

#include <fmt/format.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>

#include "command_error.h"

namespace trl::cli {
namespace {

// Each line of `text`, without its line end.
template <class Visit>
void ForEachLine(std::string_view text, Visit visit) {
  while (!text.empty()) {
    size_t end = text.find('\n');
    visit(text.substr(0, end));
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
  }
}

std::string_view Trim(std::string_view text) {
  size_t first = text.find_first_not_of(" \t");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t") + 1 - first);
}

std::string Field(const ControlFields& fields, const std::string& name) {
  auto it = fields.find(name);
  return it == fields.end() ? std::string() : it->second;
}

bool IsInstalled(const ControlFields& fields) {
  // "install ok installed", or "hold ok installed" for a package kept at its version.
  std::string status = Field(fields, "Status");
  return status.ends_with(" ok installed");
}

std::string MissingFileMessage(const std::string& path) {
  return fmt::format("cannot read the package database file '{}': {}", path, std::strerror(errno));
}

}  // namespace

std::string RelativePackagePath(std::string_view path) {
  if (path.starts_with("./")) path.remove_prefix(2);
  while (path.starts_with('/')) path.remove_prefix(1);
  return std::string(path);
}

std::string PackageVersion::Instance() const {
  return multiArchSame ? package + ":" + architecture : package;
}

std::vector<ControlFields> ParseControlStanzas(std::string_view text) {
  std::vector<ControlFields> stanzas(1);
  std::string* last = nullptr;
  ForEachLine(text, [&](std::string_view line) {
    if (Trim(line).empty()) {
      if (!stanzas.back().empty()) stanzas.emplace_back();
      last = nullptr;
    } else if (line.front() == ' ' || line.front() == '\t') {
      if (last) *last += "\n" + std::string(Trim(line));
    } else if (size_t colon = line.find(':'); colon != std::string_view::npos) {
      last = &stanzas.back()[std::string(line.substr(0, colon))];
      *last = Trim(line.substr(colon + 1));
    }
  });
  if (stanzas.back().empty()) stanzas.pop_back();
  return stanzas;
}

PackageVersion VersionFromControl(const ControlFields& fields) {
  PackageVersion version;
  version.package = Field(fields, "Package");
  version.architecture = Field(fields, "Architecture");
  version.version = Field(fields, "Version");
  version.multiArchSame = Field(fields, "Multi-Arch") == "same";
  return version;
}

void AddMd5sums(PackageVersion& version, std::string_view text) {
  constexpr size_t kDigestLength = 32;
  ForEachLine(text, [&](std::string_view line) {
    if (line.size() <= kDigestLength + 2) return;
    std::string digest(line.substr(0, kDigestLength));
    for (char& c : digest) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    version.files.push_back(
        {RelativePackagePath(line.substr(kDigestLength + 2)), digest, std::nullopt, false});
  });
}

void AddConffile(PackageVersion& version, std::string_view path, std::string_view digest) {
  std::string relative = RelativePackagePath(path);
  for (PackageFile& file : version.files) {
    if (file.path == relative) {
      file.conffile = true;
      if (!digest.empty()) file.digest = digest;
      return;
    }
  }
  version.files.push_back({relative, std::string(digest), std::nullopt, true});
}

std::optional<std::string> ReadWholeFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return std::nullopt;
  return std::string(std::istreambuf_iterator<char>(in), {});
}

DpkgDatabase::DpkgDatabase(const std::string& adminDir) {
  std::string statusPath = adminDir + "/status";
  std::optional<std::string> status = ReadWholeFile(statusPath);
  if (!status) throw CommandError(MissingFileMessage(statusPath));
  for (const ControlFields& fields : ParseControlStanzas(*status)) {
    if (!IsInstalled(fields)) continue;
    PackageVersion version = VersionFromControl(fields);
    version.installed = true;
    std::string info = adminDir + "/info/";
    auto md5sums = ReadWholeFile(info + version.package + ":" + version.architecture + ".md5sums");
    if (!md5sums) md5sums = ReadWholeFile(info + version.package + ".md5sums");
    if (md5sums) AddMd5sums(version, *md5sums);
    // " /etc/foo.conf <md5>", and a third word for a conffile the package no longer ships.
    ForEachLine(Field(fields, "Conffiles"), [&](std::string_view line) {
      line = Trim(line);
      size_t space = line.find(' ');
      if (space == std::string_view::npos || line.find(' ', space + 1) != std::string_view::npos)
        return;
      AddConffile(version, line.substr(0, space), line.substr(space + 1));
    });
    installed_.push_back(std::move(version));
  }

  // Three lines per diversion: the original path, where it went, and the package that made it.
  std::string lines[3];
  int at = 0;
  ForEachLine(ReadWholeFile(adminDir + "/diversions").value_or(""), [&](std::string_view line) {
    lines[at++] = line;
    if (at < 3) return;
    at = 0;
    diversions_[RelativePackagePath(lines[0])] = {RelativePackagePath(lines[1]), lines[2]};
  });
}

}  // namespace trl::cli
