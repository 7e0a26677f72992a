#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>
#include <functional>
#include <vector>

#include "check_command.h"
#include "collect_command.h"
#include "command_error.h"
#include "compare_command.h"
#include "detached_end.h"
#include "explain_command.h"
#include "filter_command.h"
#include "fingerprint_command.h"
#include "inventory_command.h"
#include "locate_command.h"
#include "manage_command.h"
#include "merge_command.h"
#include "search_command.h"
#include "terminal_text.h"
#include "version.h"

namespace trl::cli {
namespace {

int RunProgram(int argc, char** argv) {
  CLI::App app{"trllocator: finds which known applications are installed, and which version"};
  app.set_version_flag("--version", std::string("trllocator ") + TRL_VERSION);
  app.footer(
      "Exit codes: 0 done; 1 the run did not complete or its output could not be written; "
      "2 a bad command line or input document; 3 done, but failures were reported (locate); "
      "130 cancelled by Ctrl-C.");
  std::vector<std::function<int()>> commands{
      AddSearchCommand(app),    AddCompareCommand(app), AddFilterCommand(app),
      AddMergeCommand(app),     AddLocateCommand(app),  AddFingerprintCommand(app),
      AddInventoryCommand(app), AddManageCommand(app),  AddCheckCommand(app),
      AddExplainCommand(app),   AddCollectCommand(app)};
  try {
    app.parse(argc, argv);
  } catch (const CLI::Success& done) {
    return app.exit(done);
  } catch (const CLI::ParseError& error) {
    app.exit(error);
    return kExitBadInput;
  }
  try {
    for (const auto& command : commands) {
      if (int code = command(); code >= 0) return code;
    }
  } catch (const CommandError& error) {
    std::fprintf(stderr, "trllocator: %s\n", Printable(error.what()).c_str());
    return error.ExitCode();
  } catch (const std::exception& error) {
    // Whatever a command did not foresee ends it with a message, never with an abort.
    std::fprintf(stderr, "trllocator: %s\n", Printable(error.what()).c_str());
    return kExitFailed;
  }
  std::printf("%s", app.help().c_str());
  return kExitOk;
}

}  // namespace
}  // namespace trl::cli

int main(int argc, char** argv) {
  return trl::cli::RunWithDetachedEnd([&] { return trl::cli::RunProgram(argc, argv); });
}
