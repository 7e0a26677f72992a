#include "schema/schema.h"

#include <fmt/format.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <random>
#include <string>

#include "platform/failure.h"

namespace trl {
namespace {

// Keeps the machine's own name out of the tests that do not need it.
const std::vector<std::string> kNoHostNames;

template <class Call>
int32_t FailureNumber(Call call) {
  try {
    call();
  } catch (const Failure& failure) {
    return failure.number;
  }
  return 0;
}

std::unique_ptr<xml::Document> Load(std::string_view text) {
  auto document = std::make_unique<xml::Document>();
  EXPECT_TRUE(text.empty() || document->LoadXml(text)) << text;
  return document;
}

TEST(SchemaTest, EncodeName) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {"", ""},
      {"KERNEL32.DLL", "kernel32.dll"},
      {"Mixed Case-Name_1~!.txt", "mixed case-name_1~!.txt"},
      {"O'Brien's", "o%27brien%27s"},
      {"100%", "100%25"},
      {"already%25", "already%2525"},
      {R"(say "Hi")", "say %22hi%22"},
      {std::string_view("tab\t\x01\x1F\x7F ", 8), "tab%09%01%1F%7F "},
      {"ÄÖÜ.TXT", "äöü.txt"},
      {"ΣΟΦΙΑ", "σοφια"},
      {"ЖУРНАЛ", "журнал"},
  };
  Schema schema(kNoHostNames);
  for (const auto& [name, encoded] : cases) EXPECT_EQ(schema.EncodeName(name), encoded) << name;
}

using AddMember = xml::Node (Schema::*)(std::string_view, std::string_view, xml::Node, int32_t&);
const std::pair<AddMember, const char*> kLevels[] = {{&Schema::AddComputer, "c"},
                                                     {&Schema::AddDrive, "m"},
                                                     {&Schema::AddFolder, "d"},
                                                     {&Schema::AddFileEntry, "f"}};

TEST(SchemaTest, FindOrAddOnEveryLevel) {
  for (const auto& [add, t] : kLevels) {
    Schema schema(kNoHostNames);
    // Decoys: a sibling of another kind and a grandchild, both carrying the name.
    auto document =
        Load(fmt::format(R"(<r><x {0}_name="alpha"/><g><{0} {0}_name="alpha"/></g></r>)", t));
    xml::Node root = document->DocumentElement();
    int32_t counter = 40;

    xml::Node alpha = (schema.*add)("Alpha", "alpha", root, counter);
    xml::Node beta = (schema.*add)("BETA", "beta", root, counter);
    EXPECT_EQ((schema.*add)("ALPHA", "alpha", root, counter), alpha) << t;
    EXPECT_NE(beta, alpha) << t;
    EXPECT_EQ(counter, 42) << t;
    EXPECT_EQ(document->Xml(),
              fmt::format(R"(<r><x {0}_name="alpha"/><g><{0} {0}_name="alpha"/></g>)"
                          R"(<{0} {0}_id="41" {0}_text="Alpha" {0}_name="alpha"/>)"
                          R"(<{0} {0}_id="42" {0}_text="BETA" {0}_name="beta"/></r>)",
                          t));
  }
}

TEST(SchemaTest, FindOrAddFailures) {
  for (const auto& [add, t] : kLevels) {
    Schema schema(kNoHostNames);
    auto document = Load("<r/>");
    xml::Node root = document->DocumentElement();
    int32_t counter = INT32_MAX - 1;
    xml::Node last = (schema.*add)("last", "last", root, counter);
    EXPECT_EQ(last.GetAttribute(std::string(t) + "_id"), "2147483647");
    const std::string before = document->Xml();

    EXPECT_EQ(FailureNumber([&] { (schema.*add)("more", "more", root, counter); }), kOverflow);
    EXPECT_EQ(counter, INT32_MAX);
    EXPECT_EQ((schema.*add)("LAST", "last", root, counter), last) << "a find never overflows";
    counter = 7;
    EXPECT_EQ(FailureNumber([&] { (schema.*add)("x", "x", xml::Node(), counter); }), kObjectNotSet);
    EXPECT_EQ(FailureNumber([&] { (schema.*add)("bad\x01", "bad", root, counter); }),
              kInvalidArgument);
    EXPECT_EQ(counter, 7);
    EXPECT_EQ(document->Xml(), before) << t;
  }
}

