#include "inventory_command.h"

#include <memory>
#include <string>

#include "command_error.h"
#include "document_files.h"
#include "findings_output.h"
#include "findings_table.h"

namespace trl::cli {
namespace {

struct InventoryOptions {
  std::string userData, fingerprint;
  FindingsFormat shown{.format = "table"};
};

int ShowInventory(const InventoryOptions& options) {
  auto userData = LoadDocumentFile(options.userData, kUserDataRole);
  if (options.shown.format == "xml") {
    WriteTextOutput(userData->Xml(), "");
    return kExitOk;
  }
  auto fingerprint = LoadOptionalDocumentFile(options.fingerprint, kFingerprintRole);
  xml::Document none;
  // Nothing changed since the inventory was saved: each application as it stands.
  WriteTextOutput(
      RenderFindings(options.shown,
                     Inventory(*userData).Changes(*userData, fingerprint ? *fingerprint : none),
                     nullptr),
      "");
  return kExitOk;
}

}  // namespace

std::function<int()> AddInventoryCommand(CLI::App& app) {
  auto options = std::make_shared<InventoryOptions>();
  CLI::App* command = app.add_subcommand(
      "inventory", "Show the saved inventory of a user-data file, without a scan");
  command->add_option("--user-data", options->userData, "User data saved by locate --save")
      ->required();
  command->add_option("--fingerprint", options->fingerprint,
                      "Fingerprint database, to name the best guess of an unidentified version");
  AddFindingsFormatOptions(*command, options->shown, "the document itself");
  return [command, options] { return command->parsed() ? ShowInventory(*options) : -1; };
}

}  // namespace trl::cli
