// Version copies kept aside until their version is matched, against copies made at every find:
// generated fingerprints (missing and repeated ids, nested applications, shared file names) and
// local files (one name in several folders, listed twice or not on disk) give the same results.
#include <gtest/gtest.h>

#include <random>

#include "compare/compare_fixture.h"
#include "support/memory_file.h"

namespace trl::testing {
namespace {

// On disk: each name but "d.ocx" in every folder, sized by its place in the list.
const char* const kNames[] = {"a.exe", "b.dll", "c.txt", "d.ocx"};
const char* const kFolders[] = {"\\p\\", "\\p\\bin\\", "\\q\\", "\\q\\bin\\"};

class NamedFiles : public fs::FileSystem {
 public:
  bool FileExists(std::string_view path) override { return Size(path) != 0; }
  bool FolderExists(std::string_view) override { return false; }
  std::unique_ptr<fs::File> GetFile(std::string_view path) override {
    return std::make_unique<MemoryFile>(std::string(path), std::string(Size(path), 'x'));
  }
  std::unique_ptr<fs::Folder> GetFolder(std::string_view) override { Fail(kPathNotFound); }

 private:
  static size_t Size(std::string_view path) {
    for (size_t i = 0; i < 3; ++i) {
      if (path.ends_with(kNames[i])) return i + 1;
    }
    return 0;
  }
};

class SwitchedCompare : public Compare {
 public:
  explicit SwitchedCompare(bool draft) : Compare(std::make_unique<NamedFiles>()) {
    DraftCopies(draft);
    Asynchronous(false);
  }
};

// The results text without the times a run takes.
std::string Timeless(const std::string& results) {
  auto document = Parse(results);
  for (const char* name : {"compare_start", "compare_end"}) {
    document->DocumentElement().RemoveAttribute(name);
  }
  for (xml::Node event : document->AsNode().SelectNodes("/*/events/event")) {
    event.RemoveAttribute("time");
  }
  return document->Xml();
}

std::string Results(bool draft, std::string_view fingerprint, std::string_view localFiles) {
  return Timeless(SwitchedCompare(draft).Start(nullptr, Parse(localFiles), Parse(fingerprint)));
}

class Generator {
 public:
  explicit Generator(uint32_t seed) : rng_(seed) {}

  std::string Fingerprint() {
    std::string text = "<fp>";
    for (int n = 1 + Below(3); n > 0; --n) text += Application(true);
    return text + "</fp>";
  }

  std::vector<LocalFolder> Folders() {
    std::vector<LocalFolder> folders;
    for (const char* folder : kFolders) {
      if (Chance(30)) continue;
      LocalFolder& listed = folders.emplace_back(LocalFolder{folder, {}});
      for (std::string name : kNames) {
        if (Chance(40)) continue;
        listed.files.push_back(name);
        if (Chance(20)) listed.files.push_back(Upper(name));
      }
    }
    return folders;
  }

 private:
  int Below(int n) { return static_cast<int>(rng_() % static_cast<uint32_t>(n)); }
  bool Chance(int percent) { return Below(100) < percent; }
  static std::string Upper(std::string text) {
    for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return text;
  }

  // Absent, empty or one of two numbers, the one also written otherwise: ids go missing and repeat.
  std::string Id(const char* name) {
    const char* const values[] = {nullptr, "", "1", "1", "10", "01", "1 "};
    const char* value = values[Below(7)];
    return value ? std::string(" ") + name + "='" + value + "'" : "";
  }

  std::string Application(bool outer) {
    std::string text = "<a" + Id("a_id") + ">";
    int versions = 1 + Below(2);
    int nested = outer && Chance(40) ? Below(versions + 1) : -1;
    for (int i = 0; i <= versions; ++i) {
      if (i == nested) text += Application(false);
      if (i < versions) text += Version();
    }
    return text + "</a>";
  }

  std::string Version() {
    std::string text = "<v" + Id("v_id") + " v_name='v" + std::to_string(++versionNames_) +
                       "' v_seq='" + std::to_string(Below(3)) + "'>";
    for (int n = 1 + Below(3); n > 0; --n) {
      text += "<f" + Id("f_id") + " f_name='" + kNames[Below(4)] + "' f_relpath='" +
              (Chance(30) ? "bin" : "") + "' f_weight='" + std::to_string(Below(3)) + "'";
      text += Chance(30) ? "><p p_type='2' p_weight='1' p_value='" + std::to_string(1 + Below(3)) +
                               "'/></f>"
                         : "/>";
    }
    return text + "</v>";
  }

  std::mt19937 rng_;
  int versionNames_ = 0;
};

TEST_F(CompareTest, DraftedCopiesGiveTheResultsOfCopiesMadeAtEveryFind) {
  int found = 0, empty = 0;
  for (uint32_t seed = 1; seed <= 2000; ++seed) {
    Generator generator(seed);
    std::string fingerprint = generator.Fingerprint();
    std::string localFiles = LocalFiles(generator.Folders());
    std::string literal = Results(false, fingerprint, localFiles);
    ASSERT_EQ(Results(true, fingerprint, localFiles), literal) << "seed " << seed << "\n"
                                                               << fingerprint << "\n"
                                                               << localFiles;
    ++(literal.find("<v ") != std::string::npos ? found : empty);
  }
  EXPECT_GT(found, 500);
  EXPECT_GT(empty, 100);
}

// Each version copy of each application copy, as "(v_name f_act/f_max ...)".
std::string Copies(const std::string& results) {
  auto document = Parse(results);
  std::string text;
  for (const xml::Node& a : document->AsNode().SelectNodes("//d/a")) {
    text += "(";
    for (const xml::Node& v : a.ChildElements("v")) {
      text += *v.GetAttribute("v_name") + " " + *v.GetAttribute("f_act") + "/" +
              *v.GetAttribute("f_max") + " ";
    }
    text += ")";
  }
  return text;
}

TEST_F(CompareTest, VersionCopiesAreMadeAsEveryFindMakesThem) {
  const std::string twoFiles = R"(<f f_id="1" f_name="a.exe" f_weight="0"/>)"
                               R"(<f f_id="2" f_name="b.dll" f_weight="0"/></v></a></fp>)";
  struct Case {
    std::string fingerprint, copies;
  } cases[] = {
      // Without a v_id, no find reaches the copy an earlier one made.
      {R"(<fp><a a_id="1"><v v_name="v">)" + twoFiles, "(v 1/2 v 1/2 )"},
      // Nor an application copy, without an a_id.
      {R"(<fp><a><v v_name="v">)" + twoFiles, "(v 1/2 )(v 1/2 )"},
      // A nested application with the same a_id files its version in the same copy, which its
      // find completes.
      {R"(<fp><a a_id="1"><v v_id="1" v_name="outer"><f f_id="1" f_name="a.exe" f_weight="1"/>)"
       R"(<f f_id="2" f_name="d.ocx" f_weight="1"/></v><a a_id="1"><v v_id="1" v_name="inner">)"
       R"(<f f_id="2" f_name="b.dll" f_weight="1"/></v></a></a></fp>)",
       "(outer 2/2 )"},
  };
  std::string localFiles = LocalFiles({{"\\p\\", {"a.exe", "b.dll"}}});
  for (const Case& c : cases) {
    EXPECT_EQ(Copies(SwitchedCompare(true).Start(nullptr, Parse(localFiles), Parse(c.fingerprint))),
              c.copies)
        << c.fingerprint;
  }
}

}  // namespace
}  // namespace trl::testing
