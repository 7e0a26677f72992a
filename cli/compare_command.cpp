#include "compare_command.h"

#include <memory>
#include <string>

#include "document_files.h"
#include "stage_command.h"
#include "trl/compare.h"

namespace trl::cli {
namespace {

struct CompareOptions {
  std::string applicationOptions;
  std::string localFiles;
  std::string fingerprint;
  bool explain = false;
  StageOptions stage;
};

int RunCompare(const CompareOptions& options) {
  auto applicationOptions =
      LoadOptionalDocumentFile(options.applicationOptions, kApplicationOptionsRole);
  auto localFiles = LoadDocumentFile(options.localFiles, kLocalFilesRole);
  auto fingerprint = LoadDocumentFile(options.fingerprint, kFingerprintRole);

  ReportPrinter printer(options.stage);
  CacheForRun cache(options.stage.cache, options.stage.quiet, options.stage.verbose);
  Compare compare(FileSystemWithShares(options.stage.shares));
  compare.Asynchronous(false);
  compare.Explaining(options.explain);
  std::string text = compare.Start(applicationOptions, localFiles, fingerprint);
  return WriteStageOutput(text, "compare", options.stage);
}

}  // namespace

std::function<int()> AddCompareCommand(CLI::App& app) {
  auto options = std::make_shared<CompareOptions>();
  CLI::App* command = app.add_subcommand(
      "compare", "Match the fingerprints against the local files a search recorded");
  command->add_option("--application-options", options->applicationOptions,
                      "Application options document (which applications take part)");
  command->add_option("--local-files", options->localFiles, "Local-files document of a search")
      ->required();
  command->add_option("--fingerprint", options->fingerprint, "Fingerprint database")->required();
  command->add_flag("--explain", options->explain,
                    "Keep in the matches, for trllocator explain, the versions taken back for "
                    "lack of a weighted file and the values of properties that disagreed");
  AddShareOption(*command, options->stage);
  AddCacheOptions(*command, options->stage.cache);
  AddOutputOption(*command, options->stage);
  return [command, options] { return command->parsed() ? RunCompare(*options) : -1; };
}

}  // namespace trl::cli
