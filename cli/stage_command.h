#pragma once

#include <CLI/CLI.hpp>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "cache_option.h"
#include "platform/fs/file_system.h"

namespace trl::cli {

// What the commands that run one stage share: network share mappings, the property cache, the
// output file, and the printing of what the stage reports.
struct StageOptions {
  std::vector<std::string> shares;  // "\\HOST\SHARE=DIR"
  CacheOptions cache;
  std::string output;
  bool quiet = false;    // failures only
  bool verbose = false;  // every report, run-log entries included
};

void AddShareOption(CLI::App& command, StageOptions& options);
void AddOutputOption(CLI::App& command, StageOptions& options);

// Writes the document a stage's run gave to the output the options name; a run that gave none
// failed (kExitFailed). Answers the command's exit code.
int WriteStageOutput(const std::string& text, std::string_view stage, const StageOptions& options);

// This machine's file system, with the given share mappings before the system's network mounts.
// A malformed mapping is a CommandError.
std::unique_ptr<fs::FileSystem> FileSystemWithShares(const std::vector<std::string>& shares);

// Prints each warning and failure the stages report to standard error while it lives (failures
// only when `options` ask for quiet, run-log entries too when they ask for verbose), each after
// calling `beforePrint` (which can clear a status line).
class ReportPrinter {
 public:
  explicit ReportPrinter(const StageOptions& options, std::function<void()> beforePrint = {});
  ~ReportPrinter();
  ReportPrinter(const ReportPrinter&) = delete;
  ReportPrinter& operator=(const ReportPrinter&) = delete;

  // How many failures (not warnings) were reported while it lived.
  int Failures() const { return *failures_; }

 private:
  std::shared_ptr<int> failures_ = std::make_shared<int>(0);
};

}  // namespace trl::cli
