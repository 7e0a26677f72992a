#pragma once

#include <CLI/CLI.hpp>
#include <functional>
#include <vector>

namespace trl::cli {

// The trllocator command line: the program's own options and every subcommand. The command runs
// it; the manual pages and the shell completion are generated from the same definitions.
class Program {
 public:
  Program();
  Program(const Program&) = delete;
  Program& operator=(const Program&) = delete;

  const CLI::App& App() const { return app_; }
  // Parses the command line and runs the subcommand it names; returns the exit code.
  int Run(int argc, char** argv);

 private:
  CLI::App app_;
  std::vector<std::function<int()>> commands_;
};

}  // namespace trl::cli
