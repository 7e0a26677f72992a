#include "fuzz_input.h"

#include <cstdio>
#include <cstdlib>
#include <memory>

#include "fuzz_tree.h"

namespace trl::fuzz {

std::vector<std::string_view> SplitInput(const uint8_t* data, size_t size, size_t count) {
  std::string_view rest(reinterpret_cast<const char*>(data), size);
  std::vector<std::string_view> parts;
  while (parts.size() + 1 < count) {
    size_t end = rest.find(kPartSeparator);
    if (end == std::string_view::npos) break;
    parts.push_back(rest.substr(0, end));
    rest.remove_prefix(end + kPartSeparator.size());
  }
  if (count > 0) parts.push_back(rest);
  return parts;
}

xml::DocumentPtr DocumentOf(const std::vector<std::string_view>& parts, size_t index, bool rooted) {
  if (index >= parts.size()) return nullptr;
  auto document = std::make_shared<xml::Document>();
  document->LoadXml(rooted ? WithTreeRoot(parts[index]) : std::string(parts[index]));
  return document;
}

void Require(bool holds, std::string_view what) {
  if (holds) return;
  std::fprintf(stderr, "fuzz: %.*s\n", static_cast<int>(what.size()), what.data());
  std::abort();
}

void RequireLoadable(const std::string& text, std::string_view stage) {
  if (text.empty()) return;
  xml::Document document;
  if (document.LoadXml(text)) return;
  std::fprintf(stderr, "fuzz: the result of %.*s does not load again (%s):\n%s\n",
               static_cast<int>(stage.size()), stage.data(),
               document.LastParseError().reason.c_str(), text.c_str());
  std::abort();
}

}  // namespace trl::fuzz
