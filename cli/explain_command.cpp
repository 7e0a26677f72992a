#include "explain_command.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <string>

#include "command_error.h"
#include "document_files.h"
#include "explanation.h"
#include "explanation_output.h"
#include "filter_names.h"
#include "platform/text.h"
#include "stage_command.h"

namespace trl::cli {
namespace {

struct ExplainOptions {
  std::string matches, userData, fingerprint;
  std::string filter = "all";
  std::string application, folder;
  std::string format = "text";
  StageOptions stage;
};

// A folder as compared: lower case, without the separator at its end.
std::string FolderKey(std::string folder) {
  while (folder.size() > 1 && folder.ends_with('/')) folder.pop_back();
  return LowerCase(folder);
}

// Keeps the applications named (by name in any case, or by id) and in the folder asked for.
void Select(const ExplainOptions& options, Explanation& explanation) {
  std::string name = LowerCase(options.application);
  std::string folder, absolute;
  if (!options.folder.empty()) {
    // A folder of this computer may be given relative to the working folder.
    std::filesystem::path given(options.folder);
    folder = FolderKey(given.lexically_normal().string());
    absolute = FolderKey(std::filesystem::absolute(given).lexically_normal().string());
  }
  std::erase_if(explanation.applications, [&](const ApplicationExplanation& app) {
    bool named = options.application.empty() || app.applicationId == options.application ||
                 LowerCase(app.application) == name;
    std::string here = FolderKey(app.folder);
    bool placed = options.folder.empty() || here == folder || here == absolute;
    return !named || !placed;
  });
}

int RunExplain(const ExplainOptions& options) {
  if (options.matches.empty() == options.userData.empty()) {
    throw CommandError("explain takes either --matches or --user-data");
  }
  int16_t filter = ParseFilterOptions(options.filter);
  auto fingerprint = LoadOptionalDocumentFile(options.fingerprint, kFingerprintRole);
  Explanation explanation;
  if (!options.matches.empty()) {
    auto matches = LoadDocumentFile(options.matches, kResultsRole);
    ReportPrinter printer(options.stage);
    explanation = ExplainMatches(*matches, filter, fingerprint.get());
  } else {
    auto userData = LoadDocumentFile(options.userData, kUserDataRole);
    explanation = ExplainUserData(*userData, fingerprint.get());
  }
  Select(options, explanation);
  std::string text =
      options.format == "json" ? ExplanationJson(explanation) : ExplanationText(explanation);
  if (text.ends_with('\n')) text.pop_back();
  WriteTextOutput(text, options.stage.output);
  return kExitOk;
}

}  // namespace

std::function<int()> AddExplainCommand(CLI::App& app) {
  auto options = std::make_shared<ExplainOptions>();
  CLI::App* command = app.add_subcommand(
      "explain",
      "Tell why each application got its verdict: every version considered, its score and "
      "files, and the filter rule that removed it");
  command->add_option("--matches", options->matches,
                      "Matches of a compare (compare --explain also keeps the versions it took "
                      "back and the values that disagreed); the filter rules are replayed on it");
  command->add_option("--user-data", options->userData,
                      "User data saved by locate --save: the saved verdicts, without replaying");
  command->add_option("--fingerprint", options->fingerprint,
                      "Fingerprint database, to name the properties behind each file's score");
  command
      ->add_option("--filter", options->filter,
                   "The rules to replay on the matches, as locate takes them: " +
                       std::string(kFilterOptionsForm))
      ->capture_default_str();
  command->add_option("--app", options->application,
                      "Only this application: its name (any case) or its id");
  command->add_option("--folder", options->folder, "Only the applications in this folder");
  command->add_option("--format", options->format, "text: plain sentences; json: for scripts")
      ->check(CLI::IsMember({"text", "json"}))
      ->capture_default_str();
  AddOutputOption(*command, options->stage);
  return [command, options] { return command->parsed() ? RunExplain(*options) : -1; };
}

}  // namespace trl::cli
