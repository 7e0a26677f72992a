#include "fingerprint_author.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <memory>
#include <vector>

#include "command_error.h"
#include "fingerprint_writer.h"
#include "frame/vocabulary.h"
#include "platform/failure.h"
#include "platform/text.h"
#include "schema/schema.h"

namespace trl::cli {
namespace {

template <class Item>
std::vector<Item*> SortedByName(const fs::Collection<Item>& items) {
  std::vector<Item*> sorted;
  for (const auto& item : items) sorted.push_back(item.get());
  std::sort(sorted.begin(), sorted.end(),
            [](const Item* x, const Item* y) { return x->Name() < y->Name(); });
  return sorted;
}

// Writes the `f` elements of one reference installation under a version.
class VersionWriter {
 public:
  VersionWriter(const ReferenceVersion& version, xml::Node v) : version_(version), v_(v) {}

  // The files of `folder`, then those of its subfolders, each level sorted by name; `relpath` is
  // the folder below the installation ("" for the installation itself).
  void AddFolder(fs::Folder& folder, const std::string& relpath) {
    try {
      for (const fs::File* file : SortedByName(folder.Files())) AddFile(*file, relpath);
      for (fs::Folder* sub : SortedByName(folder.SubFolders())) {
        AddFolder(*sub, relpath.empty() ? sub->Name() : relpath + "\\" + sub->Name());
      }
    } catch (const Failure& failure) {
      throw CommandError(
          fmt::format("cannot read the folder '{}': {}", folder.Path(), failure.description));
    }
  }

  int FileCount() const { return fileId_; }

 private:
  void AddFile(const fs::File& file, const std::string& relpath) {
    std::string size, digest;
    try {
      size = std::to_string(schema_.ReadPropertyType2(file));
      digest = schema_.ReadPropertyType3(file);
    } catch (const Failure& failure) {
      throw CommandError(
          fmt::format("cannot read the file '{}': {}", file.Path(), failure.description));
    }
    std::string name = file.Name();
    int weight = IsDocumentationFile(name) ? version_.docWeight : version_.fileWeight;
    xml::Node f = AppendFileElement(v_, ++fileId_, name, relpath, weight);
    AppendSizeProperty(f, size);
    AppendDigestProperty(f, digest);
  }

  const ReferenceVersion& version_;
  xml::Node v_;
  Schema schema_;
  int fileId_ = 0;
};

}  // namespace

bool IsDocumentationFile(std::string_view name) {
  std::string lower = LowerCase(name);
  static constexpr std::array<std::string_view, 3> kPrefixes{"readme", "changelog", "license"};
  return lower.ends_with(".md") || std::any_of(kPrefixes.begin(), kPrefixes.end(),
                                               [&](auto p) { return lower.starts_with(p); });
}

xml::Node AddReferenceVersion(xml::Document& database, const ReferenceVersion& version,
                              fs::FileSystem& fileSystem) {
  xml::Node root = DatabaseRoot(database);
  xml::Node application = database.FindChild(root, vocab::a, vocab::a_id, version.appId);
  xml::Node old;
  if (application) old = database.FindChild(application, vocab::v, vocab::v_id, version.versionId);
  if (old && !version.replace) {
    throw CommandError(
        fmt::format("application {} already has a version {}; give --replace to describe it again",
                    version.appId, version.versionId));
  }
  if (!application && !version.appName) {
    throw CommandError(
        fmt::format("application {} is not in the database; give its --app-name", version.appId));
  }

  std::unique_ptr<fs::Folder> folder;
  try {
    folder = fileSystem.GetFolder(version.folder);
  } catch (const Failure& failure) {
    throw CommandError(
        fmt::format("cannot read the folder '{}': {}", version.folder, failure.description));
  }
  // Built aside, so that a folder that cannot be read leaves the database as it was.
  xml::Node v = database.CreateElement(vocab::v);
  v.SetAttribute(vocab::v_id, version.versionId);
  v.SetAttribute(vocab::v_name, version.versionName);
  v.SetAttribute(vocab::v_seq, version.seq);
  VersionWriter writer(version, v);
  writer.AddFolder(*folder, "");
  if (writer.FileCount() == 0) {
    throw CommandError(fmt::format("the folder '{}' holds no file", version.folder));
  }

  if (!application) {
    application = root.AppendElement(
        vocab::a, {{vocab::a_id, version.appId}, {vocab::a_name, *version.appName}});
    if (version.parentId) application.SetAttribute(vocab::a_parent, *version.parentId);
  }
  return old ? application.ReplaceChild(v, old) : application.AppendChild(v);
}

}  // namespace trl::cli
