#include "path_search_options.h"

#include <fmt/format.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "command_error.h"
#include "frame/vocabulary.h"
#include "platform/fs/file_system.h"
#include "platform/text.h"

namespace trl::cli {
namespace {

// The folder in the component's "\" form, ending with "\", each name kept reversibly.
std::string ComponentFolder(const std::filesystem::path& absolute) {
  std::string folder = "\\";
  for (const auto& part : absolute.relative_path()) {
    if (part.empty()) continue;
    folder += NameFromNative(part.native());
    folder += '\\';
  }
  return folder;
}

}  // namespace

xml::DocumentPtr SearchOptionsForPaths(const std::vector<std::string>& paths) {
  auto document = std::make_shared<xml::Document>();
  xml::Node root = document->SetDocumentElement(document->CreateElement("trl_searchoptions"));
  xml::Node c = root.AppendChild(document->CreateElement(vocab::c));
  for (const auto& [name, value] : {std::pair{vocab::c_id, "1"},
                                    {vocab::c_text, "localhost"},
                                    {vocab::c_name, "localhost"},
                                    {vocab::c_local, "1"}}) {
    c.SetAttribute(name, value);
  }
  xml::Node m = c.AppendChild(document->CreateElement(vocab::m));
  for (const auto& [name, value] :
       {std::pair{vocab::m_id, "1"}, {vocab::m_text, ""}, {vocab::m_name, ""}}) {
    m.SetAttribute(name, value);
  }
  const std::string everything = std::to_string(fs::kAllAttributes);
  int id = 0;
  for (const std::string& path : paths) {
    std::error_code error;
    if (!std::filesystem::is_directory(path, error)) {
      throw CommandError(fmt::format("cannot search '{}': {}", path,
                                     error ? error.message() : std::strerror(ENOTDIR)));
    }
    auto absolute = std::filesystem::absolute(path).lexically_normal();
    xml::Node d = m.AppendChild(document->CreateElement(vocab::d));
    d.SetAttribute(vocab::d_id, std::to_string(++id));
    d.SetAttribute(vocab::d_text, ComponentFolder(absolute));
    d.SetAttribute(vocab::d_search, "1");
    d.SetAttribute(vocab::d_search_recurse, "True");
    d.SetAttribute(vocab::d_search_d_attributes, everything);
    d.SetAttribute(vocab::d_search_f_attributes, everything);
    d.SetAttribute(vocab::d_search_f_properties, "0");
    d.SetAttribute(vocab::d_search_links, "1");
    d.AppendChild(document->CreateElement(vocab::d_search_mask));
  }
  return document;
}

}  // namespace trl::cli
