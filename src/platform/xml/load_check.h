#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl::xml {

// A place where a document's text breaks a rule the parser lets pass, or one of the Limits.
struct TextFault {
  size_t offset = 0;  // bytes from the start of the text
  std::string reason;
  bool limit = false;
};

// What one pass over a document's UTF-8 text finds beyond the parser's own checks (see
// Document::LoadXml): the first fault and the number of start tags. The pass stops at a limit, so
// that a text over one never reaches the parser, and goes on after any other fault, to be sure of
// that. Markup is followed only as far as needed to know where references and attribute values
// stand and where elements begin and end; markup that is malformed is the parser's to report.
struct TextCheck {
  std::optional<TextFault> fault;
  bool overLimit = false;
  size_t elements = 0;
};
TextCheck CheckDocumentText(std::string_view text, const Limits& limits);

}  // namespace trl::xml
