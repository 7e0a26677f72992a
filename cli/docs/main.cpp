// Writes the manual pages and the bash completion of trllocator, generated from the same command
// line definitions as the program itself, so that neither can drift from what --help says.
// Usage: trllocator_docs MAN_FOLDER COMPLETION_FILE

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>

#include "bash_completion.h"
#include "manual_page.h"
#include "program.h"
#include "version.h"

namespace {

bool Write(const std::filesystem::path& path, const std::string& text) {
  std::filesystem::create_directories(path.parent_path());
  std::ofstream out(path, std::ios::binary);
  out << text;
  out.close();
  if (!out) std::fprintf(stderr, "trllocator_docs: cannot write %s\n", path.c_str());
  return static_cast<bool>(out);
}

bool WritePages(const CLI::App& command, const std::filesystem::path& folder) {
  bool written = Write(folder / (trl::cli::ManualPageName(command) + ".1"),
                       trl::cli::ManualPage(command, TRL_VERSION));
  for (const CLI::App* sub : command.get_subcommands({})) {
    written = WritePages(*sub, folder) && written;
  }
  return written;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: trllocator_docs MAN_FOLDER COMPLETION_FILE\n");
    return 2;
  }
  trl::cli::Program program;
  bool written = WritePages(program.App(), argv[1]);
  written = Write(argv[2], trl::cli::BashCompletion(program.App())) && written;
  return written ? 0 : 1;
}
