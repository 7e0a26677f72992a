#include "server/registry.h"

#include <fcntl.h>
#include <pwd.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string_view>
#include <system_error>
#include <vector>

#include "server/guid.h"
#include "server/identities.h"
#include "server/module.h"

namespace trl::server {
namespace {

namespace fs = std::filesystem;

constexpr const char* kSystemFolder = "/var/lib/trllocator";
constexpr const char* kSystemFlag = "TRLLOCATOR_SYSTEM_REGISTRY";
constexpr const char* kFileName = "classes";

// Where registration writes; an error code when it may not (a user other than root asking for the
// system-wide file) or cannot (no home folder) tell.
std::optional<fs::path> RegistryFolder(TrlResult& error) {
  const char* flag = std::getenv(kSystemFlag);
  if (flag != nullptr && std::string_view(flag) == "1") {
    if (geteuid() == 0) return fs::path(kSystemFolder);
    error = TRL_E_ACCESSDENIED;
    return std::nullopt;
  }
  const char* dataHome = std::getenv("XDG_DATA_HOME");
  if (dataHome != nullptr && dataHome[0] == '/') return fs::path(dataHome) / "trllocator";
  const char* home = std::getenv("HOME");
  if (home == nullptr || home[0] == '\0') {
    const passwd* user = getpwuid(getuid());
    home = user != nullptr ? user->pw_dir : nullptr;
  }
  if (home == nullptr) {
    error = TRL_SELFREG_E_CLASS;
    return std::nullopt;
  }
  return fs::path(home) / ".local" / "share" / "trllocator";
}

std::vector<std::string> OurLines(const std::string& libraryPath) {
  std::vector<std::string> lines;
  for (const ClassIdentity& identity : Classes()) {
    lines.push_back(std::string(identity.progId) + '\t' + GuidText(identity.classId) + '\t' +
                    libraryPath);
  }
  return lines;
}

std::string_view ProgIdOf(std::string_view line) { return line.substr(0, line.find('\t')); }

bool IsOurProgId(std::string_view line) { return FindClass(ProgIdOf(line)) != nullptr; }

// Holds the lock beside the registry file while it lives.
class RegistryLock {
 public:
  explicit RegistryLock(const fs::path& folder)
      : fd_(open((folder / (std::string(kFileName) + ".lock")).c_str(),
                 O_RDWR | O_CREAT | O_CLOEXEC, 0644)) {
    if (fd_ >= 0 && flock(fd_, LOCK_EX) != 0) {
      close(fd_);
      fd_ = -1;
    }
  }
  ~RegistryLock() {
    if (fd_ >= 0) close(fd_);
  }
  RegistryLock(const RegistryLock&) = delete;
  RegistryLock& operator=(const RegistryLock&) = delete;
  bool Held() const { return fd_ >= 0; }

 private:
  int fd_;
};

// The lines of the file (none when there is no file); false when a file is there but cannot be
// read, so that its lines are never lost by writing it anew.
bool ReadLines(const fs::path& file, std::vector<std::string>& lines) {
  std::ifstream in(file);
  if (!in) {
    std::error_code failed;
    bool there = fs::exists(file, failed);
    return !there && !failed;
  }
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return !in.bad();
}

// Replaces the file by one holding `lines`, or removes it when there are none.
bool WriteLines(const fs::path& file, const std::vector<std::string>& lines) {
  if (lines.empty()) {
    std::error_code ignored;
    fs::remove(file, ignored);
    return !fs::exists(file, ignored);
  }
  std::string text;
  for (const std::string& line : lines) text += line + '\n';
  std::string temporary = file.string() + ".XXXXXX";
  int fd = mkstemp(temporary.data());
  if (fd < 0) return false;
  bool written = fchmod(fd, 0644) == 0;
  for (size_t done = 0; written && done < text.size();) {
    ssize_t n = write(fd, text.data() + done, text.size() - done);
    if (n < 0 && errno == EINTR) continue;
    written = n > 0;
    if (written) done += static_cast<size_t>(n);
  }
  written = written && fsync(fd) == 0;
  written = close(fd) == 0 && written;
  if (written && rename(temporary.c_str(), file.c_str()) == 0) return true;
  unlink(temporary.c_str());
  return false;
}

// Runs `change` on the lines of the registry file under its lock and writes the result back.
TrlResult ChangeRegistry(const std::string& libraryPath,
                         void (*change)(std::vector<std::string>&,
                                        const std::vector<std::string>&)) {
  if (libraryPath.find_first_of("\t\n") != std::string::npos) return TRL_SELFREG_E_CLASS;
  TrlResult error = TRL_S_OK;
  std::optional<fs::path> folder = RegistryFolder(error);
  if (!folder) return error;
  std::error_code failed;
  fs::create_directories(*folder, failed);
  if (failed) return TRL_SELFREG_E_CLASS;
  RegistryLock lock(*folder);
  if (!lock.Held()) return TRL_SELFREG_E_CLASS;
  fs::path file = *folder / kFileName;
  std::vector<std::string> lines;
  if (!ReadLines(file, lines)) return TRL_SELFREG_E_CLASS;
  std::vector<std::string> before = lines;
  change(lines, OurLines(libraryPath));
  if (lines == before) return TRL_S_OK;
  return WriteLines(file, lines) ? TRL_S_OK : TRL_SELFREG_E_CLASS;
}

}  // namespace

TrlResult RegisterClasses(const std::string& libraryPath) {
  return ChangeRegistry(
      libraryPath, [](std::vector<std::string>& lines, const std::vector<std::string>& ours) {
        std::erase_if(lines, [](const std::string& line) { return IsOurProgId(line); });
        lines.insert(lines.end(), ours.begin(), ours.end());
      });
}

TrlResult UnregisterClasses(const std::string& libraryPath) {
  return ChangeRegistry(libraryPath,
                        [](std::vector<std::string>& lines, const std::vector<std::string>& ours) {
                          std::erase_if(lines, [&](const std::string& line) {
                            return std::ranges::find(ours, line) != ours.end();
                          });
                        });
}

}  // namespace trl::server
