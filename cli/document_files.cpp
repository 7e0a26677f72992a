#include "document_files.h"

#include <fmt/format.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>

#include "command_error.h"

namespace trl::cli {
namespace {

std::string SystemReason(int error) { return std::strerror(error); }

}  // namespace

xml::DocumentPtr LoadDocumentFile(const std::string& path, const DocumentRole& documentRole) {
  std::string_view role = documentRole.name;
  // Opened here first, so that a missing or unreadable file gets the system's own reason.
  std::error_code ignored;
  if (std::filesystem::is_directory(path, ignored)) {
    throw CommandError(
        fmt::format("cannot read the {} '{}': {}", role, path, SystemReason(EISDIR)));
  }
  std::ifstream probe(path, std::ios::binary);
  if (!probe) {
    throw CommandError(fmt::format("cannot read the {} '{}': {}", role, path, SystemReason(errno)));
  }
  if (probe.peek() == std::ifstream::traits_type::eof()) {
    throw CommandError(fmt::format("the {} '{}' is empty", role, path));
  }
  probe.close();
  auto document = std::make_shared<xml::Document>();
  if (!document->Load(path)) {
    const xml::ParseError& error = document->LastParseError();
    if (error.line == 0) {
      throw CommandError(fmt::format("cannot read the {} '{}': {}", role, path, error.reason));
    }
    throw CommandError(fmt::format("the {} '{}' is not well-formed XML: line {}, column {}: {}",
                                   role, path, error.line, error.column, error.reason));
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
  std::FILE* stream = path.empty() ? stdout : std::fopen(path.c_str(), "wb");
  if (stream == nullptr) {
    throw CommandError(fmt::format("cannot write '{}': {}", path, SystemReason(errno)),
                       kExitFailed);
  }
  bool written = std::fwrite(text.data(), 1, text.size(), stream) == text.size() &&
                 std::fputc('\n', stream) != EOF && std::fflush(stream) == 0;
  int error = errno;
  if (stream != stdout && std::fclose(stream) != 0 && written) {
    written = false;
    error = errno;
  }
  if (!written) {
    std::string where = path.empty() ? "standard output" : "'" + path + "'";
    throw CommandError(fmt::format("cannot write {}: {}", where, SystemReason(error)), kExitFailed);
  }
}

}  // namespace trl::cli
