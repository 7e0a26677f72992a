#include <CLI/CLI.hpp>

#include <iostream>

#include "version.h"

int main(int argc, char** argv) {
  CLI::App app{"trllocator: finds which known applications are installed, and which version"};
  app.set_version_flag("--version", std::string("trllocator ") + TRL_VERSION);
  CLI11_PARSE(app, argc, argv);
  std::cout << app.help();
  return 0;
}
