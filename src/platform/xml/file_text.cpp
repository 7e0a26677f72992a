#include "platform/xml/file_text.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <iconv.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <string_view>

#include "platform/text.h"

namespace trl::xml {
namespace {

using namespace std::string_view_literals;

ParseError Unreadable(std::string reason, bool limit = false) {
  return {false, std::move(reason), 0, 0, limit};
}

// Reads the file to its end, or fails once it holds more than `limit` bytes: a device or a pipe
// that never ends is never read further.
std::optional<ParseError> ReadBytes(const std::string& path, size_t limit, std::string& bytes) {
  int descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (descriptor < 0) return Unreadable(std::strerror(errno));
  std::unique_ptr<int, void (*)(int*)> closer(&descriptor, [](int* fd) { ::close(*fd); });
  struct stat status {};
  size_t expected = size_t{1} << 16;
  if (::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode)) {
    expected = static_cast<size_t>(status.st_size) + 1;  // the end is seen without another read
  }
  // One byte past the limit, to see that it was passed (unless there is none).
  const size_t most = std::max(limit, limit + 1);
  bytes.resize(std::min(expected, most));
  size_t used = 0;
  for (;;) {
    if (used == bytes.size()) bytes.resize(std::min(bytes.size() * 2, most));
    ssize_t got = ::read(descriptor, bytes.data() + used, bytes.size() - used);
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) return Unreadable(std::strerror(errno));
    if (got == 0) break;
    used += static_cast<size_t>(got);
    if (used > limit) return TooLarge(limit);
  }
  bytes.resize(used);
  return std::nullopt;
}

// The encoding the declaration at the start of `bytes` names, or "" for none or UTF-8.
std::string DeclaredEncoding(std::string_view bytes) {
  if (!bytes.starts_with("<?xml")) return "";
  std::string_view declaration = bytes.substr(0, bytes.find("?>"));
  size_t at = declaration.find("encoding");
  if (at == std::string_view::npos) return "";
  at = declaration.find_first_not_of(" \t\r\n=", at + 8);
  if (at == std::string_view::npos || (declaration[at] != '"' && declaration[at] != '\'')) {
    return "";  // the parser tells what is wrong there
  }
  size_t end = declaration.find(declaration[at], at + 1);
  std::string name(declaration.substr(at + 1, end - at - 1));
  std::string lower = LowerCase(name);
  return lower == "utf-8" || lower == "utf8" ? "" : name;
}

// The encoding of the file's bytes ("" for UTF-8), and how many bytes of byte order mark to drop.
std::string EncodingOf(std::string_view bytes, size_t& mark) {
  const std::pair<std::string_view, const char*> marks[] = {{"\xFF\xFE\0\0"sv, "UTF-32LE"},
                                                            {"\0\0\xFE\xFF"sv, "UTF-32BE"},
                                                            {"\xFF\xFE"sv, "UTF-16LE"},
                                                            {"\xFE\xFF"sv, "UTF-16BE"}};
  const std::pair<std::string_view, const char*> spellings[] = {{"<\0\0\0"sv, "UTF-32LE"},
                                                                {"\0\0\0<"sv, "UTF-32BE"},
                                                                {"<\0"sv, "UTF-16LE"},
                                                                {"\0<"sv, "UTF-16BE"}};
  mark = 0;
  if (bytes.starts_with("\xEF\xBB\xBF")) return "";
  for (const auto& [prefix, name] : marks) {
    if (bytes.starts_with(prefix)) {
      mark = prefix.size();
      return name;
    }
  }
  for (const auto& [prefix, name] : spellings) {
    if (bytes.starts_with(prefix)) return name;
  }
  return DeclaredEncoding(bytes);
}

// `bytes` in `encoding` as UTF-8 into `text`; on failure the reason, and the text converted so far.
std::optional<std::string> Convert(std::string_view bytes, const std::string& encoding,
                                   std::string& text) {
  iconv_t converter = ::iconv_open("UTF-8", encoding.c_str());
  if (converter == reinterpret_cast<iconv_t>(-1)) {
    return fmt::format("the encoding \"{}\" is not supported", encoding);
  }
  std::unique_ptr<void, int (*)(iconv_t)> closer(converter, ::iconv_close);
  text.resize(bytes.size() * 2 + 16);
  char* in = const_cast<char*>(bytes.data());
  size_t inLeft = bytes.size();
  size_t used = 0;
  for (;;) {
    char* out = text.data() + used;
    size_t outLeft = text.size() - used;
    size_t result = ::iconv(converter, &in, &inLeft, &out, &outLeft);
    int error = errno;
    used = text.size() - outLeft;
    if (result != static_cast<size_t>(-1)) break;
    if (error != E2BIG) {
      text.resize(used);
      return fmt::format("the text is not valid {}", encoding);
    }
    text.resize(text.size() * 2);
  }
  text.resize(used);
  return std::nullopt;
}

}  // namespace

ParseError TooLarge(size_t limit) {
  return Unreadable(
      fmt::format("the document is larger than {} bytes, the most a document may be", limit), true);
}

ParseError ErrorAt(std::string_view text, size_t offset, std::string reason) {
  auto before = text.substr(0, offset);
  auto lineStart = before.rfind('\n');
  auto column = lineStart == std::string_view::npos ? before.size() : before.size() - lineStart - 1;
  return {false, std::move(reason), std::count(before.begin(), before.end(), '\n') + 1,
          static_cast<int64_t>(column) + 1};
}

FileText ReadXmlFile(const std::string& path, size_t limit) {
  FileText file;
  std::string bytes;
  if (auto error = ReadBytes(path, limit, bytes)) {
    file.error = std::move(error);
    return file;
  }
  size_t mark = 0;
  std::string encoding = EncodingOf(bytes, mark);
  if (encoding.empty()) {
    file.text = std::move(bytes);
  } else if (auto reason = Convert(std::string_view(bytes).substr(mark), encoding, file.text)) {
    file.error = ErrorAt(file.text, file.text.size(), std::move(*reason));
  }
  return file;
}

}  // namespace trl::xml
