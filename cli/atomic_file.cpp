#include "atomic_file.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <glob.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <optional>
#include <random>
#include <string_view>

#include "chunk_writer.h"
#include "command_error.h"
#include "gzip_text.h"

namespace trl::cli {
namespace {

// Every temporary a replacement makes is "<file><kTemporaryMark>XXXXXX", so that one left behind
// is recognised; its writer holds a lock on it for as long as it lives.
constexpr const char* kTemporaryMark = ".trl-";

[[noreturn]] void Fail(const std::string& what, const std::string& path, int error) {
  throw CommandError(fmt::format("cannot {} '{}': {}", what, path, std::strerror(error)),
                     kExitFailed);
}

class Descriptor {
 public:
  explicit Descriptor(int fd) : fd_(fd) {}
  ~Descriptor() {
    if (fd_ >= 0) ::close(fd_);
  }
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  int Get() const { return fd_; }
  // Closes now, answering errno on failure (a late write error of some file systems shows here).
  int Close() {
    int fd = fd_;
    fd_ = -1;
    return ::close(fd) == 0 ? 0 : errno;
  }

 private:
  int fd_;
};

// Tells whether the bytes handed to it, in order, are exactly what a file holds.
class SameAsFile {
 public:
  explicit SameAsFile(const std::string& path)
      : file_(::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC)), same_(file_.Get() >= 0) {}
  void Put(std::string_view bytes) {
    while (same_ && !bytes.empty()) {
      if (at_ == held_.size() && !Fill()) same_ = false;
      size_t n = std::min(bytes.size(), held_.size() - at_);
      same_ = same_ && bytes.substr(0, n) == std::string_view(held_).substr(at_, n);
      bytes.remove_prefix(n);
      at_ += n;
    }
  }
  // Whether the file ended where the bytes did.
  bool Same() { return same_ && at_ == held_.size() && !Fill(); }

 private:
  bool Fill() {
    held_.resize(size_t{1} << 16);
    ssize_t got;
    do {
      got = ::read(file_.Get(), held_.data(), held_.size());
    } while (got < 0 && errno == EINTR);
    held_.resize(got > 0 ? static_cast<size_t>(got) : 0);
    at_ = 0;
    return got > 0;
  }

