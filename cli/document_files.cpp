#include "document_files.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <memory>

#include "atomic_file.h"
#include "command_error.h"
#include "gzip_text.h"
#include "platform/fs/posix/output_open.h"

namespace trl::cli {
namespace {

std::string SystemReason(int error) { return std::strerror(error); }

}  // namespace

xml::DocumentPtr LoadDocumentFile(const std::string& path, const DocumentRole& documentRole) {
  std::string_view role = documentRole.name;
  auto unreadable = [&](std::string_view reason) {
    return CommandError(fmt::format("cannot read the {} '{}': {}", role, path, reason));
  };
  // Looked at here first, so that a missing or unreadable file gets the system's own reason.
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) throw unreadable(SystemReason(errno));
  if (S_ISDIR(status.st_mode)) throw unreadable(SystemReason(EISDIR));
  // A device is no document, and may never end (/dev/zero).
  if (S_ISCHR(status.st_mode) || S_ISBLK(status.st_mode)) {
    throw unreadable("it is a device, not a file");
  }
  // A pipe is read once, by the load: a look ahead would take its first bytes away.
  if (S_ISREG(status.st_mode)) {
    std::ifstream probe(path, std::ios::binary);
    if (!probe) throw unreadable(SystemReason(errno));
    if (probe.peek() == std::ifstream::traits_type::eof()) {
      throw CommandError(fmt::format("the {} '{}' is empty", role, path));
    }
  }
  auto document = std::make_shared<xml::Document>();
  bool loaded = false;
  if (documentRole.compressed && IsGzipFile(path)) {
    bool over = false;
    std::string reason;
    std::string text = InflateFile(path, xml::Limits().bytes, over, reason);
    if (!reason.empty()) throw unreadable(reason);
    if (over) {
      throw CommandError(
          fmt::format("the {} '{}' is over a limit: it holds more than {} bytes "
                      "of text",
                      role, path, xml::Limits().bytes));
    }
    loaded = document->LoadXml(text);
  } else {
    loaded = document->Load(path);
  }
  if (!loaded) {
    const xml::ParseError& error = document->LastParseError();
    if (error.line == 0) throw unreadable(error.reason);
    throw CommandError(fmt::format("the {} '{}' {}: line {}, column {}: {}", role, path,
                                   error.limit ? "is over a limit" : "is not well-formed XML",
                                   error.line, error.column, error.reason));
  }
  if (!document->DocumentElement()) {
    throw CommandError(fmt::format("the {} '{}' holds no XML element", role, path));
  }
  RequireKind(*document, path, documentRole);
  return document;
}

xml::DocumentPtr LoadOptionalDocumentFile(const std::string& path, const DocumentRole& role) {
  return path.empty() ? nullptr : LoadDocumentFile(path, role);
}

void WriteTextOutput(const std::string& text, const std::string& path) {
  WriteTextOutput([&](const auto& put) { put(text); }, path);
}

void WriteTextOutput(const TextPieces& text, const std::string& path) {
  struct stat status {};
  bool stream = path.empty() || (::lstat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode) &&
                                 !S_ISDIR(status.st_mode));
  if (!stream) {
    // A file is never truncated before its new text is complete.
    ReplaceFileAtomically(path, text, {.keepBackup = false, .throughLink = false});
    return;
  }
  // A terminal, a pipe, a device, or a link to one of them (/dev/stdout); a link to a file is
  // refused.
  int fd = path.empty() ? ::dup(STDOUT_FILENO) : fs::OpenForWriting(path, 0);
  if (fd < 0) {
    throw CommandError(
        fmt::format("cannot write '{}': {}", path,
                    errno == ELOOP ? "it is a link to a file; remove the link or name the file"
                                   : SystemReason(errno)),
        kExitFailed);
  }
  std::FILE* output = ::fdopen(fd, "w");
  bool written = output != nullptr;
  if (written) {
    text([&](std::string_view piece) {
      written = written && std::fwrite(piece.data(), 1, piece.size(), output) == piece.size();
    });
  }
  written = written && std::fputc('\n', output) != EOF && std::fflush(output) == 0;
  int error = errno;
  if (output == nullptr) {
    ::close(fd);
  } else if (std::fclose(output) != 0 && written) {
    written = false;
    error = errno;
  }
  if (!written) {
    std::string where = path.empty() ? "standard output" : "'" + path + "'";
    throw CommandError(fmt::format("cannot write {}: {}", where, SystemReason(error)), kExitFailed);
  }
}

}  // namespace trl::cli
