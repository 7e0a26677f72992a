#include "machine_results.h"

#include <fmt/format.h>

#include <vector>

#include "command_error.h"
#include "frame/vocabulary.h"
#include "gzip_text.h"
#include "schema/schema.h"

namespace trl::cli {
namespace {

constexpr std::string_view kRoot = "trl_machine";
constexpr std::string_view kSearchOptionsRoot = "trl_searchoptions";
// Far more than the root's start tag needs, whatever comes before it.
constexpr size_t kHeadSize = size_t{64} << 10;

void Rename(xml::Document& document, const MachineName& machine) {
  xml::Node root = document.DocumentElement();
  if (!root) return;
  for (xml::Node c : root.ChildElements(vocab::c)) {
    if (c.GetAttribute(vocab::c_local) != "1") continue;
    c.SetAttribute(vocab::c_text, machine.text);
    c.SetAttribute(vocab::c_name, machine.name);
  }
}

// The start tag of the first element of `text`, made an empty element, or "" when it is not all
// there.
std::string FirstStartTag(std::string_view text) {
  size_t at = 0;
  for (;;) {
    at = text.find('<', at);
    if (at == std::string_view::npos || at + 1 >= text.size()) return "";
    if (text[at + 1] != '?' && text[at + 1] != '!') break;
    std::string_view end = text.substr(at, 4) == "<!--" ? "-->" : ">";
    at = text.find(end, at + 2);
    if (at == std::string_view::npos) return "";
  }
  char quote = 0;
  for (size_t end = at + 1; end < text.size(); ++end) {
    char ch = text[end];
    if (quote != 0) {
      if (ch == quote) quote = 0;
    } else if (ch == '"' || ch == '\'') {
      quote = ch;
    } else if (ch == '>') {
      std::string tag(text.substr(at, end - at));
      return tag.ends_with('/') ? tag + ">" : tag + "/>";
    }
  }
  return "";
}

}  // namespace

xml::DocumentPtr MachineResults(const std::string& computer, xml::Document& searchOptions,
                                xml::Document& results) {
  MachineName machine{computer, Schema().EncodeName(computer)};
  Rename(searchOptions, machine);
  Rename(results, machine);
  auto document = std::make_shared<xml::Document>();
  xml::Node root = document->SetDocumentElement(document->CreateElement(kRoot));
  root.SetAttribute(vocab::c_text, machine.text);
  root.SetAttribute(vocab::c_name, machine.name);
  // The search options' own root may have any name: it is kept under a fixed one.
  xml::Node options = root.AppendChild(document->CreateElement(kSearchOptionsRoot));
  for (const auto& [name, value] : searchOptions.DocumentElement().Attributes()) {
    options.SetAttribute(name, value);
  }
  // Each moves over: both documents are left without their content.
  for (const xml::Node& child : searchOptions.DocumentElement().ChildNodes()) {
    options.AppendChild(child);
  }
  root.AppendChild(results.DocumentElement());
  return document;
}

std::optional<MachineName> MachineNameOf(const std::string& path) {
  std::optional<std::string> head = ReadFileHead(path, kHeadSize);
  if (!head) return std::nullopt;
  std::string tag = FirstStartTag(*head);
  xml::Document document;
  if (tag.empty() || !document.LoadXml(tag)) return std::nullopt;
  xml::Node root = document.DocumentElement();
  auto text = root.GetAttribute(vocab::c_text);
  auto name = root.GetAttribute(vocab::c_name);
  if (root.NodeName() != kRoot || !text || !name) return std::nullopt;
  return MachineName{*text, *name};
}

MachineRun SplitMachineResults(xml::DocumentPtr machine, const std::string& path) {
  xml::Node root = machine->DocumentElement();
  auto one = [&](std::string_view tag) {
    std::vector<xml::Node> found = root.ChildElements(tag);
    if (found.size() != 1) {
      throw CommandError(fmt::format("the machine results '{}' hold {} {} elements instead of one",
                                     path, found.size(), tag));
    }
    return found.front();
  };
  auto text = root.GetAttribute(vocab::c_text);
  auto name = root.GetAttribute(vocab::c_name);
  if (!text || !name) {
    throw CommandError(fmt::format("the machine results '{}' do not name their machine", path));
  }
  MachineRun run{{*text, *name}, std::make_shared<xml::Document>(), machine};
  xml::Node options = one(kSearchOptionsRoot);
  xml::Node results = one(vocab::results_root);
  // The search options are small: copied out. The results become the document's own root.
  run.searchOptions->SetDocumentElement(options);
  machine->SetDocumentElement(results);
  return run;
}

}  // namespace trl::cli
