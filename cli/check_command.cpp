#include "check_command.h"

#include <fmt/format.h>

#include <memory>
#include <string>
#include <vector>

#include "command_error.h"
#include "document_check.h"
#include "document_files.h"

namespace trl::cli {
namespace {

constexpr DocumentRole kAnyRole{
    "document",
    {DocumentKind::kSearchOptions, DocumentKind::kApplicationOptions, DocumentKind::kFingerprint,
     DocumentKind::kLocalFiles, DocumentKind::kResults, DocumentKind::kEmptyResults,
     DocumentKind::kMachineResults, DocumentKind::kOther},
    true};

int Check(const std::vector<std::string>& files) {
  int status = kExitOk;
  for (const std::string& file : files) {
    xml::DocumentPtr document;
    try {
      document = LoadDocumentFile(file, kAnyRole);
    } catch (const CommandError& error) {
      fmt::print("{}: {}\n", file, error.what());
      status = kExitBadInput;
      continue;
    }
    DocumentKind kind = KindOf(*document);
    std::vector<std::string> findings = CheckDocument(*document, kind);
    fmt::print("{}: {}{}\n", file, KindName(kind), findings.empty() ? ", nothing wrong found" : "");
    for (const std::string& finding : findings) fmt::print("  {}\n", finding);
    if (!findings.empty() && status == kExitOk) status = kExitFailed;
  }
  return status;
}

}  // namespace

std::function<int()> AddCheckCommand(CLI::App& app) {
  auto files = std::make_shared<std::vector<std::string>>();
  CLI::App* command = app.add_subcommand(
      "check", "Say what kind each document is and what would go wrong when it is used");
  command->add_option("files", *files, "Documents to check")->required();
  command->footer("Exit codes: 0 nothing wrong; 1 something found; 2 a file could not be read.");
  return [command, files] { return command->parsed() ? Check(*files) : -1; };
}

}  // namespace trl::cli
