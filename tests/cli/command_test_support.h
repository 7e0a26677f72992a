#pragma once

#include <CLI/CLI.hpp>
#include <algorithm>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <vector>

namespace trl::cli {

using AddCommand = std::function<std::function<int()>(CLI::App&)>;

inline std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream text;
  text << in.rdbuf();
  return text.str();
}

// Runs the subcommand `name` that `add` puts on a command line, with `args`; answers the exit code.
inline int RunCommand(const AddCommand& add, const std::string& name,
                      std::vector<std::string> args) {
  CLI::App app;
  auto run = add(app);
  args.insert(args.begin(), name);
  std::reverse(args.begin(), args.end());  // CLI11 takes the arguments last first
  app.parse(args);
  return run();
}

}  // namespace trl::cli
