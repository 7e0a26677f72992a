#include "search_command.h"

#include <exception>
#include <memory>
#include <string>
#include <vector>

#include "command_error.h"
#include "document_files.h"
#include "path_search_options.h"
#include "stage_command.h"
#include "trl/search.h"

namespace trl::cli {
namespace {

struct SearchOptions {
  std::vector<std::string> paths, excluded;
  std::string searchOptions;
  std::string applicationOptions;
  std::string fingerprint;
  std::string results;
  StageOptions stage;
};

int RunSearch(const SearchOptions& options) {
  if (options.paths.empty() == options.searchOptions.empty()) {
    throw CommandError("give the folders to search or --search-options (one of them)");
  }
  auto searchOptions = GivenSearchOptions(options.paths, options.searchOptions, options.excluded);
  auto applicationOptions =
      LoadOptionalDocumentFile(options.applicationOptions, kApplicationOptionsRole);
  auto fingerprint = LoadOptionalDocumentFile(options.fingerprint, kFingerprintRole);
  auto results = LoadOptionalDocumentFile(options.results, kLocalFilesRole);

  ReportPrinter printer(options.stage);
  CacheForRun cache(options.stage.cache, options.stage.quiet, options.stage.verbose);
  Search search(FileSystemWithShares(options.stage.shares));
  search.Asynchronous(false);
  // The document goes out as it is printed: its text is never held whole beside it.
  bool written = false;
  std::exception_ptr writeFailure;
  search.ResultsWriter([&](const xml::Document& document) {
    try {
      WriteTextOutput([&](const auto& put) { document.WriteXml(put); }, options.stage.output);
      written = true;
    } catch (...) {
      writeFailure = std::current_exception();
    }
  });
  std::string text = search.Start(searchOptions, applicationOptions, fingerprint, results);
  if (writeFailure) std::rethrow_exception(writeFailure);
  return written ? kExitOk : WriteStageOutput(text, "search", options.stage);
}

}  // namespace

std::function<int()> AddSearchCommand(CLI::App& app) {
  auto options = std::make_shared<SearchOptions>();
  CLI::App* command =
      app.add_subcommand("search", "Walk the folders of the search options and record the files");
  AddFolderOptions(*command, options->paths, options->searchOptions, options->excluded);
  command->add_option("--application-options", options->applicationOptions,
                      "Application options document (which applications take part)");
  command->add_option("--fingerprint", options->fingerprint,
                      "Fingerprint database (for the applications the search options probe)");
  command->add_option("--results", options->results,
                      "A local-files document to add to (its ids are continued)");
  AddShareOption(*command, options->stage);
  AddCacheOptions(*command, options->stage.cache);
  AddOutputOption(*command, options->stage);
  return [command, options] { return command->parsed() ? RunSearch(*options) : -1; };
}

}  // namespace trl::cli
