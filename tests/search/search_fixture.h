#pragma once

#include <gtest/gtest.h>

#include <set>
#include <string>

#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/temp_tree.h"
#include "trl/search.h"

namespace trl::testing {

// A computer of the search options with one drive and one folder entry; "localhost" is the local
// one. Ids do not matter to a search, and paths here need no escapes.
inline std::string Computer(std::string name, std::string drive, std::string folder,
                            std::string attributes = "d_search='1'",
                            std::string inner = "<d_search_mask/>") {
  return "<c c_id='1' c_text='" + name + "' c_name='" + name + "' c_local='" +
         (name == "localhost" ? "1" : "0") + "'><m m_id='1' m_text='" + drive + "' m_name='" +
         drive + "'><d d_id='1' d_text='" + folder + "' " + attributes + ">" + inner +
         "</d></m></c>";
}

inline std::string LocalOptions(std::string folder, std::string attributes = "d_search='1'",
                                std::string inner = "<d_search_mask/>") {
  return "<o>" + Computer("localhost", "", folder, attributes, inner) + "</o>";
}

// A document in short: each folder as its text below `below` (in any letter case) and the names
// of its files (each with "#" and the type of each property) and applications, folders and names
// in byte order; then the number of each event.
inline std::string Summary(xml::Document& document, const std::string& below) {
  std::set<std::string> folders;
  for (const xml::Node& d : document.AsNode().SelectNodes("//d")) {
    std::string text = d.GetAttribute("d_text").value_or("");
    if (Lower(text).starts_with(Lower(below))) text.erase(0, below.size());
    std::set<std::string> items;
    for (const xml::Node& item : d.SelectNodes("./f|./a")) {
      std::string name =
          item.GetAttribute(item.NodeName() == "f" ? "f_text" : "a_name").value_or("<absent>");
      for (const xml::Node& p : item.SelectNodes("./p")) name += "#" + *p.GetAttribute("p_type");
      items.insert(name);
    }
    for (const std::string& item : items) text += " " + item;
    folders.insert(text);
  }
  std::string summary;
  for (const std::string& folder : folders) summary += "|" + folder;
  for (const ReportedEvent& e : EventsIn(document)) summary += "|" + std::to_string(e.number);
  return summary.substr(summary.empty() ? 0 : 1);
}

class SearchTest : public ::testing::Test {
 protected:
  // A synchronous run, its text parsed; `selection` is the application options.
  static xml::DocumentPtr Run(const std::string& options, xml::DocumentPtr fingerprint = nullptr,
                              xml::DocumentPtr selection = nullptr) {
    Search search(fs::CreatePosixFileSystem({}));
    search.Asynchronous(false);
    return Parse(search.Start(Parse(options), std::move(selection), std::move(fingerprint)));
  }

  TempTree tree_;
};

}  // namespace trl::testing
