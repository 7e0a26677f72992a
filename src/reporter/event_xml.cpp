#include "reporter/event_xml.h"

#include <utf8proc.h>

#include <string_view>

#include "platform/text.h"

namespace trl {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";  // U+FFFD

// Copies the non-ASCII character that starts `text`, or U+FFFD in its place when it is not valid
// UTF-8 or XML cannot carry it; returns how many bytes it used up. A bad byte is replaced on its
// own so the characters after it survive.
size_t AppendNonAscii(std::string& out, std::string_view text) {
  utf8proc_int32_t codePoint = 0;
  auto length = utf8proc_iterate(reinterpret_cast<const utf8proc_uint8_t*>(text.data()),
                                 static_cast<utf8proc_ssize_t>(text.size()), &codePoint);
  if (length <= 0) {
    out += kReplacement;
    return 1;
  }
  auto character = text.substr(0, static_cast<size_t>(length));
  out += IsXmlSafe(character) ? character : kReplacement;
  return character.size();
}

// Tab, newline and carriage return go out as character references: written literally, a parser
// would turn them into blanks on reload.
void AppendEscaped(std::string& out, std::string_view text) {
  for (size_t i = 0; i < text.size();) {
    char c = text[i];
    if (static_cast<unsigned char>(c) >= 0x80) {
      i += AppendNonAscii(out, text.substr(i));
      continue;
    }
    switch (c) {
      case '&':
        out += "&amp;";
        break;
      case '<':
        out += "&lt;";
        break;
      case '>':
        out += "&gt;";
        break;
      case '"':
        out += "&quot;";
        break;
      case '\t':
        out += "&#9;";
        break;
      case '\n':
        out += "&#10;";
        break;
      case '\r':
        out += "&#13;";
        break;
      default:
        if (static_cast<unsigned char>(c) < 0x20) {
          out += kReplacement;
        } else {
          out.push_back(c);
        }
    }
    ++i;
  }
}

void AppendAttribute(std::string& out, std::string_view name, std::string_view value) {
  out.push_back(' ');
  out += name;
  out += "=\"";
  AppendEscaped(out, value);
  out.push_back('"');
}

}  // namespace

std::string EventsToXml(const std::deque<Event>& events) {
  if (events.empty()) return "<events/>";
  std::string out = "<events>";
  for (const Event& event : events) {
    out += "<event";
    AppendAttribute(out, "number", std::to_string(event.number));
    AppendAttribute(out, "description", event.description);
    AppendAttribute(out, "kind", std::to_string(event.kind));
    AppendAttribute(out, "component", event.component);
    AppendAttribute(out, "class", event.className);
    AppendAttribute(out, "procedure", event.procedure);
    AppendAttribute(out, "source", event.source);
    AppendAttribute(out, "time", event.time);
    out += "/>";
  }
  out += "</events>";
  return out;
}

}  // namespace trl
