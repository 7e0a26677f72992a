#include "platform/xml/file_bytes.h"

#include <windows.h>

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>
#include <utility>

#include "platform/fs/windows/wide_path.h"
#include "platform/text.h"
#include "platform/windows/system_error.h"
#include "platform/windows/wide_text.h"
#include "platform/xml/file_text.h"

namespace trl::xml {
namespace {

// The encodings named in XML declarations that have a Windows code page, by lower-case name.
constexpr std::pair<const char*, UINT> kCodePages[] = {
    {"us-ascii", 20127},    {"ascii", 20127},        {"iso-8859-1", 28591},  {"latin1", 28591},
    {"iso_8859-1", 28591},  {"iso-8859-2", 28592},   {"iso-8859-3", 28593},  {"iso-8859-4", 28594},
    {"iso-8859-5", 28595},  {"iso-8859-6", 28596},   {"iso-8859-7", 28597},  {"iso-8859-8", 28598},
    {"iso-8859-9", 28599},  {"iso-8859-13", 28603},  {"iso-8859-15", 28605}, {"windows-1250", 1250},
    {"windows-1251", 1251}, {"windows-1252", 1252},  {"windows-1253", 1253}, {"windows-1254", 1254},
    {"windows-1255", 1255}, {"windows-1256", 1256},  {"windows-1257", 1257}, {"windows-1258", 1258},
    {"cp1250", 1250},       {"cp1251", 1251},        {"cp1252", 1252},       {"cp1253", 1253},
    {"cp1254", 1254},       {"cp1255", 1255},        {"cp1256", 1256},       {"cp1257", 1257},
    {"cp1258", 1258},       {"ibm437", 437},         {"cp437", 437},         {"ibm850", 850},
    {"cp850", 850},         {"ibm866", 866},         {"cp866", 866},         {"koi8-r", 20866},
    {"koi8-u", 21866},      {"shift_jis", 932},      {"shift-jis", 932},     {"sjis", 932},
    {"cp932", 932},         {"euc-jp", 20932},       {"gb2312", 936},        {"gbk", 936},
    {"cp936", 936},         {"gb18030", 54936},      {"big5", 950},          {"cp950", 950},
    {"euc-kr", 51949},      {"ks_c_5601-1987", 949}, {"cp949", 949},         {"windows-874", 874},
    {"tis-620", 874},
};

struct UnitFormat {
  int width;  // 2 or 4 bytes
  bool bigEndian;
};

// UTF-16 and UTF-32 by name; a name without byte order reads a mark if there is one, else big
// endian.
std::optional<UnitFormat> UnicodeFormat(const std::string& lower, std::string_view& bytes) {
  auto plain = [&](int width) -> UnitFormat {
    std::string_view littleMark =
        width == 2 ? std::string_view("\xFF\xFE", 2) : std::string_view("\xFF\xFE\0\0", 4);
    std::string_view bigMark =
        width == 2 ? std::string_view("\xFE\xFF", 2) : std::string_view("\0\0\xFE\xFF", 4);
    if (bytes.starts_with(littleMark)) {
      bytes.remove_prefix(littleMark.size());
      return {width, false};
    }
    if (bytes.starts_with(bigMark)) bytes.remove_prefix(bigMark.size());
    return {width, true};
  };
  if (lower == "utf-16le") return UnitFormat{2, false};
  if (lower == "utf-16be") return UnitFormat{2, true};
  if (lower == "utf-16") return plain(2);
  if (lower == "utf-32le") return UnitFormat{4, false};
  if (lower == "utf-32be") return UnitFormat{4, true};
  if (lower == "utf-32") return plain(4);
  return std::nullopt;
}

void AppendUtf8(std::string& text, uint32_t c) {
  if (c < 0x80) {
    text.push_back(static_cast<char>(c));
  } else if (c < 0x800) {
    text.push_back(static_cast<char>(0xC0 | (c >> 6)));
    text.push_back(static_cast<char>(0x80 | (c & 0x3F)));
  } else if (c < 0x10000) {
    text.push_back(static_cast<char>(0xE0 | (c >> 12)));
    text.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
    text.push_back(static_cast<char>(0x80 | (c & 0x3F)));
  } else {
    text.push_back(static_cast<char>(0xF0 | (c >> 18)));
    text.push_back(static_cast<char>(0x80 | ((c >> 12) & 0x3F)));
    text.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
    text.push_back(static_cast<char>(0x80 | (c & 0x3F)));
  }
}

// Decodes UTF-16 or UTF-32 units; false at the first unit that is not valid (text holds what
// came before it), or at an incomplete unit at the end.
bool DecodeUnits(std::string_view bytes, UnitFormat format, std::string& text) {
  auto unit = [&](size_t at) {
    uint32_t value = 0;
    for (int i = 0; i < format.width; ++i) {
      int shift = 8 * (format.bigEndian ? format.width - 1 - i : i);
      value |= uint32_t{static_cast<unsigned char>(bytes[at + i])} << shift;
    }
    return value;
  };
  const size_t width = static_cast<size_t>(format.width);
  size_t at = 0;
  for (; at + width <= bytes.size(); at += width) {
    uint32_t c = unit(at);
    if (format.width == 2 && c >= 0xD800 && c < 0xDC00) {
      if (at + 2 * width > bytes.size()) return false;
      uint32_t low = unit(at + width);
      if (low < 0xDC00 || low >= 0xE000) return false;
      c = 0x10000 + ((c - 0xD800) << 10) + (low - 0xDC00);
      at += width;
    } else if ((c >= 0xD800 && c < 0xE000) || c > 0x10FFFF) {
      return false;
    }
    AppendUtf8(text, c);
  }
  return at == bytes.size();
}

// Converts through the code page; false when `bytes` is not valid in it.
bool DecodeCodePage(std::string_view bytes, UINT codePage, std::string& text) {
  if (bytes.empty()) return true;
  int size = MultiByteToWideChar(codePage, MB_ERR_INVALID_CHARS, bytes.data(),
                                 static_cast<int>(bytes.size()), nullptr, 0);
  if (size <= 0) return false;
  std::wstring wide(static_cast<size_t>(size), L'\0');
  MultiByteToWideChar(codePage, MB_ERR_INVALID_CHARS, bytes.data(), static_cast<int>(bytes.size()),
                      wide.data(), size);
  text += FromWide(wide);
  return true;
}

}  // namespace

std::optional<ParseError> ReadFileBytes(const std::string& path, size_t limit, std::string& bytes) {
  HANDLE file = CreateFileW(fs::LongPath(path).c_str(), GENERIC_READ,
                            FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr,
                            OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr);
  if (file == INVALID_HANDLE_VALUE) return Unreadable(SystemMessage(GetLastError()));
  std::unique_ptr<void, decltype(&CloseHandle)> closer(file, &CloseHandle);
  size_t expected = size_t{1} << 16;
  LARGE_INTEGER fileSize{};
  if (GetFileType(file) == FILE_TYPE_DISK && GetFileSizeEx(file, &fileSize)) {
    expected = static_cast<size_t>(fileSize.QuadPart) + 1;  // the end is seen without another read
  }
  return ReadUpToLimit(expected, limit, bytes,
                       [&](char* into, size_t room, size_t& got) -> std::optional<ParseError> {
                         DWORD want = static_cast<DWORD>(std::min<size_t>(room, DWORD{1} << 30));
                         DWORD read = 0;
                         if (!ReadFile(file, into, want, &read, nullptr)) {
                           DWORD error = GetLastError();
                           // The writer of a pipe closed its end: the end of the text.
                           if (error != ERROR_BROKEN_PIPE) return Unreadable(SystemMessage(error));
                         }
                         got = read;
                         return std::nullopt;
                       });
}

std::optional<std::string> ConvertToUtf8(std::string_view bytes, const std::string& encoding,
                                         std::string& text) {
  text.clear();
  std::string lower = LowerCase(encoding);
  if (auto format = UnicodeFormat(lower, bytes)) {
    if (DecodeUnits(bytes, *format, text)) return std::nullopt;
    return fmt::format("the text is not valid {}", encoding);
  }
  const auto* found = std::find_if(std::begin(kCodePages), std::end(kCodePages),
                                   [&](const auto& entry) { return lower == entry.first; });
  if (found == std::end(kCodePages) || !IsValidCodePage(found->second)) {
    return fmt::format("the encoding \"{}\" is not supported", encoding);
  }
  if (DecodeCodePage(bytes, found->second, text)) return std::nullopt;
  // The text converted so far: the longest prefix that converts, found by halving.
  size_t good = 0;
  size_t bad = bytes.size();
  while (bad - good > 1) {
    size_t middle = good + (bad - good) / 2;
    std::string probe;
    if (DecodeCodePage(bytes.substr(0, middle), found->second, probe)) {
      good = middle;
    } else {
      bad = middle;
    }
  }
  DecodeCodePage(bytes.substr(0, good), found->second, text);
  return fmt::format("the text is not valid {}", encoding);
}

}  // namespace trl::xml
