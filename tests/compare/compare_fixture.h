#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "frame/error_handler.h"
#include "platform/failure.h"
#include "support/documents.h"
#include "support/memory_file.h"
#include "trl/compare.h"

namespace trl::testing {

// A folder of a local-files document and the names recorded in it.
struct LocalFolder {
  std::string text;  // d_text
  std::vector<std::string> files;
};

// A computer of a local-files document with one drive; names need no escapes. A file's f_name is
// its name as given: letter case must not matter to lookups.
inline std::string Computer(const std::string& name, const std::string& local,
                            const std::string& drive, const std::vector<LocalFolder>& folders) {
  std::string text = "<c c_text='" + name + "' c_name='" + Lower(name) + "' " + local +
                     "><m m_text='" + drive + "' m_name='" + Lower(drive) + "'>";
  for (const LocalFolder& folder : folders) {
    text += "<d d_text='" + folder.text + "' d_name='" + Lower(folder.text) + "'>";
    for (const std::string& file : folder.files) {
      text += "<f f_text='" + file + "' f_name='" + file + "'/>";
    }
    text += "</d>";
  }
  return text + "</m></c>";
}

// A local-files document with this computer alone.
inline std::string LocalFiles(const std::vector<LocalFolder>& folders) {
  return "<trl_applicationdata search_start='s0' search_end='s1'>" +
         Computer("localhost", "c_local='1'", "", folders) + "</trl_applicationdata>";
}

// The fields of a table row; none in an empty one.
inline std::vector<std::string> Fields(std::string_view row, char separator = '|') {
  std::vector<std::string> fields;
  if (!row.empty()) fields.emplace_back();
  for (char c : row) c == separator ? fields.emplace_back() : fields.back() += c;
  return fields;
}

// A fingerprint version: `files` as "name:weight ...", numbered from 1.
inline std::string Version(std::string_view attributes, std::string_view files) {
  std::string text = "<v " + std::string(attributes) + ">";
  int id = 0;
  for (const std::string& file : Words(files)) {
    std::vector<std::string> nameWeight = Fields(file, ':');
    text += "<f f_id='" + std::to_string(++id) + "' f_name='" + nameWeight[0] + "' f_weight='" +
            nameWeight[1] + "'/>";
  }
  return text + "</v>";
}

// Every file asked for exists but those whose name holds "gone"; its content is its own name and
// it was last written 2024-05-06 07:08:09. Every path tested is noted.
class NamedFiles : public fs::FileSystem {
 public:
  explicit NamedFiles(std::vector<std::string>* tested = nullptr) : tested_(tested) {}

  bool FileExists(std::string_view path) override {
    if (tested_) tested_->emplace_back(path);
    return path.find("gone") == std::string_view::npos;
  }
  bool FolderExists(std::string_view) override { return false; }
  std::unique_ptr<fs::File> GetFile(std::string_view path) override {
    std::string name(path.substr(path.rfind('\\') + 1));
    return std::make_unique<MemoryFile>(name, name, DateTime{2024, 5, 6, 7, 8, 9});
  }
  std::unique_ptr<fs::Folder> GetFolder(std::string_view) override { Fail(kPathNotFound); }

 private:
  std::vector<std::string>* tested_;
};

class SwitchedCompare : public Compare {
 public:
  SwitchedCompare(bool draft, std::unique_ptr<fs::FileSystem> files) : Compare(std::move(files)) {
    DraftCopies(draft);
  }
};

class CompareTest : public ::testing::Test {
 protected:
  // Each test starts and ends with no reported events.
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }

  // The text of a synchronous run, on NamedFiles unless `files` are given.
  static std::string Run(std::string_view fingerprint, std::string_view localFiles,
                         bool draft = true, std::unique_ptr<fs::FileSystem> files = nullptr) {
    SwitchedCompare compare(draft, files ? std::move(files) : std::make_unique<NamedFiles>());
    compare.Asynchronous(false);
    return compare.Start(nullptr, Parse(localFiles), Parse(fingerprint));
  }
};

// The results in document order, in short: "c=c_text d=d_text a=a_id^a_max_seq v_name
// f_act/f_max/v_act ...".
inline std::string Summary(std::string_view results) {
  auto document = Parse(results);
  std::string text;
  for (const xml::Node& e : document->AsNode().SelectNodes("/*/c | //d | //d/a | //a/v")) {
    auto value = [&](const char* name) { return e.GetAttribute(name).value_or("-"); };
    std::string tag = e.NodeName();
    if (tag == "c") text += " c=" + value("c_text");
    if (tag == "d") text += " d=" + value("d_text");
    if (tag == "a") text += " a=" + value("a_id") + "^" + value("a_max_seq");
    if (tag == "v") {
      text += " " + value("v_name") + " " + value("f_act") + "/" + value("f_max") + "/" +
              value("v_act");
    }
  }
  return text.empty() ? text : text.substr(1);
}

}  // namespace trl::testing