  Descriptor file_;
  bool same_;
  std::string held_;
  size_t at_ = 0;
};

// Writes the text and a line end, gathered into large writes, compressed when asked, and shows
// each byte written to `same` when there is one. False with errno set when a write failed.
bool WritePieces(int fd, const TextPieces& text, bool compress, SameAsFile* same) {
  ChunkWriter writer(fd);
  auto write = [&](std::string_view bytes) {
    writer.Put(bytes);
    if (same != nullptr) same->Put(bytes);
  };
  if (!compress) {
    text(write);
    write("\n");
    return writer.Finish();
  }
  GzipWriter gzip(write);
  text([&](std::string_view piece) { gzip.Put(piece); });
  gzip.Put("\n");
  gzip.Finish();
  return writer.Finish();
}

// Makes a rename in the folder of `path` durable.
void SyncFolderOf(const std::string& path) {
  std::filesystem::path folder = std::filesystem::path(path).parent_path();
  int fd = ::open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (fd < 0) return;  // the rename stands; only its durability across a power cut is less sure
  ::fsync(fd);
  ::close(fd);
}

// Gives the new file what the old one had. Changing the owner needs privilege: without it the
// file is the writer's own, as any file the writer makes.
void KeepOwnership(int fd, const struct stat* existing) {
  if (existing == nullptr) {
    mode_t mask = ::umask(0);
    ::umask(mask);
    ::fchmod(fd, 0666 & ~mask);
    return;
  }
  if (existing->st_uid != ::geteuid() || existing->st_gid != ::getegid()) {
    (void)::fchown(fd, existing->st_uid, existing->st_gid);
  }
  ::fchmod(fd, existing->st_mode & 07777);
}

// A new temporary beside `file`, locked by this process.
int MakeTemporary(const std::string& file, std::string& name) {
  name = file + kTemporaryMark + "XXXXXX";
  int fd = ::mkostemp(name.data(), O_CLOEXEC);
  if (fd >= 0) ::flock(fd, LOCK_EX);
  return fd;
}

// Removes the temporaries of `file` whose writer is gone: one that is still locked is being
// written.
void RemoveStrayTemporaries(const std::string& file) {
  std::string pattern;
  for (char c : file + kTemporaryMark) {
    if (c == '*' || c == '?' || c == '[' || c == '\\') pattern += '\\';
    pattern += c;
  }
  pattern += "??????";
  glob_t found{};
  if (::glob(pattern.c_str(), GLOB_NOSORT, nullptr, &found) == 0) {
    for (size_t i = 0; i < found.gl_pathc; ++i) {
      const char* name = found.gl_pathv[i];
      int fd = ::open(name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
      if (fd < 0) continue;
      struct stat status {};
      if (::fstat(fd, &status) == 0 && S_ISREG(status.st_mode) &&
          (status.st_uid == ::geteuid() || ::geteuid() == 0) &&
          ::flock(fd, LOCK_EX | LOCK_NB) == 0) {
        ::unlink(name);
      }
      ::close(fd);
    }
  }
  ::globfree(&found);
}

// Copies the content of `file` into `fd`, for a backup where a hard link is refused.
bool CopyInto(const std::string& file, int fd) {
  Descriptor source(::open(file.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
  if (source.Get() < 0) return false;
  char buffer[1 << 16];
  for (;;) {
    ssize_t got = ::read(source.Get(), buffer, sizeof buffer);
    if (got == 0) return ::fsync(fd) == 0;
    if (got < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    if (!WriteAll(fd, buffer, static_cast<size_t>(got))) return false;
  }
}

// Makes "<file>.bak" hold the current content of `file`. The old backup is replaced by a rename,
// so it stays until the new one exists.
void KeepBackup(const std::string& file, const struct stat& existing) {
  std::string backup = file + ".bak";
  std::string linked = backup + kTemporaryMark;
  std::mt19937_64 random{std::random_device{}()};
  for (int attempt = 0;; ++attempt) {
    std::string name = linked + fmt::format("{:06x}", random() & 0xffffff);
    if (::link(file.c_str(), name.c_str()) == 0) {
      if (::rename(name.c_str(), backup.c_str()) == 0) return;
      int error = errno;
      ::unlink(name.c_str());
      Fail("keep a backup of", file, error);
    }
    if (errno != EEXIST || attempt == 8) break;
  }
  // No hard link here (a file system without them, or one the system protects): a copy.
  std::string name;
  Descriptor fd(MakeTemporary(backup, name));
  if (fd.Get() < 0) Fail("keep a backup of", file, errno);
  KeepOwnership(fd.Get(), &existing);
  if (!CopyInto(file, fd.Get()) || ::rename(name.c_str(), backup.c_str()) != 0) {
    int error = errno;
    ::unlink(name.c_str());
    Fail("keep a backup of", file, error);
  }
}

}  // namespace

std::string SaveTarget(const std::string& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) != 0 || !S_ISLNK(status.st_mode)) return path;
  std::error_code error;
  std::filesystem::path target = std::filesystem::weakly_canonical(path, error);
  if (error) Fail("follow the link", path, error.value());
  return target.string();
}

bool ReplaceFileAtomically(const std::string& path, const std::string& text,
                           const Replacement& how) {
  return ReplaceFileAtomically(
      path, [&](const auto& put) { put(text); }, how);
}

bool ReplaceFileAtomically(const std::string& path, const TextPieces& text,
                           const Replacement& how) {
  std::string file = how.throughLink ? SaveTarget(path) : path;
  struct stat existing {};
  bool exists = ::lstat(file.c_str(), &existing) == 0;
  if (exists && S_ISLNK(existing.st_mode)) exists = false;  // replaced itself, never followed
  if (exists && !S_ISREG(existing.st_mode)) {
    throw CommandError(fmt::format("cannot replace '{}': it is not a regular file", file),
                       kExitFailed);
  }

  RemoveStrayTemporaries(file);
  std::string temporary;
  Descriptor fd(MakeTemporary(file, temporary));
  if (fd.Get() < 0) Fail("write", file, errno);
  KeepOwnership(fd.Get(), exists ? &existing : nullptr);
  bool written = false;
  std::optional<SameAsFile> same;
  if (how.keepSame && exists) same.emplace(file);
  try {
    written = WritePieces(fd.Get(), text, how.compress, same ? &*same : nullptr) &&
              ::fsync(fd.Get()) == 0;
  } catch (...) {
    ::unlink(temporary.c_str());
    throw;
  }
  int error = errno;
  if (!written) {
    ::unlink(temporary.c_str());
    Fail("write", file, error);
  }
  if (same && same->Same()) {
    ::unlink(temporary.c_str());
    return false;
  }
  if (how.keepBackup && exists) {
    try {
      KeepBackup(file, existing);
    } catch (const CommandError&) {
      ::unlink(temporary.c_str());
      throw;
    }
  }
  if (::rename(temporary.c_str(), file.c_str()) != 0) {
    error = errno;
    ::unlink(temporary.c_str());
    Fail("replace", file, error);
  }
  SyncFolderOf(file);
  if ((error = fd.Close()) != 0) Fail("write", file, error);
  return true;
}

}  // namespace trl::cli
