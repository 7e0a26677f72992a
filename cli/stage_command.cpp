#include "stage_command.h"

#include <fmt/format.h>

#include <cstdio>
#include <unordered_set>

#include "command_error.h"
#include "document_files.h"
#include "frame/error_handler.h"
#include "native_path.h"
#include "platform/failure.h"
#include "platform/fs/posix/posix_file_system.h"
#include "platform/fs/share_table.h"
#include "reporter/reporter.h"
#include "terminal_text.h"

namespace trl::cli {

void AddShareOption(CLI::App& command, StageOptions& options) {
  command.add_option("--share", options.shares,
                     "Where a network share is on this machine: \\\\HOST\\SHARE=DIR (repeatable; "
                     "network mounts of the system are used too)");
}

void AddOutputOption(CLI::App& command, StageOptions& options) {
  command.add_option("--output,-o", options.output,
                     "Write the result document to FILE instead of standard output");
  command.add_flag("-q,--quiet", options.quiet, "Print failures only, no warnings");
  command.add_flag("-v,--verbose", options.verbose,
                   "Print every report, the run log's entries included");
}

int WriteStageOutput(const std::string& text, std::string_view stage, const StageOptions& options) {
  if (text.empty()) {
    throw CommandError(fmt::format("the {} produced no document", stage), kExitFailed);
  }
  WriteTextOutput(text, options.output);
  return kExitOk;
}

std::unique_ptr<fs::FileSystem> FileSystemWithShares(const std::vector<std::string>& shares) {
  fs::ShareTable table;
  for (const std::string& mapping : shares) {
    try {
      table.AddMapping(mapping);
    } catch (const Failure&) {
      throw CommandError(
          fmt::format("--share '{}' is not a share mapping: write \\\\HOST\\SHARE=DIR", mapping));
    }
  }
  table.AddSystemMounts();
  return fs::CreatePosixFileSystem(std::move(table));
}

namespace {

// A report's text as a person on this system reads it: each quoted path of this computer in the
// component's "\\" form shown natively ("Path '\\tmp\\x\\' could not be found").
std::string ForPeople(std::string_view description) {
  std::string text;
  for (size_t at = 0; at < description.size();) {
    size_t open = description.find("'\\", at);
    size_t close = open == std::string_view::npos ? open : description.find('\'', open + 1);
    if (close == std::string_view::npos || description.substr(open, 3) == "'\\\\") {
      text += description.substr(at);
      break;
    }
    text += description.substr(at, open + 1 - at);
    text += NativePath(description.substr(open + 1, close - open - 1));
    at = close;
  }
  return text;
}

// How a failure reads: which file it was about and what went wrong, the number and the operation
// only for those who asked for every detail.
std::string FailureLine(const ReportedEventView& event, const std::string& description,
                        bool verbose) {
  std::string line = "trllocator: error";
  if (verbose)
    line += fmt::format(" in {}.{} ({})", event.className, event.procedure, event.number);
  if (!event.subject.empty()) {
    std::string path =
        event.subject.starts_with("\\\\") ? std::string(event.subject) : NativePath(event.subject);
    line += fmt::format(": '{}'", Printable(path));
  }
  line += ": " + description;
  if (event.number == kPermissionDenied) {
    line += " (run as a user who may read it, or leave it out with --exclude)";
  }
  return line;
}

// Lines already printed, so that a failure reported once for each version that looks at the same
// file is shown once. Bounded: past the bound every line is printed.
class PrintedLines {
 public:
  bool Insert(const std::string& line) {
    if (lines_.size() >= kMaxRemembered) return true;
    return lines_.insert(line).second;
  }

 private:
  static constexpr size_t kMaxRemembered = 10000;
  std::unordered_set<std::string> lines_;
};

}  // namespace

ReportPrinter::ReportPrinter(const StageOptions& options, std::function<void()> beforePrint) {
  ObserveReports([beforePrint = std::move(beforePrint), failures = failures_, quiet = options.quiet,
                  verbose = options.verbose,
                  printed = std::make_shared<PrintedLines>()](const ReportedEventView& event) {
    bool shown = event.kind == Reporter::kFailure || (event.kind == Reporter::kWarning && !quiet) ||
                 (event.kind == Reporter::kLog && verbose);
    if (event.kind == Reporter::kFailure) ++*failures;
    if (!shown) return;
    std::string description = Printable(ForPeople(event.description));
    std::string line;
    if (event.kind == Reporter::kWarning) {
      line = "trllocator: warning: " + description;
    } else if (event.kind == Reporter::kFailure) {
      line = FailureLine(event, description, verbose);
    } else {
      line = fmt::format("trllocator: {}.{}: {}", event.className, event.procedure, description);
    }
    if (!verbose && !printed->Insert(line)) return;
    if (beforePrint) beforePrint();
    fmt::print(stderr, "{}\n", line);
  });
}

ReportPrinter::~ReportPrinter() { ObserveReports(nullptr); }

}  // namespace trl::cli
