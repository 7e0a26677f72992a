#include "deb_archive.h"

#include <fmt/format.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <sstream>
#include <unordered_map>
#include <vector>

#include "command_error.h"

namespace trl::cli {
namespace {

// What a program wrote to standard output and standard error, and whether it succeeded.
struct ProgramRun {
  bool succeeded = false;
  std::string output;
};

ProgramRun RunProgram(std::vector<std::string> args) {
  int pipeEnds[2];
  if (::pipe(pipeEnds) != 0) return {};
  pid_t child = ::fork();
  if (child == 0) {
    ::dup2(pipeEnds[1], STDOUT_FILENO);
    ::dup2(pipeEnds[1], STDERR_FILENO);
    ::close(pipeEnds[0]);
    ::close(pipeEnds[1]);
    std::vector<char*> argv;
    for (std::string& arg : args) argv.push_back(arg.data());
    argv.push_back(nullptr);
    ::execvp(argv[0], argv.data());
    ::_exit(127);
  }
  ::close(pipeEnds[1]);
  ProgramRun run;
  char buffer[65536];
  for (ssize_t n; (n = ::read(pipeEnds[0], buffer, sizeof buffer)) != 0;) {
    if (n > 0)
      run.output.append(buffer, n);
    else if (errno != EINTR)
      break;
  }
  ::close(pipeEnds[0]);
  int status = 0;
  run.succeeded = child > 0 && ::waitpid(child, &status, 0) == child && WIFEXITED(status) &&
                  WEXITSTATUS(status) == 0;
  return run;
}

std::string Run(const std::string& deb, std::vector<std::string> args) {
  ProgramRun run = RunProgram(std::move(args));
  if (!run.succeeded) {
    std::string said = run.output.empty() ? "dpkg-deb could not be run" : run.output;
    while (!said.empty() && said.back() == '\n') said.pop_back();
    throw CommandError(fmt::format("cannot read the package '{}': {}", deb, said));
  }
  return run.output;
}

// Sizes of the regular files of a listing in `tar -tv` form:
// "-rw-r--r-- root/root 1234 2023-01-31 10:00 ./usr/bin/tool", or with mode "h" a hard link,
// "... ./usr/bin/other link to ./usr/bin/tool".
std::unordered_map<std::string, uint64_t> ListedSizes(const std::string& listing) {
  std::unordered_map<std::string, uint64_t> sizes;
  std::istringstream lines(listing);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string mode, owner, date, time;
    uint64_t size = 0;
    if (!(words >> mode >> owner >> size >> date >> time) || mode.empty()) continue;
    words >> std::ws;
    std::string name;
    std::getline(words, name);
    if (mode[0] == 'h') {
      size_t link = name.find(" link to ");
      if (link == std::string::npos) continue;
      auto target = sizes.find(RelativePackagePath(name.substr(link + 9)));
      if (target == sizes.end()) continue;
      size = target->second;
      name.resize(link);
    } else if (mode[0] != '-') {
      continue;
    }
    sizes[RelativePackagePath(name)] = size;
  }
  return sizes;
}

}  // namespace

PackageVersion ReadDebArchive(const std::string& path) {
  std::string control = Run(path, {"dpkg-deb", "--field", path});
  std::vector<ControlFields> stanzas = ParseControlStanzas(control);
  if (stanzas.empty()) throw CommandError(fmt::format("the package '{}' has no control", path));
  PackageVersion version = VersionFromControl(stanzas.front());

  std::string scratch = (std::filesystem::temp_directory_path() / "trl-deb-XXXXXX").string();
  if (!::mkdtemp(scratch.data())) {
    throw CommandError(fmt::format("cannot make a scratch folder for '{}'", path), kExitFailed);
  }
  struct Cleanup {
    std::string folder;
    ~Cleanup() {
      std::error_code ignored;
      std::filesystem::remove_all(folder, ignored);
    }
  } cleanup{scratch};
  Run(path, {"dpkg-deb", "--control", path, scratch});
  AddMd5sums(version, ReadWholeFile(scratch + "/md5sums").value_or(""));
  std::istringstream conffiles(ReadWholeFile(scratch + "/conffiles").value_or(""));
  for (std::string line; std::getline(conffiles, line);) {
    // A flag such as "remove-on-upgrade" may stand before the path.
    size_t slash = line.find('/');
    if (slash != std::string::npos) AddConffile(version, line.substr(slash), "");
  }

  std::unordered_map<std::string, uint64_t> sizes =
      ListedSizes(Run(path, {"dpkg-deb", "--contents", path}));
  for (PackageFile& file : version.files) {
    if (auto it = sizes.find(file.path); it != sizes.end()) file.size = it->second;
  }
  return version;
}

}  // namespace trl::cli
