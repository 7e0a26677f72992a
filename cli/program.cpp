#include "program.h"

#include <cstdio>
#include <exception>
#include <string>

#include "check_command.h"
#include "collect_command.h"
#include "command_error.h"
#include "compare_command.h"
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

// The name is set rather than taken from argv[0], so that help and manual pages say "trllocator"
// however the program was started.
Program::Program()
    : app_("trllocator: finds which known applications are installed, and which version",
           "trllocator") {
  app_.set_version_flag("-V,--version", std::string("trllocator ") + TRL_VERSION);
  app_.footer(
      "Exit codes: 0 done; 1 the run did not complete or its output could not be written; "
      "2 a bad command line or input document; 3 done, but failures were reported (locate); "
      "130 cancelled by Ctrl-C.");
  commands_ = {AddSearchCommand(app_),    AddCompareCommand(app_), AddFilterCommand(app_),
               AddMergeCommand(app_),     AddLocateCommand(app_),  AddFingerprintCommand(app_),
               AddInventoryCommand(app_), AddManageCommand(app_),  AddCheckCommand(app_),
               AddExplainCommand(app_),   AddCollectCommand(app_)};
}

int Program::Run(int argc, char** argv) {
  try {
    app_.parse(argc, argv);
  } catch (const CLI::Success& done) {
    return app_.exit(done);
  } catch (const CLI::ParseError& error) {
    app_.exit(error);
    return kExitBadInput;
  }
  try {
    for (const auto& command : commands_) {
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
  std::printf("%s", app_.help().c_str());
  return kExitOk;
}

}  // namespace trl::cli