TEST(SchemaTest, LocalComputers) {
  const std::pair<std::string, bool> cases[] = {{"localhost", true},
                                                {"LocalHost", true},
                                                {"127.0.0.1", true},
                                                {"::1", true},
                                                {".", true},
                                                {"WORKSTATION7", true},
                                                {"Ws7.Example.Org", true},
                                                {"workstation", false},
                                                {"127.0.0.2", false},
                                                {"ws7", false},
                                                {"", false}};
  Schema schema({"workstation7", "WS7.example.org"});
  auto document = Load("<r/>");
  xml::Node root = document->DocumentElement();
  int32_t counter = 0;
  const std::pair<std::string, std::string> local{"c_local", "1"};
  for (const auto& [text, isLocal] : cases) {
    xml::Node computer = schema.AddComputer(text, std::to_string(counter), root, counter);
    EXPECT_EQ(computer.Attributes().back() == local, isLocal) << text;  // last, and only here
  }
  EXPECT_EQ(schema.AddDrive("localhost", "l", root, counter).GetAttribute("c_local"), std::nullopt);

  std::array<char, 256> host{};
  ASSERT_EQ(gethostname(host.data(), host.size() - 1), 0);
  std::string label = std::string(host.data()).substr(0, std::string(host.data()).find('.'));
  for (char& c : label) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  Schema byHost;
  for (const std::string& text : {std::string(host.data()), label}) {
    EXPECT_EQ(byHost.AddComputer(text, "h" + text, root, counter).GetAttribute("c_local"), "1");
  }
  EXPECT_EQ(schema.AddComputer(label, "given", root, counter).GetAttribute("c_local"), std::nullopt)
      << "given names replace the host name";
}

// Other code changes the children between find-or-adds; every answer must match a plain scan.
TEST(SchemaTest, FindOrAddAgreesWithAScanAfterOtherChanges) {
  auto scan = [](const xml::Node& parent, const std::string& name) {
    for (const xml::Node& child : parent.ChildNodes()) {
      if (child.NodeName() == "f" && child.GetAttribute("f_name") == name) return child;
    }
    return xml::Node();
  };
  for (unsigned start : {1U, 2U, 3U}) {
    std::mt19937 random(start);
    auto pick = [&](size_t n) { return std::uniform_int_distribution<size_t>(0, n - 1)(random); };
    Schema schema(kNoHostNames);
    auto document = Load("<d/>");
    xml::Node folder = document->DocumentElement();
    int32_t counter = 0;
    for (int step = 0; step < 600; ++step) {
      const std::string name = "n" + std::to_string(pick(10));
      std::vector<xml::Node> children = folder.ChildNodes();
      xml::Node other = document->CreateElement(pick(4) == 0 ? "g" : "f");
      other.SetAttribute("f_name", name);
      switch (children.empty() ? 0 : pick(6)) {
        case 0:
        case 1: {
          xml::Node expected = scan(folder, name);
          int32_t before = counter;
          xml::Node found = schema.AddFileEntry(name, name, folder, counter);
          ASSERT_EQ(found, expected ? expected : folder.ChildNodes().back())
              << start << ":" << step;
          ASSERT_EQ(counter, expected ? before : before + 1);
          break;
        }
        case 2:
          folder.RemoveChild(children[pick(children.size())]);
          break;
        case 3:
          folder.ReplaceChild(other, children[pick(children.size())]);
          break;
        case 4:
          folder.InsertBefore(other, children[pick(children.size())]);
          break;
        case 5:
          children[pick(children.size())].SetAttribute("f_name", name);
          break;
      }
    }
  }
}

