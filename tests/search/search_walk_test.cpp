// The folder walk: attribute masks, the drive root, recursion, the name pattern and properties.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>

#include "search/search_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAreArray;

using SearchWalkTest = SearchTest;

const std::regex kTime(R"(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d)");

TEST_F(SearchWalkTest, MasksAdmitItemsWhoseEveryBitTheyHold) {
  tree_.AddFolder(".hiddendir");
  tree_.AddFolder("rodir");
  for (const char* file : {"normal.txt", "readonly.txt", ".hidden.txt", ".hiddenro.txt",
                           ".hiddendir/in_hidden.txt", "rodir/in_ro.txt"}) {
    tree_.AddFile(file);
  }
  tree_.SetMode("readonly.txt", 0444);
  tree_.SetMode(".hiddenro.txt", 0444);
  tree_.SetMode("rodir", 0555);
  tree_.AddFifo("pipe");  // neither a file nor a folder: a system item

  struct Case {
    const char *folderMask, *fileMask, *files, *folders;
  };
  const Case cases[] = {
      {nullptr, nullptr, "normal.txt readonly.txt in_ro.txt", R"(\ \rodir\)"},
      {"33", "0", "normal.txt in_ro.txt", R"(\ \rodir\)"},
      {"33", "1", "normal.txt readonly.txt in_ro.txt", R"(\ \rodir\)"},
      {"33", "4", "normal.txt pipe in_ro.txt", R"(\ \rodir\)"},
      {"33", "35", "normal.txt readonly.txt .hidden.txt .hiddenro.txt in_ro.txt", R"(\ \rodir\)"},
      {"33", "39", "normal.txt readonly.txt .hidden.txt .hiddenro.txt pipe in_ro.txt",
       R"(\ \rodir\)"},
      {"35", "33", "normal.txt readonly.txt in_ro.txt in_hidden.txt", R"(\ \rodir\ \.hiddendir\)"},
      {"2", "33", "normal.txt readonly.txt in_hidden.txt", R"(\ \.hiddendir\)"},
      {"0", "33", "normal.txt readonly.txt", R"(\)"},
  };
  for (const Case& c : cases) {
    std::string attributes = R"(d_search="1")";
    if (c.folderMask) attributes += std::string(R"( d_search_d_attributes=")") + c.folderMask + '"';
    if (c.fileMask) attributes += std::string(R"( d_search_f_attributes=")") + c.fileMask + '"';
    SCOPED_TRACE(attributes);
    auto results = Run(LocalOptions(tree_.Path(), attributes));
    EXPECT_THAT(ValuesOf(*results, "//f", "f_text"), UnorderedElementsAreArray(Words(c.files)));
    EXPECT_THAT(FoldersIn(*results), UnorderedElementsAreArray(Words(c.folders)));
    EXPECT_THAT(EventsIn(*results), IsEmpty());
  }
}

// A share whose root is read-only: mask 0 turns read-only folders away, but never a drive root.
TEST_F(SearchWalkTest, DriveRootIsSearchedWhateverItsAttributes) {
  tree_.AddFolder("share/rosub");
  tree_.AddFile("share/top.txt");
  tree_.AddFile("share/rosub/inner.txt");
  tree_.SetMode("share/rosub", 0555);
  tree_.SetMode("share", 0555);
  const auto run = [&](std::string_view folder) {
    fs::ShareTable shares;
    shares.Add("fileserver", "apps", tree_.Native("share"));
    return Run("<o>" +
                   Computer(1, "fileserver", "apps",
                            Entry(1, folder, R"(d_search="1" d_search_d_attributes="0")")) +
                   "</o>",
               nullptr, nullptr, fs::CreatePosixFileSystem(std::move(shares)));
  };

  auto results = run("\\");
  std::string start = results->DocumentElement().GetAttribute("search_start").value_or("");
  std::string end = results->DocumentElement().GetAttribute("search_end").value_or("");
  EXPECT_TRUE(std::regex_match(start, kTime)) << start;
  EXPECT_TRUE(std::regex_match(end, kTime)) << end;
  EXPECT_LE(start, end);
  EXPECT_EQ(Untimed(*results),
            R"(<trl_applicationdata><c c_id="1" c_text="fileserver" c_name="fileserver">)"
            R"(<m m_id="1" m_text="apps" m_name="apps"><d d_id="1" d_text="\" d_name="\">)"
            R"(<f f_id="1" f_text="top.txt" f_name="top.txt"/></d></m></c></trl_applicationdata>)");

  // The same read-only folder entered from the share is no root and is turned away.
  EXPECT_THAT(ValuesOf(*run("\\rosub"), "//d", "d_text"), IsEmpty());
}

