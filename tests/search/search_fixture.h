#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "frame/error_handler.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/reported_events.h"
#include "support/temp_tree.h"
#include "trl/search.h"
#include "trl/xml.h"

namespace trl::testing {

// A folder entry of the search options, walked by default. Paths here need no escapes.
inline std::string Entry(int id, std::string_view folder,
                         std::string_view attributes = R"(d_search="1")",
                         std::string_view inner = "<d_search_mask/>") {
  return "<d d_id=\"" + std::to_string(id) + "\" d_text=\"" + std::string(folder) + "\" " +
         std::string(attributes) + ">" + std::string(inner) + "</d>";
}

// A computer of the search options with one drive holding `entries`.
inline std::string Computer(int id, std::string_view name, std::string_view drive,
                            std::string_view entries) {
  std::string n = std::to_string(id);
  bool local = name == "localhost";
  return "<c c_id=\"" + n + "\" c_text=\"" + std::string(name) + "\" c_name=\"" +
         std::string(name) + "\" c_local=\"" + (local ? "1" : "0") + "\"><m m_id=\"" + n +
         "\" m_text=\"" + std::string(drive) + "\" m_name=\"" + std::string(drive) +
         "\" m_type=\"3\">" + std::string(entries) + "</m></c>";
}

// Search options with one folder entry on this machine's root drive.
inline std::string LocalOptions(std::string_view folder,
                                std::string_view attributes = R"(d_search="1")",
                                std::string_view inner = "<d_search_mask/>") {
  return "<trl_searchoptions>" + Computer(1, "localhost", "", Entry(1, folder, attributes, inner)) +
         "</trl_searchoptions>";
}

// The document without the run's times, which no expectation can know.
inline std::string Untimed(xml::Document& document) {
  xml::Node root = document.DocumentElement();
  root.RemoveAttribute("search_start");
  root.RemoveAttribute("search_end");
  return document.Xml();
}

// The d_text values below `root`: "\" for `root` itself, "\sub\" for a subfolder.
inline std::vector<std::string> FoldersBelow(xml::Document& results, std::string_view root) {
  std::vector<std::string> folders = ValuesOf(results, "//d", "d_text");
  for (std::string& folder : folders) {
    if (folder.starts_with(root)) folder.erase(0, root.size());
  }
  return folders;
}

class SearchTest : public ::testing::Test {
 protected:
  // Each test starts and ends with no reported events.
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }

  // A synchronous run, its text parsed.
  static xml::DocumentPtr Run(std::string_view options, xml::DocumentPtr fingerprint = nullptr,
                              xml::DocumentPtr applicationOptions = nullptr,
                              std::unique_ptr<fs::FileSystem> fileSystem = nullptr) {
    Search search(fileSystem ? std::move(fileSystem) : fs::CreatePosixFileSystem({}));
    search.Asynchronous(false);
    return Parse(search.Start(options.empty() ? std::make_shared<xml::Document>() : Parse(options),
                              std::move(applicationOptions), std::move(fingerprint)));
  }

  // A folder of the tree as a d_text records it.
  std::string Folder(std::string_view relative = "") const { return tree_.Path(relative) + "\\"; }

  std::vector<std::string> FoldersIn(xml::Document& results) const {
    return FoldersBelow(results, tree_.Path());
  }

  TempTree tree_;
};

}  // namespace trl::testing
