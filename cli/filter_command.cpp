#include "filter_command.h"

#include <memory>
#include <string>

#include "document_files.h"
#include "filter_names.h"
#include "stage_command.h"
#include "trl/filter.h"

namespace trl::cli {
namespace {

struct FilterOptions {
  std::string filter;
  std::string matches;
  StageOptions stage;
};

int RunFilter(const FilterOptions& options) {
  int16_t filterOptions = ParseFilterOptions(options.filter);
  auto matches = LoadDocumentFile(options.matches, kResultsRole);

  ReportPrinter printer(options.stage);
  Filter filter;
  filter.Asynchronous(false);
  std::string text = filter.Start(filterOptions, matches);
  return WriteStageOutput(text, "filter", options.stage);
}

}  // namespace

std::function<int()> AddFilterCommand(CLI::App& app) {
  auto options = std::make_shared<FilterOptions>();
  CLI::App* command = app.add_subcommand(
      "filter", "Reduce each matched application to the versions the filter rules let stand");
  command
      ->add_option("--filter", options->filter,
                   "The rules to apply: " + std::string(kFilterOptionsForm))
      ->required();
  command->add_option("--matches", options->matches, "Matches document of a compare")->required();
  AddOutputOption(*command, options->stage);
  return [command, options] { return command->parsed() ? RunFilter(*options) : -1; };
}

}  // namespace trl::cli