TEST(SchemaTest, AddProperty) {
  const std::pair<int16_t, const char*> cases[] = {{1, "1"},      {2, "2"},      {4, "3"},
                                                   {8, "4"},      {0, nullptr},  {3, nullptr},
                                                   {16, nullptr}, {-1, nullptr}, {12, nullptr}};
  Schema schema(kNoHostNames);
  for (const auto& [bit, type] : cases) {
    auto document = Load("<f/>");
    if (type) {
      schema.AddProperty(bit, "v'1&", document->DocumentElement());
      EXPECT_EQ(document->Xml(),
                fmt::format(R"(<f><p p_type="{}" p_value="v'1&amp;"/></f>)", type));
    } else {
      EXPECT_EQ(FailureNumber([&] { schema.AddProperty(bit, "v", document->DocumentElement()); }),
                kInvalidArgument);
      EXPECT_EQ(document->Xml(), "<f/>") << bit;
    }
  }
  EXPECT_EQ(FailureNumber([&] { schema.AddProperty(1, "v", xml::Node()); }), kObjectNotSet);
}

TEST(SchemaTest, AddApplicationCopiesAttributesOnce) {
  const std::string fingerprintText =
      R"(<x><a a_name="Tool" a_id="7" a_empty="" a_maker="M&amp;Co"><v v_id="1"/></a>)"
      R"(<a a_id="8"/></x>)";
  auto fingerprint = Load(fingerprintText);
  auto result = Load(R"(<d><a a_id="6"/></d>)");
  xml::Node folder = result->DocumentElement();
  std::vector<xml::Node> applications = fingerprint->AsNode().SelectNodes("//a");
  Schema schema(kNoHostNames);

  xml::Node seven = schema.AddApplication(applications[0], folder);
  EXPECT_NE(schema.AddApplication(applications[1], folder), seven);
  EXPECT_EQ(schema.AddApplication(applications[0], folder), seven);
  EXPECT_EQ(result->Xml(),
            R"(<d><a a_id="6"/><a a_name="Tool" a_id="7" a_empty="" a_maker="M&amp;Co"/>)"
            R"(<a a_id="8"/></d>)");
  EXPECT_EQ(fingerprint->Xml(), fingerprintText);
}

TEST(SchemaTest, AddVersionBuildsTheWholeCopy) {
  const std::string fingerprintText =
      R"(<a><v v_max="9" v_id="3" v_other="x" v_seq="2">)"
      R"(<f f_id="10" f_name="one.dll" f_weight="5" f_other="y"><p p_type="1"/></f>)"
      R"(<n n_id="1">note<b c="d"/></n>)"
      R"(<g><f f_name="two.exe" f_id="11"/><f f_id="12" f_weight=""/></g>)"
      R"(<o o_id="2"/><n n_id="3"/></v>)"
      R"(<v v_seq="1" v_name="Four" v_id="4"/></a>)";
  auto fingerprint = Load(fingerprintText);
  auto result = Load("<a/>");
  xml::Node application = result->DocumentElement();
  std::vector<xml::Node> versions = fingerprint->AsNode().SelectNodes("//v");
  Schema schema(kNoHostNames);

  xml::Node three = schema.AddVersion(versions[0], application);
  EXPECT_NE(schema.AddVersion(versions[1], application), three);
  EXPECT_EQ(schema.AddVersion(versions[0], application), three);
  EXPECT_EQ(result->Xml(),
            R"(<a><v v_id="3" v_seq="2" v_max="9" f_max="3" f_act="0" v_act="0">)"
            R"(<f f_id="10" f_name="one.dll" f_weight="5" f_exists="0"/>)"
            R"(<f f_id="11" f_name="two.exe" f_exists="0"/>)"
            R"(<f f_id="12" f_weight="" f_exists="0"/>)"
            R"(<n n_id="1">note<b c="d"/></n><o o_id="2"/><n n_id="3"/></v>)"
            R"(<v v_id="4" v_name="Four" v_seq="1" f_max="0" f_act="0" v_act="0"/></a>)");
  EXPECT_EQ(fingerprint->Xml(), fingerprintText);
}

TEST(SchemaTest, IsApplicationSelected) {
  struct Case {
    const char* options;
    std::vector<std::pair<const char*, bool>> answers;  // a_id (nullptr: none), selected
  };
  const Case cases[] = {
      {"<o><a a_id='1' a_selected='0'/><a a_id='2' a_selected='1'/><a a_id='3'/></o>",
       {{"1", false}, {"2", true}, {"3", true}, {"4", true}, {"01", true}}},
      {"<o a_selected='0'><a a_id='2' a_selected='1'/><a a_id='3'/></o>",
       {{"2", true}, {"3", true}, {"4", false}}},
      {"<o a_selected='1'><a a_id='2' a_selected='0'/></o>", {{"2", false}, {"4", true}}},
      {"<o><g><a a_id='5' a_selected='0'/></g><a a_id='5' a_selected='1'/><a a_id='6' "
       "a_selected='1'/><a a_id='6' a_selected='0'/></o>",
       {{"5", false}, {"6", true}}},
      {"<o><a a_id='' a_selected='0'/><a a_selected='0'/></o>", {{nullptr, false}, {"1", true}}},
      {"", {{"1", true}, {nullptr, true}}},
  };
  for (const Case& c : cases) {
    Schema schema(kNoHostNames);
    auto options = Load(c.options);
    for (const auto& [id, selected] : c.answers) {
      auto application = Load(id ? fmt::format("<a a_id='{}'/>", id) : "<a/>");
      EXPECT_EQ(schema.IsApplicationSelected(application->DocumentElement(), *options), selected)
          << c.options << " " << (id ? id : "no id");
    }
  }
}

TEST(SchemaTest, IsApplicationSelectedFollowsChangedOptions) {
  Schema schema(kNoHostNames);
  auto application = Load("<a a_id='1'/>");
  xml::Node a = application->DocumentElement();
  auto options = Load("<o><a a_id='1'/></o>");
  auto otherOptions = Load("<o a_selected='0'/>");
  xml::Node listed = options->DocumentElement().FirstChild();

  EXPECT_TRUE(schema.IsApplicationSelected(a, *options));
  EXPECT_FALSE(schema.IsApplicationSelected(a, *otherOptions));
  listed.SetAttribute("a_selected", "0");
  EXPECT_FALSE(schema.IsApplicationSelected(a, *options));
  options->DocumentElement().SetAttribute("a_selected", "1");
  options->DocumentElement().RemoveChild(listed);
  EXPECT_TRUE(schema.IsApplicationSelected(a, *options));
  ASSERT_TRUE(options->LoadXml("<o a_selected='0'/>"));
  EXPECT_FALSE(schema.IsApplicationSelected(a, *options));
  ASSERT_TRUE(otherOptions->LoadXml("<o/>"));
  EXPECT_TRUE(schema.IsApplicationSelected(a, *otherOptions));
}

}  // namespace
}  // namespace trl
