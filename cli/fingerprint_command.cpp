#include "fingerprint_command.h"

#include <fmt/format.h>

#include <charconv>
#include <cstdint>
#include <filesystem>
#include <limits>
#include <memory>
#include <optional>
#include <string>

#include "atomic_file.h"
#include "cache_option.h"
#include "command_error.h"
#include "document_files.h"
#include "fingerprint_author.h"
#include "fingerprint_writer.h"
#include "frame/vocabulary.h"
#include "import_dpkg_command.h"
#include "platform/failure.h"
#include "platform/fs/posix/posix_file_system.h"
#include "platform/text.h"
#include "save_lock.h"

namespace trl::cli {
namespace {

// Ids and sequence numbers: whole numbers a 32-bit conversion of the document text accepts.
const CLI::Validator kWholeNumber(
    [](std::string& text) -> std::string {
      int32_t value = 0;
      auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
      if (error == std::errc() && end == text.data() + text.size() && value >= 0) return "";
      return fmt::format("'{}' is not a whole number from 0 to {}", text,
                         std::numeric_limits<int32_t>::max());
    },
    "0..2147483647");

struct FingerprintAddOptions {
  std::string folder;
  int32_t appId = 0;
  std::string appName;
  int32_t versionId = 0;
  std::string versionName;
  int32_t seq = 0;
  std::optional<int32_t> parent;
  std::string database;
  int docWeight = 0;
  int fileWeight = 1;
  bool replace = false;
  CacheOptions cache;
};

// The folder at a native path in the component's "\" form, names made XML-safe as the file system
// layer gives them.
std::string ComponentFolder(const std::string& native) {
  std::error_code error;
  if (!std::filesystem::is_directory(native, error)) {
    throw CommandError(fmt::format("the folder '{}' does not exist or is not a folder", native));
  }
  std::filesystem::path absolute = std::filesystem::absolute(native).lexically_normal();
  std::string path;
  for (const auto& part : absolute.relative_path()) {
    if (!part.empty()) path += "\\" + NameFromNative(part.native());
  }
  return path.empty() ? "\\" : path;
}

int RunFingerprintAdd(const FingerprintAddOptions& options, bool appNameGiven) {
  ReferenceVersion version;
  version.folder = ComponentFolder(options.folder);
  version.appId = std::to_string(options.appId);
  if (appNameGiven) version.appName = options.appName;
  if (options.parent) version.parentId = std::to_string(*options.parent);
  version.versionId = std::to_string(options.versionId);
  version.versionName = options.versionName;
  version.seq = std::to_string(options.seq);
  version.docWeight = options.docWeight;
  version.fileWeight = options.fileWeight;
  version.replace = options.replace;

  SaveLock lock(options.database);
  xml::DocumentPtr database = LoadOrCreateDatabase(options.database);
  auto fileSystem = fs::CreatePosixFileSystem({});
  CacheForRun cache(options.cache, false, false);
  xml::Node v;
  try {
    v = AddReferenceVersion(*database, version, *fileSystem);
  } catch (const Failure& failure) {
    // A name or id that XML cannot carry (control characters, bytes that are not UTF-8).
    throw CommandError(
        fmt::format("cannot describe the version: {}; nothing was written", failure.what()));
  }
  ReplaceFileAtomically(options.database, database->Xml(), {});
  fmt::print("{}: application {}, version {} ({}): {} files\n", options.database, version.appId,
             version.versionId, version.versionName, v.CountChildElements(vocab::f));
  return kExitOk;
}

}  // namespace

std::function<int()> AddFingerprintCommand(CLI::App& app) {
  auto options = std::make_shared<FingerprintAddOptions>();
  CLI::App* group = app.add_subcommand("fingerprint", "Author a fingerprint database");
  group->require_subcommand(1);
  CLI::App* add = group->add_subcommand(
      "add", "Describe one version of an application from a reference installation of it");
  add->add_option("--folder", options->folder, "The installed version's folder")->required();
  add->add_option("--app-id", options->appId, "Application id (a_id)")
      ->required()
      ->check(kWholeNumber);
  CLI::Option* appName = add->add_option("--app-name", options->appName,
                                         "Application name (a_name), needed for a new application");
  add->add_option("--version-id", options->versionId, "Version id (v_id)")
      ->required()
      ->check(kWholeNumber);
  add->add_option("--version-name", options->versionName, "Version name (v_name)")->required();
  add->add_option("--seq", options->seq, "Position of the version in release order (v_seq)")
      ->required()
      ->check(kWholeNumber);
  add->add_option("--parent", options->parent,
                  "Parent application id (a_parent), for a new application")
      ->check(kWholeNumber);
  add->add_option("--database", options->database,
                  "Fingerprint database file, created when missing")
      ->required();
  add->add_option("--doc-weight", options->docWeight,
                  "Weight of README*, CHANGELOG*, LICENSE* and *.md files")
      ->capture_default_str()
      ->check(CLI::Range(0, 15));
  add->add_option("--file-weight", options->fileWeight, "Weight of every other file")
      ->capture_default_str()
      ->check(CLI::Range(0, 15));
  add->add_flag("--replace", options->replace,
                "Describe a version the application already has "
                "again instead of failing");
  AddCacheOptions(*add, options->cache);
  std::function<int()> importDpkg = AddImportDpkgCommand(*group);
  return [add, appName, options, importDpkg] {
    return add->parsed() ? RunFingerprintAdd(*options, appName->count() > 0) : importDpkg();
  };
}

}  // namespace trl::cli
