#include "path_search_options.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "command_error.h"
#include "document_files.h"
#include "document_kind.h"
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

// Whether `folder` lies in `root` (both in "\" form, ending with "\"), letter case aside.
bool Below(const std::string& folder, const std::string& root) {
  return LowerCase(folder).starts_with(LowerCase(root));
}

}  // namespace

namespace {

// Adds to the drive `m` of the search options a folder entry for each of `applications` (managed
// applications of the user data) whose folder lies below one of `roots`, so that one no longer
// found there is reported missing.
void ListManagedBelow(xml::Document& searchOptions, xml::Node m,
                      const std::vector<std::string>& roots,
                      const std::vector<xml::Node>& applications) {
  size_t folders = m.ChildElements(vocab::d).size();
  for (const xml::Node& a : applications) {
    xml::Node d = a.ParentNode();
    std::string folder = d.GetAttribute(vocab::d_text).value_or("");
    if (std::none_of(roots.begin(), roots.end(),
                     [&](const std::string& root) { return Below(folder, root); })) {
      continue;
    }
    xml::Node place = m.AppendChild(searchOptions.CreateElement(vocab::d));
    place.SetAttribute(vocab::d_id, std::to_string(++folders));
    place.SetAttribute(vocab::d_text, folder);
    place.SetAttribute(vocab::d_name, d.GetAttribute(vocab::d_name).value_or(""));
    xml::Node managed = place.AppendChild(searchOptions.CreateElement(vocab::a));
    managed.SetAttribute(vocab::a_id, a.GetAttribute(vocab::a_id).value_or(""));
    managed.SetAttribute(vocab::a_name, a.GetAttribute(vocab::a_name).value_or(""));
    managed.SetAttribute(vocab::a_manage, "1");
  }
}

}  // namespace

void ListManagedApplications(xml::Document& searchOptions, xml::Document& userData) {
  xml::Node m = searchOptions.DocumentElement().SelectSingleNode("c/m");
  std::vector<std::string> roots;
  for (const xml::Node& d : m.ChildElements(vocab::d))
    roots.push_back(*d.GetAttribute(vocab::d_text));
  xml::Node root = userData.DocumentElement();
  if (!root) return;
  ListManagedBelow(searchOptions, m, roots,
                   root.SelectNodes("c[@c_local='1']/m[@m_name='']/d/a[@a_manage='1']"));
}

void ListManagedApplicationsByName(xml::Document& searchOptions, xml::Document& userData) {
  xml::Node root = userData.DocumentElement();
  if (!root) return;
  for (const xml::Node& c : searchOptions.DocumentElement().ChildElements(vocab::c)) {
    xml::Node computer = userData.FindChild(root, vocab::c, vocab::c_name,
                                            c.GetAttribute(vocab::c_name).value_or(""));
    if (!computer) continue;
    for (const xml::Node& m : c.ChildElements(vocab::m)) {
      xml::Node drive = userData.FindChild(computer, vocab::m, vocab::m_name,
                                           m.GetAttribute(vocab::m_name).value_or(""));
      if (!drive) continue;
      std::vector<std::string> roots;
      for (const xml::Node& d : m.ChildElements(vocab::d)) {
        if (d.GetAttribute(vocab::d_search) == "1") {
          roots.push_back(d.GetAttribute(vocab::d_text).value_or(""));
        }
      }
      std::vector<xml::Node> managed;
      for (const xml::Node& d : drive.ChildElements(vocab::d)) {
        for (const xml::Node& a : d.ChildElements(vocab::a)) {
          if (a.GetAttribute(vocab::a_manage) == "1") managed.push_back(a);
        }
      }
      ListManagedBelow(searchOptions, m, roots, managed);
    }
  }
}

void ExcludeFolders(xml::Document& searchOptions, const std::vector<std::string>& globs) {
  for (xml::Node d : searchOptions.AsNode().SelectNodes("/*/c/m/d[@d_search='1']")) {
    for (const std::string& glob : globs) {
      d.AppendChild(searchOptions.CreateElement(vocab::d_search_exclude)).SetText(glob);
    }
  }
}

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
    if (absolute == "/") {
      // The kernel's views of processes and devices: no software is installed there, and some
      // of their files read without end.
      for (const char* view : {"/proc", "/sys", "/dev"}) {
        d.AppendChild(document->CreateElement(vocab::d_search_exclude)).SetText(view);
      }
    }
  }
  return document;
}

void AddFolderOptions(CLI::App& command, std::vector<std::string>& paths,
                      std::string& searchOptions, std::vector<std::string>& excluded,
                      const std::string& searchOptionsHelp) {
  command.add_option("folders", paths,
                     "Folders to search (instead of --search-options), each with everything below "
                     "it");
  command.add_option("--search-options", searchOptions, searchOptionsHelp);
  command.add_option("--exclude", excluded,
                     "Leave out the folders this glob matches, by name or by path (repeatable)");
}

xml::DocumentPtr GivenSearchOptions(const std::vector<std::string>& paths, const std::string& file,
                                    const std::vector<std::string>& excluded) {
  auto searchOptions =
      paths.empty() ? LoadDocumentFile(file, kSearchOptionsRole) : SearchOptionsForPaths(paths);
  if (!excluded.empty()) ExcludeFolders(*searchOptions, excluded);
  return searchOptions;
}

}  // namespace trl::cli
