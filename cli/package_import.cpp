#include "package_import.h"

#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <tuple>
#include <utility>
#include <vector>

#include "debian_version.h"
#include "fingerprint_writer.h"
#include "frame/vocabulary.h"
#include "platform/text.h"

namespace trl::cli {
namespace {

long NumberOf(const xml::Node& node, std::string_view attribute) {
  return std::atol(node.GetAttribute(attribute).value_or("0").c_str());
}

// A file as the fingerprint holds it: its folder below "\" and its name, in the component's form.
struct PlacedFile {
  std::string relpath, name;
  int weight = 1;
  bool documentation = false;  // and neither a conffile nor shared
  const PackageFile* file;
  std::optional<uint64_t> size;
};

std::pair<std::string, std::string> SplitPlace(std::string_view path) {
  std::string relpath;
  size_t slash = path.rfind('/');
  std::string_view folder = slash == std::string_view::npos ? "" : path.substr(0, slash);
  while (!folder.empty()) {
    size_t end = std::min(folder.find('/'), folder.size());
    if (end > 0) relpath += (relpath.empty() ? "" : "\\") + NameFromNative(folder.substr(0, end));
    folder.remove_prefix(std::min(end + 1, folder.size()));
  }
  return {relpath, NameFromNative(path.substr(slash + 1))};
}

}  // namespace

bool IsDocumentationPath(std::string_view path) {
  static constexpr std::array<std::string_view, 5> kFolders{"doc/", "man/", "info/", "locale/",
                                                            "lintian/"};
  for (size_t at = 0; (at = path.find("usr/share/", at)) != std::string_view::npos; ++at) {
    if (at > 0 && path[at - 1] != '/') continue;
    std::string_view rest = path.substr(at + 10);
    if (std::any_of(kFolders.begin(), kFolders.end(),
                    [&](std::string_view f) { return rest.starts_with(f); }))
      return true;
  }
  return false;
}

PackageImporter::PackageImporter(xml::Document& database, const DpkgDatabase& dpkg,
                                 std::string root)
    : database_(database),
      diversions_(dpkg.Diverted()),
      root_(std::move(root)),
      rootElement_(DatabaseRoot(database)) {
  for (const PackageVersion& version : dpkg.Installed()) {
    std::string instance = version.Instance();
    for (const PackageFile& file : version.files) {
      auto [it, added] = owners_.try_emplace(file.path, instance);
      if (!added && it->second != instance) it->second.clear();
    }
  }
  for (const xml::Node& a : rootElement_.ChildElements(vocab::a)) {
    nextAppId_ = std::max(nextAppId_, NumberOf(a, vocab::a_id) + 1);
  }
}

xml::Node PackageImporter::Application(const std::string& name) {
  xml::Node a = database_.FindChild(rootElement_, vocab::a, vocab::a_name, name);
  if (a) return a;
  return rootElement_.AppendElement(
      vocab::a, {{vocab::a_id, std::to_string(nextAppId_++)}, {vocab::a_name, name}});
}

void PackageImporter::Import(const PackageVersion& version) {
  if (version.files.empty()) {
    ++counts_.withoutFiles;
    return;
  }
  std::string instance = version.Instance();
  xml::Node a = Application(instance);
  touched_.insert(instance);
  xml::Node old = database_.FindChild(a, vocab::v, vocab::v_name, version.version);
  long id = 1;
  if (old) {
    id = NumberOf(old, vocab::v_id);
  } else {
    for (const xml::Node& v : a.ChildElements(vocab::v))
      id = std::max(id, NumberOf(v, vocab::v_id) + 1);
  }
  xml::Node v = database_.CreateElement(vocab::v);
  v.SetAttribute(vocab::v_id, std::to_string(id));
  v.SetAttribute(vocab::v_name, version.version);
  v.SetAttribute(vocab::v_seq, old ? old.GetAttribute(vocab::v_seq).value_or("0") : "0");
  AddFiles(v, version);
  if (old) {
    a.ReplaceChild(v, old);
    ++counts_.refreshed;
  } else {
    a.AppendChild(v);
    ++counts_.added;
  }
}

void PackageImporter::AddFiles(xml::Node v, const PackageVersion& version) {
  std::vector<PlacedFile> placed;
  placed.reserve(version.files.size());
  for (const PackageFile& file : version.files) {
    // Another package's diversion moved this file; the original path holds that package's file.
    std::string path = file.path;
    if (auto it = diversions_.find(path);
        it != diversions_.end() && it->second.by != version.package)
      path = it->second.to;
    auto [relpath, name] = SplitPlace(path);
    auto owner = owners_.find(file.path);
    bool shared = owner != owners_.end() && owner->second != version.Instance();
    bool documentation = IsDocumentationPath(file.path);
    bool weightless = file.conffile || shared || documentation;
    PlacedFile entry{std::move(relpath),
                     std::move(name),
                     weightless ? 0 : 1,
                     documentation && !file.conffile && !shared,
                     &file,
                     file.size};
    if (version.installed && !file.conffile) {
      struct stat info {};
      if (::stat((root_ + "/" + path).c_str(), &info) == 0 && S_ISREG(info.st_mode)) {
        entry.size = static_cast<uint64_t>(info.st_size);
      } else {
        ++counts_.missingOnDisk;
      }
    }
    placed.push_back(std::move(entry));
  }
  // A package of documentation only (a metapackage, a package of translations) is known by its
  // documentation: a version in which nothing weighs could never be scored.
  if (std::none_of(placed.begin(), placed.end(), [](const PlacedFile& p) { return p.weight; })) {
    for (PlacedFile& entry : placed) entry.weight = entry.documentation ? 1 : 0;
  }
  std::sort(placed.begin(), placed.end(), [](const PlacedFile& x, const PlacedFile& y) {
    return std::tie(x.relpath, x.name) < std::tie(y.relpath, y.name);
  });
  int id = 0;
  for (const PlacedFile& entry : placed) {
    xml::Node f = AppendFileElement(v, ++id, entry.name, entry.relpath, entry.weight);
    if (entry.size) AppendSizeProperty(f, std::to_string(*entry.size));
    if (!entry.file->digest.empty()) AppendDigestProperty(f, entry.file->digest);
  }
  counts_.files += id;
}

void PackageImporter::Finish() {
  for (const std::string& name : touched_) {
    xml::Node a = database_.FindChild(rootElement_, vocab::a, vocab::a_name, name);
    std::vector<xml::Node> versions = a.ChildElements(vocab::v);
    std::vector<std::string> names;
    for (const xml::Node& v : versions) names.push_back(v.GetAttribute(vocab::v_name).value_or(""));
    std::vector<size_t> order(versions.size());
    for (size_t i = 0; i < order.size(); ++i) order[i] = i;
    std::stable_sort(order.begin(), order.end(), [&](size_t x, size_t y) {
      return CompareDebianVersions(names[x], names[y]) < 0;
    });
    for (size_t seq = 0; seq < order.size(); ++seq) {
      versions[order[seq]].SetAttribute(vocab::v_seq, std::to_string(seq + 1));
    }
  }
}

}  // namespace trl::cli
