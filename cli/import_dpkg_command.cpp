#include "import_dpkg_command.h"

#include <fmt/format.h>

#include <memory>
#include <string>
#include <vector>

#include "atomic_file.h"
#include "command_error.h"
#include "deb_archive.h"
#include "dpkg_database.h"
#include "fingerprint_writer.h"
#include "live_progress.h"
#include "package_import.h"
#include "save_lock.h"

namespace trl::cli {
namespace {

struct ImportDpkgOptions {
  bool all = false;
  std::vector<std::string> packages;
  std::vector<std::string> debs;
  std::string database;
  std::string adminDir = "/var/lib/dpkg";
  std::string root = "/";
};

// The installed versions the command line names: "tar", "libc6" (every architecture installed)
// or "libc6:i386".
std::vector<const PackageVersion*> Selected(const DpkgDatabase& dpkg,
                                            const ImportDpkgOptions& options) {
  std::vector<const PackageVersion*> selected;
  for (const PackageVersion& version : dpkg.Installed()) {
    if (options.all) selected.push_back(&version);
  }
  for (const std::string& name : options.packages) {
    size_t before = selected.size();
    for (const PackageVersion& version : dpkg.Installed()) {
      if (name == version.package || name == version.package + ":" + version.architecture)
        selected.push_back(&version);
    }
    if (selected.size() == before) {
      throw CommandError(fmt::format("the package '{}' is not installed", name));
    }
  }
  return selected;
}

int RunImportDpkg(const ImportDpkgOptions& options) {
  if (!options.all && options.packages.empty() && options.debs.empty()) {
    throw CommandError("name the packages to import, or give --all or --deb");
  }
  DpkgDatabase dpkg(options.adminDir);
  std::vector<const PackageVersion*> selected = Selected(dpkg, options);
  LiveProgress progress;
  std::vector<PackageVersion> archives;
  for (const std::string& deb : options.debs) {
    progress.Show("reading", deb);
    archives.push_back(ReadDebArchive(deb));
  }
  for (const PackageVersion& archive : archives) selected.push_back(&archive);

  SaveLock lock(options.database);
  xml::DocumentPtr database = LoadOrCreateDatabase(options.database);
  PackageImporter importer(*database, dpkg, options.root);
  for (size_t i = 0; i < selected.size(); ++i) {
    progress.Show("importing", fmt::format("{}/{} {} {}", i + 1, selected.size(),
                                           selected[i]->Instance(), selected[i]->version));
    importer.Import(*selected[i]);
  }
  importer.Finish();
  progress.Show("writing", options.database);
  std::string text = database->Xml();
  ReplaceFileAtomically(options.database, text, {});
  progress.Clear();

  const ImportCounts& counts = importer.Counts();
  fmt::print("{}: {} versions added, {} described again, {} files ({} not on disk)",
             options.database, counts.added, counts.refreshed, counts.files, counts.missingOnDisk);
  if (counts.withoutFiles > 0)
    fmt::print("; {} packages without files left out", counts.withoutFiles);
  fmt::print("\n");
  return kExitOk;
}

}  // namespace

std::function<int()> AddImportDpkgCommand(CLI::App& group) {
  auto options = std::make_shared<ImportDpkgOptions>();
  CLI::App* command = group.add_subcommand(
      "import-dpkg",
      "Describe installed Debian packages, and .deb files, in a fingerprint database");
  command->add_option("packages", options->packages,
                      "Installed packages to describe (NAME or NAME:ARCH)");
  command->add_flag("--all", options->all, "Describe every installed package");
  command->add_option("--deb", options->debs, "A .deb file whose version to describe too")
      ->check(CLI::ExistingFile);
  command
      ->add_option("--database", options->database,
                   "Fingerprint database file, created when missing")
      ->required();
  command->add_option("--admindir", options->adminDir, "The package manager's records")
      ->capture_default_str();
  command->add_option("--root", options->root, "Where installed files are read from")
      ->capture_default_str();
  return [command, options] { return command->parsed() ? RunImportDpkg(*options) : -1; };
}

}  // namespace trl::cli
