#include "platform/xml/file_text.h"

#include <fmt/format.h>

#include <algorithm>
#include <string_view>

#include "platform/text.h"
#include "platform/xml/file_bytes.h"

namespace trl::xml {
namespace {

using namespace std::string_view_literals;

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

}  // namespace

ParseError Unreadable(std::string reason) { return {false, std::move(reason), 0, 0, false}; }

ParseError TooLarge(size_t limit) {
  ParseError error = Unreadable(
      fmt::format("the document is larger than {} bytes, the most a document may be", limit));
  error.limit = true;
  return error;
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
  if (auto error = ReadFileBytes(path, limit, bytes)) {
    file.error = std::move(error);
    return file;
  }
  size_t mark = 0;
  std::string encoding = EncodingOf(bytes, mark);
  if (encoding.empty()) {
    file.text = std::move(bytes);
  } else if (auto reason =
                 ConvertToUtf8(std::string_view(bytes).substr(mark), encoding, file.text)) {
    file.error = ErrorAt(file.text, file.text.size(), std::move(*reason));
  }
  return file;
}

}  // namespace trl::xml
