#include "platform/text.h"

#include <utf8proc.h>

#include <cstdint>

#include "platform/byte_words.h"

namespace trl {
namespace {

constexpr char32_t kEscapeBase = 0xF700;  // private-use block that carries offending bytes

// Decodes one UTF-8 character at `text[i]`; returns its length, or 0 when the bytes there are not
// valid UTF-8.
size_t DecodeUtf8(std::string_view text, size_t i, char32_t& out) {
  utf8proc_int32_t cp = 0;
  auto n = utf8proc_iterate(reinterpret_cast<const utf8proc_uint8_t*>(text.data() + i),
                            static_cast<utf8proc_ssize_t>(text.size() - i), &cp);
  if (n <= 0) return 0;
  out = static_cast<char32_t>(cp);
  return static_cast<size_t>(n);
}

void AppendUtf8(std::string& out, char32_t cp) {
  utf8proc_uint8_t buffer[4];
  auto n = utf8proc_encode_char(static_cast<utf8proc_int32_t>(cp), buffer);
  out.append(reinterpret_cast<const char*>(buffer), static_cast<size_t>(n));
}

// The length of the leading run of printable ASCII bytes (no control character) that `keep`,
// where `keepWord` tells it of eight of them at once.
template <class KeepWord, class Keep>
size_t PrintablePrefix(std::string_view text, KeepWord keepWord, Keep keep) {
  return PassingPrefix(
      text,
      [&](uint64_t word) {
        return !WordHasNonAscii(word) && !WordHasByteBelow(word, 0x20) && keepWord(word);
      },
      [&](unsigned char byte) { return byte >= 0x20 && byte < 0x80 && keep(byte); });
}

// Characters a name cannot carry as they are: those XML cannot hold, all control characters (an
// attribute value does not keep them through a reload), the component's path separator, and the
// escape block itself.
bool NeedsEscape(char32_t cp) {
  return cp < 0x20 || cp == '\\' || !IsXmlChar(cp) ||
         (cp >= kEscapeBase && cp <= kEscapeBase + 0xFF);
}

}  // namespace

bool IsXmlChar(char32_t cp) {
  if (cp < 0x20) return cp == 0x09 || cp == 0x0A || cp == 0x0D;
  if (cp >= 0xD800 && cp <= 0xDFFF) return false;
  return cp != 0xFFFE && cp != 0xFFFF && cp <= 0x10FFFF;
}

std::string LowerCase(std::string_view text) {
  // Names are mostly ASCII: that part is copied and lowered in place, without a test per append.
  size_t i = PassingPrefix(
      text, [](uint64_t word) { return !WordHasNonAscii(word); },
      [](unsigned char byte) { return byte < 0x80; });
  std::string out(text.substr(0, i));
  for (char& c : out) c = static_cast<char>(c >= 'A' && c <= 'Z' ? c + 32 : c);
  if (i == text.size()) return out;
  out.reserve(text.size());
  while (i < text.size()) {
    auto byte = static_cast<unsigned char>(text[i]);
    if (byte < 0x80) {
      out.push_back(static_cast<char>(byte >= 'A' && byte <= 'Z' ? byte + 32 : byte));
      ++i;
      continue;
    }
    char32_t cp = 0;
    size_t n = DecodeUtf8(text, i, cp);
    if (n == 0) {
      out.push_back(static_cast<char>(byte));
      ++i;
      continue;
    }
    AppendUtf8(out, static_cast<char32_t>(utf8proc_tolower(static_cast<utf8proc_int32_t>(cp))));
    i += n;
  }
  return out;
}

bool IsValidUtf8(std::string_view text) {
  for (size_t i = 0; i < text.size();) {
    if (static_cast<unsigned char>(text[i]) < 0x80) {
      ++i;
      continue;
    }
    char32_t cp = 0;
    size_t n = DecodeUtf8(text, i, cp);
    if (n == 0) return false;
    i += n;
  }
  return true;
}

bool IsXmlSafe(std::string_view text) {
  for (size_t i = PrintablePrefix(
           text, [](uint64_t) { return true; }, [](unsigned char) { return true; });
       i < text.size();) {
    auto byte = static_cast<unsigned char>(text[i]);
    if (byte < 0x80) {
      if (!IsXmlChar(byte)) return false;
      ++i;
      continue;
    }
    char32_t cp = 0;
    size_t n = DecodeUtf8(text, i, cp);
    if (n == 0 || !IsXmlChar(cp)) return false;
    i += n;
  }
  return true;
}

std::string NameFromNative(std::string_view bytes) {
  size_t i = PrintablePrefix(
      bytes, [](uint64_t word) { return !WordHasByte(word, '\\'); },
      [](unsigned char byte) { return byte != '\\'; });
  std::string out(bytes.substr(0, i));
  if (i == bytes.size()) return out;
  out.reserve(bytes.size());
  while (i < bytes.size()) {
    auto byte = static_cast<unsigned char>(bytes[i]);
    if (byte >= 0x20 && byte < 0x80 && byte != '\\') {
      out.push_back(static_cast<char>(byte));
      ++i;
      continue;
    }
    char32_t cp = 0;
    size_t n = byte < 0x80 ? 1 : DecodeUtf8(bytes, i, cp);
    if (byte < 0x80) cp = byte;
    if (n == 0 || NeedsEscape(cp)) {
      size_t count = n == 0 ? 1 : n;  // escape every byte of an offending character
      for (size_t k = 0; k < count; ++k) {
        AppendUtf8(out, kEscapeBase + static_cast<unsigned char>(bytes[i + k]));
      }
      i += count;
      continue;
    }
    out.append(bytes.substr(i, n));
    i += n;
  }
  return out;
}

std::string NameToNative(std::string_view name) {
  std::string out;
  out.reserve(name.size());
  for (size_t i = 0; i < name.size();) {
    char32_t cp = 0;
    size_t n = static_cast<unsigned char>(name[i]) < 0x80 ? 1 : DecodeUtf8(name, i, cp);
    if (n == 3 && cp >= kEscapeBase && cp <= kEscapeBase + 0xFF) {
      out.push_back(static_cast<char>(cp - kEscapeBase));
    } else {
      out.append(name.substr(i, n == 0 ? 1 : n));
    }
    i += n == 0 ? 1 : n;
  }
  return out;
}

}  // namespace trl
