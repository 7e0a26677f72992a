#include "merge_command.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "command_error.h"
#include "document_files.h"
#include "frame/vocabulary.h"
#include "machine_results.h"
#include "path_search_options.h"
#include "save_lock.h"
#include "stage_command.h"
#include "terminal_text.h"
#include "trl/merge.h"

namespace trl::cli {
namespace {

struct MergeOptions {
  std::string searchOptions;
  std::string applicationOptions;
  std::string userData;
  std::string newResults;
  std::vector<std::string> machines;
  std::string machineList;
  bool save = false;
  StageOptions stage;
};

int RunMerge(const MergeOptions& options) {
  if (options.searchOptions.empty() || options.newResults.empty()) {
    throw CommandError(
        "give --search-options and --new-results, or the results of machines that collect wrote");
  }
  if (options.save) throw CommandError("--save is for the results of machines");
  auto searchOptions = LoadDocumentFile(options.searchOptions, kSearchOptionsRole);
  auto applicationOptions =
      LoadOptionalDocumentFile(options.applicationOptions, kApplicationOptionsRole);
  auto userData = LoadDocumentFile(options.userData, kUserDataRole);
  auto newResults = LoadDocumentFile(options.newResults, kNewResultsRole);

  ReportPrinter printer(options.stage);
  Merge merge;
  merge.Asynchronous(false);
  std::string text = merge.Start(searchOptions, applicationOptions, userData, newResults);
  return WriteStageOutput(text, "merge", options.stage);
}

// Says that a machine's results are left out of the merge, and why.
void LeaveOut(const CommandError& error, int& leftOut) {
  std::string why = error.what();
  // The merge goes on without them: the loader's "nothing was written" would mislead.
  constexpr std::string_view kNothingWritten = "; nothing was written";
  if (why.ends_with(kNothingWritten)) why.resize(why.size() - kNothingWritten.size());
  std::fprintf(stderr, "trllocator: %s; left out\n", Printable(why).c_str());
  ++leftOut;
}

// A machine's results file, and the machine it is of.
struct MachineFile {
  MachineName machine;
  std::string path;
};

// The results files in the order they are merged, by the machines' encoded names: the order
// they are given in does not matter. A file that cannot be read is said and left out.
std::vector<MachineFile> InMergeOrder(const std::vector<std::string>& paths, int& leftOut) {
  std::vector<MachineFile> files;
  for (const std::string& path : paths) {
    std::optional<MachineName> machine = MachineNameOf(path);
    try {
      // The beginning alone does not tell: the whole document does, or says what is wrong.
      if (!machine) {
        machine = SplitMachineResults(LoadDocumentFile(path, kMachineResultsRole), path).machine;
      }
      files.push_back({*machine, path});
    } catch (const CommandError& error) {
      LeaveOut(error, leftOut);
    }
  }
  std::stable_sort(files.begin(), files.end(), [](const MachineFile& x, const MachineFile& y) {
    return x.machine.name < y.machine.name;
  });
  for (size_t i = 1; i < files.size(); ++i) {
    if (files[i].machine.name == files[i - 1].machine.name) {
      throw CommandError(fmt::format(
          "'{}' and '{}' are both results of the machine '{}': give one of them; nothing was "
          "written",
          files[i - 1].path, files[i].path, files[i].machine.text));
    }
  }
  return files;
}

// The machines' results files named on the command line, then those the list names, one a line.
std::vector<std::string> MachineFiles(const MergeOptions& options) {
  std::vector<std::string> files = options.machines;
  if (options.machineList.empty()) return files;
  std::ifstream list(options.machineList);
  if (!list) {
    throw CommandError(fmt::format("cannot read the list of machine results '{}': {}",
                                   options.machineList, std::strerror(errno)));
  }
  for (std::string line; std::getline(list, line);) {
    if (!line.empty()) files.push_back(line);
  }
  return files;
}

int MergeMachines(const MergeOptions& options) {
  // Held from the reading of the user data to its replacing: a merge saving meanwhile would be
  // lost.
  std::optional<SaveLock> lock;
  if (options.save) lock.emplace(options.userData);
  xml::DocumentPtr userData;
  if (options.save && !std::filesystem::exists(options.userData)) {
    userData = std::make_shared<xml::Document>();
    userData->SetDocumentElement(userData->CreateElement(vocab::results_root));
  } else {
    userData = LoadDocumentFile(options.userData, kUserDataRole);
  }
  auto applicationOptions =
      LoadOptionalDocumentFile(options.applicationOptions, kApplicationOptionsRole);

  int leftOut = 0;
  std::vector<MachineFile> files = InMergeOrder(MachineFiles(options), leftOut);
  ReportPrinter printer(options.stage);
  Merge merge;
  merge.BeginSequence(applicationOptions, userData);
  size_t merged = 0;
  for (const MachineFile& file : files) {
    MachineRun run;
    try {
      run = SplitMachineResults(LoadDocumentFile(file.path, kMachineResultsRole), file.path);
      if (run.machine.name != file.machine.name) {
        throw CommandError(
            fmt::format("the machine results '{}' changed while they were read", file.path));
      }
    } catch (const CommandError& error) {
      LeaveOut(error, leftOut);
      continue;
    }
    ListManagedApplicationsByName(*run.searchOptions, *userData);
    merge.MergeNext(run.searchOptions, run.results);
    ++merged;
  }
  merge.EndSequence();

  TextPieces text = [&](const auto& put) { userData->WriteXml(put); };
  if (options.save) {
    // With nothing merged the file is left alone: even an upgrade would be a change of no run's.
    bool replaced = merged > 0 && ReplaceFileAtomically(options.userData, text,
                                                        {.keepBackup = true, .keepSame = true});
    if (!options.stage.quiet) {
      fmt::print(stderr, "trllocator: merged the results of {} machine{} into '{}'{}\n", merged,
                 merged == 1 ? "" : "s", options.userData, replaced ? "" : ", which is unchanged");
    }
  }
  if (!options.save || !options.stage.output.empty()) WriteTextOutput(text, options.stage.output);
  return leftOut > 0 || printer.Failures() > 0 ? kExitFailuresReported : kExitOk;
}

}  // namespace

std::function<int()> AddMergeCommand(CLI::App& app) {
  auto options = std::make_shared<MergeOptions>();
  CLI::App* command = app.add_subcommand(
      "merge",
      "Merge the results of a run, or of many machines, into the user data kept from "
      "earlier runs");
  command->add_option("machine-results", options->machines,
                      "Results of machines, as collect writes them (.xml or .xml.gz), merged in "
                      "the order of the machines' names, each into its own computer");
  CLI::Option* searchOptions =
      command->add_option("--search-options", options->searchOptions,
                          "Search options document (which applications are managed, and where)");
  command->add_option("--application-options", options->applicationOptions,
                      "Application options document (which applications take part)");
  command->add_option("--user-data", options->userData, "User data kept from earlier runs")
      ->required();
  CLI::Option* newResults = command->add_option(
      "--new-results", options->newResults, "Results of the run just made (the filtered matches)");
  CLI::Option* machineList = command->add_option(
      "--machine-list", options->machineList,
      "A file that names results of machines, one a line (for more than a command line holds)");
  for (CLI::Option* machines : {command->get_option("machine-results"), machineList}) {
    machines->excludes(searchOptions)->excludes(newResults);
  }
  command->add_flag("--save", options->save,
                    "With results of machines: replace the --user-data file with the merged "
                    "user data (atomically, unless nothing changed; the previous one is kept as "
                    "FILE.bak), and write it to --output only when that is given");
  AddOutputOption(*command, options->stage);
  return [command, options] {
    if (!command->parsed()) return -1;
    bool machines = !options->machines.empty() || !options->machineList.empty();
    return machines ? MergeMachines(*options) : RunMerge(*options);
  };
}

}  // namespace trl::cli
