#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "frame/error_handler.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/temp_tree.h"
#include "trl/compare.h"

namespace trl::testing {

// A folder of a local-files document and the names recorded in it.
struct LocalFolder {
  std::string text;  // d_text
  std::vector<std::string> files;
};

// A local-files document with one computer and one drive; names need no escapes.
inline std::string LocalFiles(const std::vector<LocalFolder>& folders,
                              std::string_view computer = "localhost",
                              std::string_view local = R"(c_local="1")",
                              std::string_view drive = "") {
  std::string text =
      R"(<trl_applicationdata search_start="s0" search_end="s1"><c c_id="1" c_text=")" +
      std::string(computer) + R"(" c_name=")" + Lower(std::string(computer)) + "\" " +
      std::string(local) + R"(><m m_id="1" m_text=")" + std::string(drive) + R"(" m_name=")" +
      Lower(std::string(drive)) + "\">";
  int folderId = 0, fileId = 0;
  for (const LocalFolder& folder : folders) {
    text += "<d d_id=\"" + std::to_string(++folderId) + "\" d_text=\"" + folder.text +
            "\" d_name=\"" + Lower(folder.text) + "\">";
    for (const std::string& name : folder.files) {
      text += "<f f_id=\"" + std::to_string(++fileId) + "\" f_text=\"" + name + "\" f_name=\"" +
              Lower(name) + "\"/>";
    }
    text += "</d>";
  }
  return text + "</m></c></trl_applicationdata>";
}

class CompareTest : public ::testing::Test {
 protected:
  // Each test starts and ends with no reported events.
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }

  // A synchronous run, its text parsed.
  static xml::DocumentPtr Run(std::string_view fingerprint, std::string_view localFiles,
                              xml::DocumentPtr applicationOptions = nullptr,
                              fs::ShareTable shares = {}) {
    Compare compare(fs::CreatePosixFileSystem(std::move(shares)));
    compare.Asynchronous(false);
    return Parse(
        compare.Start(std::move(applicationOptions), Parse(localFiles), Parse(fingerprint)));
  }

  // A folder of the tree as a d_text records it.
  std::string Folder(std::string_view relative = "") const { return tree_.Path(relative) + "\\"; }

  TempTree tree_;
};

}  // namespace trl::testing