TEST_F(SearchWalkTest, RecursionWalksDepthFirstWithAFoldersFilesBeforeItsSubfolders) {
  tree_.AddFolder("Alpha/Beta");
  tree_.AddFile("Top.txt");
  tree_.AddFile("Alpha/a.txt");
  tree_.AddFile("Alpha/Beta/B.txt");
  const auto d = [&](std::string_view relative, int id) {
    return "<d d_id=\"" + std::to_string(id) + "\" d_text=\"" + Folder(relative) + "\" d_name=\"" +
           Lower(Folder(relative)) + "\">";
  };
  const std::string top =
      R"(<trl_applicationdata><c c_id="1" c_text="localhost" c_name="localhost" c_local="1">)"
      R"(<m m_id="1" m_text="" m_name="">)" +
      d("", 1) + R"(<f f_id="1" f_text="Top.txt" f_name="top.txt"/></d>)";
  const std::string end = "</m></c></trl_applicationdata>";
  const std::string all = top + d("Alpha", 2) + R"(<f f_id="2" f_text="a.txt" f_name="a.txt"/>)" +
                          "</d>" + d("Alpha/Beta", 3) +
                          R"(<f f_id="3" f_text="B.txt" f_name="b.txt"/></d>)" + end;
  const std::pair<const char*, std::string> cases[] = {
      {nullptr, all}, {"True", all}, {"1", all}, {"False", top + end}, {"0", top + end}};
  for (const auto& [recurse, expected] : cases) {
    std::string attributes = R"(d_search="1")";
    if (recurse) attributes += std::string(R"( d_search_recurse=")") + recurse + '"';
    SCOPED_TRACE(attributes);
    EXPECT_EQ(Untimed(*Run(LocalOptions(tree_.Path(), attributes))), expected);
  }
}

TEST_F(SearchWalkTest, NamePatternIsCaseSensitiveAndUnanchored) {
  tree_.AddFolder("docs");
  for (const char* file : {"APP.EXE", "setup.exe", "readme.txt", "docs/notes.txt"}) {
    tree_.AddFile(file);
  }
  const std::pair<const char*, const char*> cases[] = {
      {"", "APP.EXE setup.exe readme.txt notes.txt"},
      {"exe", "setup.exe"},
      {"EXE$", "APP.EXE"},
      {"tu", "setup.exe"},
      {"^s", "setup.exe"},
      {"\\.txt", "readme.txt notes.txt"},
      {"nothing", ""},
  };
  for (const auto& [pattern, files] : cases) {
    SCOPED_TRACE(pattern);
    auto results = Run(LocalOptions(tree_.Path(), R"(d_search="1")",
                                    std::string("<d_search_mask>") + pattern + "</d_search_mask>"));
    EXPECT_THAT(ValuesOf(*results, "//f", "f_text"), UnorderedElementsAreArray(Words(files)));
    // A folder with files is recorded whether or not any of them matched.
    EXPECT_THAT(FoldersIn(*results), UnorderedElementsAreArray(Words(R"(\ \docs\)")));
  }
}

TEST_F(SearchWalkTest, PropertiesFollowTheirBitsInTypeOrder) {
  tree_.AddFile("abc.txt", "abc");
  const std::pair<const char*, const char*> cases[] = {
      {"0", ""}, {"2", "2"}, {"4", "3"}, {"8", "4"}, {"16", ""}, {"12", "3 4"}, {"15", "1 2 3 4"},
  };
  for (const auto& [properties, types] : cases) {
    SCOPED_TRACE(properties);
    auto results = Run(LocalOptions(
        tree_.Path(), std::string(R"(d_search="1" d_search_f_properties=")") + properties + '"'));
    EXPECT_THAT(ValuesOf(*results, "//f/p", "p_type"), ElementsAreArray(Words(types)));
    EXPECT_THAT(EventsIn(*results), IsEmpty());
  }

  auto results = Run(LocalOptions(tree_.Path(), R"(d_search="1" d_search_f_properties="15")"));
  std::vector<std::string> values = ValuesOf(*results, "//f/p", "p_value");
  ASSERT_EQ(values.size(), 4u);
  EXPECT_EQ(values[0], "");  // no version resource
  EXPECT_EQ(values[1], "3");
  EXPECT_EQ(values[2], "900150983cd24fb0d6963f7d28e17f72");
  EXPECT_TRUE(std::regex_match(values[3], kTime)) << values[3];
}

TEST_F(SearchWalkTest, MissingPathIsOneWarningAndNoFolder) {
  std::string missing = tree_.Path("gone");
  auto results = Run(LocalOptions(missing));
  EXPECT_THAT(ValuesOf(*results, "//d", "d_text"), IsEmpty());
  EXPECT_THAT(EventsIn(*results),
              ElementsAre(ReportedEvent{-2147201303, 2, "Search", "FindFiles",
                                        "Path '" + missing + "\\' could not be found", ""}));
}

}  // namespace
}  // namespace trl::testing
