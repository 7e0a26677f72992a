#include "platform/xml/name.h"

#include <utf8proc.h>

#include <algorithm>
#include <iterator>

namespace trl::xml {
namespace {

struct Range {
  char32_t first;
  char32_t last;
};

// NameStartChar of XML 1.0 (fifth edition), in ascending order.
constexpr Range kNameStart[] = {
    {':', ':'},       {'A', 'Z'},       {'_', '_'},       {'a', 'z'},
    {0xC0, 0xD6},     {0xD8, 0xF6},     {0xF8, 0x2FF},    {0x370, 0x37D},
    {0x37F, 0x1FFF},  {0x200C, 0x200D}, {0x2070, 0x218F}, {0x2C00, 0x2FEF},
    {0x3001, 0xD7FF}, {0xF900, 0xFDCF}, {0xFDF0, 0xFFFD}, {0x10000, 0xEFFFF},
};

// What NameChar adds to NameStartChar.
constexpr Range kNameRest[] = {
    {'-', '.'}, {'0', '9'}, {0xB7, 0xB7}, {0x300, 0x36F}, {0x203F, 0x2040},
};

template <size_t N>
bool InRanges(const Range (&ranges)[N], char32_t c) {
  auto it = std::lower_bound(std::begin(ranges), std::end(ranges), c,
                             [](const Range& range, char32_t value) { return range.last < value; });
  return it != std::end(ranges) && it->first <= c;
}

bool IsAsciiNameChar(unsigned char c, bool first) {
  bool start = c == ':' || c == '_' || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
  return start || (!first && (c == '-' || c == '.' || (c >= '0' && c <= '9')));
}

}  // namespace

bool IsXmlName(std::string_view name) {
  if (name.empty()) return false;
  // Names are nearly always ASCII: checked without decoding, unless a byte says otherwise.
  size_t ascii = 0;
  while (ascii < name.size() && static_cast<unsigned char>(name[ascii]) < 0x80) {
    if (!IsAsciiNameChar(static_cast<unsigned char>(name[ascii]), ascii == 0)) return false;
    ++ascii;
  }
  if (ascii == name.size()) return true;
  auto bytes = reinterpret_cast<const utf8proc_uint8_t*>(name.data());
  auto left = static_cast<utf8proc_ssize_t>(name.size());
  bool first = true;
  while (left > 0) {
    utf8proc_int32_t cp = 0;
    auto n = utf8proc_iterate(bytes, left, &cp);
    if (n <= 0) return false;
    auto c = static_cast<char32_t>(cp);
    if (!InRanges(kNameStart, c) && (first || !InRanges(kNameRest, c))) return false;
    first = false;
    bytes += n;
    left -= n;
  }
  return true;
}

}  // namespace trl::xml
