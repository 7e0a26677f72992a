#include "platform/xml/load_check.h"

#include <fmt/format.h>
#include <utf8proc.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <cstring>
#include <unordered_set>

#include "platform/text.h"

namespace trl::xml {
namespace {

// ASCII bytes that are characters XML allows: printable ones, tab, line feed, carriage return.
constexpr std::array<bool, 256> kAllowed = [] {
  std::array<bool, 256> allowed{};
  for (int c = 0x20; c < 0x80; ++c) allowed[c] = true;
  allowed['\t'] = allowed['\n'] = allowed['\r'] = true;
  return allowed;
}();

// Those of them that stand for themselves in character data.
constexpr std::array<bool, 256> kPlain = [] {
  std::array<bool, 256> plain = kAllowed;
  plain['<'] = plain['&'] = false;
  return plain;
}();

// `table` without `excluded`.
constexpr std::array<bool, 256> Without(std::array<bool, 256> table, std::string_view excluded) {
  for (char c : excluded) table[static_cast<unsigned char>(c)] = false;
  return table;
}

// Those that may stand in an element or attribute name (the parser judges names), and those
// that stand for themselves between quotes.
constexpr std::array<bool, 256> kInName = Without(kAllowed, " \t\r\n=>/<\"'");
constexpr std::array<bool, 256> kInDoubleQuotes = Without(kPlain, "\"");
constexpr std::array<bool, 256> kInSingleQuotes = Without(kPlain, "'");

constexpr std::array<bool, 256> kSpace = [] {
  std::array<bool, 256> space{};
  for (char c : std::string_view(" \t\r\n")) space[static_cast<unsigned char>(c)] = true;
  return space;
}();

int DigitValue(char c, bool hex) {
  if (c >= '0' && c <= '9') return c - '0';
  if (!hex) return -1;
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

// A mark (the byte's high bit) on each byte of `word` that needs a closer look in text or between
// `quote`s: beyond ASCII, a control character, "<", "&" or the quote. Eight bytes at once; a
// mark above a marked byte may be false, the lowest mark never is.
uint64_t MarkedBytes(uint64_t word, char quote) {
  constexpr uint64_t kOnes = 0x0101010101010101;
  constexpr uint64_t kHigh = 0x8080808080808080;
  auto below = [](uint64_t w, uint64_t value) { return (w - kOnes * value) & ~w & kHigh; };
  auto equal = [&](char c) { return below(word ^ (kOnes * static_cast<unsigned char>(c)), 1); };
  return (word & kHigh) | below(word, 0x20) | equal('<') | equal('&') | equal(quote);
}

// Attribute names of one element are compared one by one up to this many, then hashed.
constexpr size_t kNamesScanned = 16;

class Checker {
 public:
  Checker(std::string_view text, const Limits& limits) : text_(text), limits_(limits) {}

  TextCheck Run() {
    while (i_ < text_.size() && !overLimit_) {
      SkipPlain(kPlain, '<');  // character data has no quote: "<" stands in for one
      if (i_ == text_.size()) break;
      if (text_[i_] == '<') {
        Markup();
      } else if (text_[i_] == '&') {
        Reference();
      } else {
        Character();
      }
    }
    return {std::move(fault_), overLimit_, elements_};
  }

 private:
  unsigned char Byte(size_t at) const { return static_cast<unsigned char>(text_[at]); }
  bool At(char c) const { return i_ < text_.size() && text_[i_] == c; }
  void SkipSpace() { SkipWhile(kSpace); }
  // Steps past the bytes `table` holds in text or between `quote`s: eight at a time up to the
  // first that needs a closer look, which may still be plain (a tab, a line end).
  void SkipPlain(const std::array<bool, 256>& table, char quote) {
    const char* at = text_.data() + i_;
    const char* last = text_.data() + text_.size();
    if constexpr (std::endian::native == std::endian::little) {
      while (last - at >= 8) {
        uint64_t word = 0;
        std::memcpy(&word, at, 8);
        uint64_t marked = MarkedBytes(word, quote);
        if (marked == 0) {
          at += 8;
          continue;
        }
        at += std::countr_zero(marked) / 8;
        if (!table[static_cast<unsigned char>(*at)]) break;
        ++at;
      }
    }
    while (at != last && table[static_cast<unsigned char>(*at)]) ++at;
    i_ = static_cast<size_t>(at - text_.data());
  }
  // Steps past the bytes that `table` holds, up to `end` at most. A local pointer, since a store
  // to i_ might change the text for all the compiler knows.
  void SkipWhile(const std::array<bool, 256>& table, size_t end = std::string_view::npos) {
    const char* at = text_.data() + i_;
    const char* last = text_.data() + std::min(end, text_.size());
    while (at != last && table[static_cast<unsigned char>(*at)]) ++at;
    i_ = static_cast<size_t>(at - text_.data());
  }

  void Fault(size_t offset, std::string reason) {
    if (!fault_) fault_ = TextFault{offset, std::move(reason), false};
  }
  void OverLimit(size_t offset, std::string reason) {
    if (!fault_) fault_ = TextFault{offset, std::move(reason), true};
    overLimit_ = true;
  }

  // Checks the character at i_ and steps past it.
  void Character() {
    unsigned char byte = Byte(i_);
    if (kAllowed[byte]) {
      ++i_;
      return;
    }
    if (byte < 0x80) {
      Fault(i_, fmt::format("the character U+{:04X} is not allowed in XML", byte));
      ++i_;
      return;
    }
    utf8proc_int32_t cp = 0;
    auto n = utf8proc_iterate(reinterpret_cast<const utf8proc_uint8_t*>(text_.data() + i_),
                              static_cast<utf8proc_ssize_t>(text_.size() - i_), &cp);
    if (n <= 0) {
      Fault(i_, "the text is not valid UTF-8");
      ++i_;
      return;
    }
    if (!IsXmlChar(static_cast<char32_t>(cp))) {
      Fault(i_, fmt::format("the character U+{:04X} is not allowed in XML", cp));
    }
    i_ += static_cast<size_t>(n);
  }

  // Checks the characters up to and through `end`, or to the end of the text when it never comes.
  void Through(std::string_view end) {
    size_t found = text_.find(end, i_);
    size_t last = found == std::string_view::npos ? text_.size() : found + end.size();
    while (i_ < last) {
      SkipWhile(kAllowed, last);
      if (i_ < last) Character();
    }
  }

  // Steps past a name, checking its characters.
  void Name() {
    for (;;) {
      SkipWhile(kInName);
      if (i_ == text_.size() || (Byte(i_) < 0x80 && kAllowed[Byte(i_)])) return;
      Character();
    }
  }

  void Markup() {
    char next = i_ + 1 < text_.size() ? text_[i_ + 1] : '\0';
    if (next == '/') {
      i_ += 2;
      Through(">");
      if (depth_ > 0) --depth_;
    } else if (next == '?') {
      i_ += 2;
      Through("?>");
    } else if (next != '!') {
      StartTag();
    } else if (text_.substr(i_).starts_with("<!--")) {
      i_ += 4;
      Through("-->");
    } else if (text_.substr(i_).starts_with("<![CDATA[")) {
      i_ += 9;
      Through("]]>");
    } else {
      Declaration();
    }
  }

  // A document type declaration with its internal subset: declarations nested in brackets,
  // quoted literals, comments and processing instructions. The parser keeps nothing of it.
  void Declaration() {
    size_t nesting = 0;
    while (i_ < text_.size()) {
      std::string_view rest = text_.substr(i_);
      char c = text_[i_];
      if (rest.starts_with("<!--")) {
        i_ += 4;
        Through("-->");
      } else if (rest.starts_with("<?")) {
        i_ += 2;
        Through("?>");
      } else if (c == '"' || c == '\'') {
        ++i_;
        Through(rest.substr(0, 1));
      } else if (c == '<') {
        ++nesting;
        ++i_;
      } else if (c == '>') {
        ++i_;
        if (--nesting == 0) return;
      } else {
        Character();
      }
    }
  }

  void StartTag() {
    size_t start = i_;
    if (++elements_ > limits_.elements) {
      OverLimit(start, fmt::format("the document has more than {} elements, the most a document "
                                   "may have",
                                   limits_.elements));
      return;
    }
    if (depth_ + 1 > limits_.depth) {
      OverLimit(start, fmt::format("the elements are nested more than {} deep, the most a "
                                   "document may have",
                                   limits_.depth));
      return;
    }
    ++i_;
    Name();
    nameCount_ = 0;
    nameBits_ = 0;
    if (!nameSet_.empty()) nameSet_ = {};  // clearing a large table costs its size, each time
    for (;;) {
      SkipSpace();
      if (i_ == text_.size() || At('<')) return;
      if (At('/')) {
        ++i_;
        if (At('>')) ++i_;
        return;
      }
      if (At('>')) {
        ++i_;
        ++depth_;
        return;
      }
      if (!Attribute()) return;
    }
  }

  // One attribute, name="value" or name='value'; false when what stands here is not one.
  bool Attribute() {
    size_t nameStart = i_;
    Name();
    std::string_view name = text_.substr(nameStart, i_ - nameStart);
    SkipSpace();
    if (name.empty() || !At('=')) return false;
    ++i_;
    SkipSpace();
    if (!At('"') && !At('\'')) return false;
    char quote = text_[i_++];
    if (Seen(name)) {
      Fault(nameStart, fmt::format("the attribute \"{}\" is given twice on one element", name));
    }
    const auto& plain = quote == '"' ? kInDoubleQuotes : kInSingleQuotes;
    for (;;) {
      SkipPlain(plain, quote);
      if (i_ == text_.size() || text_[i_] == quote) break;
      if (At('&')) {
        Reference();
      } else if (At('<')) {
        Fault(i_, "a \"<\" cannot stand in an attribute value");
        ++i_;
      } else {
        Character();
      }
    }
    if (i_ < text_.size()) ++i_;
    return true;
  }

  // Whether the element being read has an attribute `name` already; notes it.
  bool Seen(std::string_view name) {
    if (nameCount_ < kNamesScanned) {
      // A bit per length and last letter: names that differ there are told apart without a
      // comparison.
      uint64_t bit =
          uint64_t{1} << ((name.size() * 7 + static_cast<unsigned char>(name.back())) % 64);
      bool seen = false;
      for (size_t k = 0; (nameBits_ & bit) != 0 && k < nameCount_ && !seen; ++k) {
        seen = NoteName(k) == name;
      }
      nameBits_ |= bit;
      // Kept as two words, not as a view: a view written in halves and read whole stalls.
      nameData_[nameCount_] = name.data();
      nameSizes_[nameCount_++] = name.size();
      return seen;
    }
    if (nameSet_.empty()) {
      for (size_t k = 0; k < nameCount_; ++k) nameSet_.insert(NoteName(k));
    }
    return !nameSet_.insert(name).second;
  }
  std::string_view NoteName(size_t k) const { return {nameData_[k], nameSizes_[k]}; }

  // "&#" and digits and ";", or "&#x" and hexadecimal digits and ";", must name a character XML
  // allows. Other references are the parser's business.
  void Reference() {
    size_t start = i_++;
    if (!At('#')) return;
    ++i_;
    bool hex = At('x');
    if (hex) ++i_;
    uint32_t value = 0;
    size_t digits = 0;
    for (int digit = 0; i_ < text_.size() && (digit = DigitValue(text_[i_], hex)) >= 0; ++i_) {
      // Kept from growing past the first number beyond Unicode, which is all that matters.
      value = std::min<uint32_t>(value * (hex ? 16 : 10) + static_cast<uint32_t>(digit), 0x110000);
      ++digits;
    }
    if (digits == 0 || !At(';')) {
      Fault(start,
            "a character reference is \"&#\", a number and \";\", or \"&#x\", a hexadecimal "
            "number and \";\"");
      return;
    }
    ++i_;
    if (!IsXmlChar(value)) {
      Fault(start, fmt::format("the character reference \"{}\" stands for a character XML does "
                               "not allow",
                               text_.substr(start, i_ - start)));
    }
  }

  std::string_view text_;
  const Limits& limits_;
  size_t i_ = 0;
  size_t depth_ = 0;
  size_t elements_ = 0;
  std::optional<TextFault> fault_;
  bool overLimit_ = false;
  // The names of the attributes of the element being read: the first ones, then all of them.
  std::array<const char*, kNamesScanned> nameData_{};
  std::array<size_t, kNamesScanned> nameSizes_{};
  size_t nameCount_ = 0;
  uint64_t nameBits_ = 0;
  std::unordered_set<std::string_view> nameSet_;
};

}  // namespace

TextCheck CheckDocumentText(std::string_view text, const Limits& limits) {
  return Checker(text, limits).Run();
}

}  // namespace trl::xml
