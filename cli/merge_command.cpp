#include "merge_command.h"

#include <memory>
#include <string>

#include "document_files.h"
#include "stage_command.h"
#include "trl/merge.h"

namespace trl::cli {
namespace {

struct MergeOptions {
  std::string searchOptions;
  std::string applicationOptions;
  std::string userData;
  std::string newResults;
  StageOptions stage;
};

int RunMerge(const MergeOptions& options) {
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

}  // namespace

std::function<int()> AddMergeCommand(CLI::App& app) {
  auto options = std::make_shared<MergeOptions>();
  CLI::App* command = app.add_subcommand(
      "merge", "Merge the results of a run into the user data kept from earlier runs");
  command
      ->add_option("--search-options", options->searchOptions,
                   "Search options document (which applications are managed, and where)")
      ->required();
  command->add_option("--application-options", options->applicationOptions,
                      "Application options document (which applications take part)");
  command->add_option("--user-data", options->userData, "User data kept from earlier runs")
      ->required();
  command
      ->add_option("--new-results", options->newResults,
                   "Results of the run just made (the filtered matches)")
      ->required();
  AddOutputOption(*command, options->stage);
  return [command, options] { return command->parsed() ? RunMerge(*options) : -1; };
}

}  // namespace trl::cli
