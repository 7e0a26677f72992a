#pragma once

#include <string>
#include <string_view>

namespace trl {

// Unicode simple lower-casing of UTF-8 text (names compare regardless of case). ASCII takes a fast
// path; bytes that are not valid UTF-8 pass through unchanged.
std::string LowerCase(std::string_view text);

bool IsValidUtf8(std::string_view text);

// Whether the '\0'-terminated `text` equals `view`, without measuring `text` first: tags,
// attribute names and index keys are compared by the million.
inline bool TerminatedEquals(const char* text, std::string_view view) {
  for (char c : view) {
    if (*text != c || c == '\0') return false;
    ++text;
  }
  return *text == '\0';
}

// Whether `cp` is a character an XML 1.0 document may hold (the Char production).
bool IsXmlChar(char32_t cp);

// True when every character of valid UTF-8 `text` may stand in an XML 1.0 document.
bool IsXmlSafe(std::string_view text);

// A name as the file system gives it (raw bytes) turned into UTF-8 text that any XML document can
// carry and that uses no "\": every byte that is not part of valid UTF-8, every control character,
// U+FFFE/U+FFFF, "\" and each byte of a literal U+F700..U+F7FF becomes the private-use character
// U+F700 + byte. NameToNative reverses it exactly.
std::string NameFromNative(std::string_view bytes);
std::string NameToNative(std::string_view name);

}  // namespace trl
