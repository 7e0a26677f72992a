#include "collect_command.h"

#include <fmt/format.h>
#include <unistd.h>

#include <array>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "command_error.h"
#include "document_files.h"
#include "filter_names.h"
#include "frame/vocabulary.h"
#include "machine_results.h"
#include "native_path.h"
#include "path_search_options.h"
#include "platform/text.h"
#include "stage_command.h"
#include "trl/compare.h"
#include "trl/filter.h"
#include "trl/search.h"

namespace trl::cli {
namespace {

struct CollectOptions {
  std::vector<std::string> paths, excluded;
  std::string searchOptions, applicationOptions, fingerprint, computer;
  std::string filter = "all";
  StageOptions stage;
};

std::string ThisHostName() {
  std::array<char, 256> name{};
  if (::gethostname(name.data(), name.size() - 1) != 0 || name[0] == '\0') {
    throw CommandError("this machine has no host name: give --computer NAME");
  }
  return name.data();
}

// Gives each application folder of this machine the letter case its names have on disk: the
// compare writes them lower-cased, and where the inventory is shown, the disk cannot be asked.
void SpellFoldersAsOnDisk(xml::Document& results) {
  for (xml::Node d : results.AsNode().SelectNodes("/*/c[@c_local='1']/m[@m_text='']/d")) {
    auto folder = d.GetAttribute(vocab::d_text);
    if (!folder) continue;
    std::string spelt = "\\";
    for (const auto& part : std::filesystem::path(NativePath(*folder))) {
      if (part != "/" && !part.empty()) spelt += NameFromNative(part.native()) + "\\";
    }
    d.SetAttribute(vocab::d_text, spelt);
  }
}

// The document a stage gave as text, for the next stage.
xml::DocumentPtr Loaded(const std::string& text, std::string_view stage) {
  auto document = std::make_shared<xml::Document>();
  if (text.empty() || !document->LoadXml(text)) {
    throw CommandError(fmt::format("the {} produced no document", stage), kExitFailed);
  }
  return document;
}

int RunCollect(const CollectOptions& options) {
  if (options.paths.empty() == options.searchOptions.empty()) {
    throw CommandError("give the folders to search or --search-options (one of them)");
  }
  int16_t filter = ParseFilterOptions(options.filter);
  std::string computer = options.computer.empty() ? ThisHostName() : options.computer;
  auto searchOptions = GivenSearchOptions(options.paths, options.searchOptions, options.excluded);
  auto applicationOptions =
      LoadOptionalDocumentFile(options.applicationOptions, kApplicationOptionsRole);
  auto fingerprint = LoadDocumentFile(options.fingerprint, kFingerprintRole);

  ReportPrinter printer(options.stage);
  CacheForRun cache(options.stage.cache, options.stage.quiet, options.stage.verbose);
  // The stages of a locate run but the merge, one after another, each given what the one before
  // it gave; the merge is the fleet's, made once for every machine.
  Search search(FileSystemWithShares(options.stage.shares));
  search.Asynchronous(false);
  auto localFiles = Loaded(search.Start(searchOptions, applicationOptions, fingerprint), "search");
  Compare compare(FileSystemWithShares(options.stage.shares));
  compare.Asynchronous(false);
  auto matches = Loaded(compare.Start(applicationOptions, localFiles, fingerprint), "compare");
  localFiles.reset();
  Filter filtering;
  filtering.Asynchronous(false);
  if (filtering.Start(filter, matches).empty()) {
    throw CommandError("the filter produced no document", kExitFailed);
  }

  SpellFoldersAsOnDisk(*matches);
  xml::DocumentPtr machine = MachineResults(computer, *searchOptions, *matches);
  TextPieces text = [&](const auto& put) { machine->WriteXml(put); };
  if (options.stage.output.ends_with(".gz")) {
    ReplaceFileAtomically(options.stage.output, text,
                          {.keepBackup = false, .throughLink = false, .compress = true});
  } else {
    WriteTextOutput(text, options.stage.output);
  }
  return printer.Failures() > 0 ? kExitFailuresReported : kExitOk;
}

}  // namespace

std::function<int()> AddCollectCommand(CLI::App& app) {
  auto options = std::make_shared<CollectOptions>();
  CLI::App* command = app.add_subcommand(
      "collect",
      "On one machine of a fleet: search, compare and filter, and write the machine's results "
      "for a central merge");
  AddFolderOptions(*command, options->paths, options->searchOptions, options->excluded);
  command->add_option("--application-options", options->applicationOptions,
                      "Application options document (which applications take part)");
  command->add_option("--fingerprint", options->fingerprint, "Fingerprint database")->required();
  command
      ->add_option("--filter", options->filter, "Filter rules: " + std::string(kFilterOptionsForm))
      ->capture_default_str();
  command->add_option("--computer", options->computer,
                      "The machine's name in the fleet's inventory (default: its host name)");
  AddShareOption(*command, options->stage);
  AddCacheOptions(*command, options->stage.cache);
  AddOutputOption(*command, options->stage);
  command->footer(
      "An --output FILE ending in .gz is written gzip-compressed. Exit codes: 0 done; 1 the run "
      "did not complete or its output could not be written; 2 a bad command line or input "
      "document; 3 done, but failures were reported.");
  return [command, options] { return command->parsed() ? RunCollect(*options) : -1; };
}

}  // namespace trl::cli
