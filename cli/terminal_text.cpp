#include "terminal_text.h"

#include <fmt/format.h>
#include <utf8proc.h>

#include "platform/text.h"

namespace trl::cli {
namespace {

// The length of the UTF-8 sequence a lead byte begins; 0 for a byte that cannot begin one.
size_t SequenceLength(unsigned char lead) {
  if (lead < 0x80) return 1;
  if (lead >= 0xC2 && lead <= 0xDF) return 2;
  if (lead >= 0xE0 && lead <= 0xEF) return 3;
  if (lead >= 0xF0 && lead <= 0xF4) return 4;
  return 0;
}

}  // namespace

std::string Printable(std::string_view text) {
  std::string out;
  out.reserve(text.size());
  for (size_t i = 0; i < text.size();) {
    auto byte = static_cast<unsigned char>(text[i]);
    size_t length = SequenceLength(byte);
    std::string_view sequence = text.substr(i, length);
    bool control =
        byte < 0x20 || byte == 0x7F ||
        (byte == 0xC2 && sequence.size() == 2 && static_cast<unsigned char>(sequence[1]) < 0xA0);
    if (length == 0 || sequence.size() < length || !IsValidUtf8(sequence) || control) {
      size_t escaped = control && byte == 0xC2 ? 2 : 1;
      for (size_t k = 0; k < escaped; ++k) {
        out += fmt::format("\\x{:02x}", static_cast<unsigned char>(text[i + k]));
      }
      i += escaped;
      continue;
    }
    out.append(sequence);
    i += length;
  }
  return out;
}

size_t DisplayWidth(std::string_view text) {
  size_t width = 0;
  for (size_t i = 0; i < text.size();) {
    utf8proc_int32_t codePoint = 0;
    auto length = utf8proc_iterate(reinterpret_cast<const utf8proc_uint8_t*>(text.data() + i),
                                   static_cast<utf8proc_ssize_t>(text.size() - i), &codePoint);
    if (length <= 0) {
      ++width, ++i;
      continue;
    }
    width += static_cast<size_t>(std::max(utf8proc_charwidth(codePoint), 0));
    i += static_cast<size_t>(length);
  }
  return width;
}

}  // namespace trl::cli
