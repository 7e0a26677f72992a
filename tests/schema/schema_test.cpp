#include "schema/schema.h"

#include <fmt/format.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <string>

#include "platform/failure.h"
#include "support/failure_of.h"

namespace trl {
namespace {

using testing::FailureOf;

// Keeps the machine's own name out of the tests that do not need it.
const std::vector<std::string> kNoHostNames;

std::unique_ptr<xml::Document> Load(std::string_view text) {
  auto document = std::make_unique<xml::Document>();
  EXPECT_TRUE(text.empty() || document->LoadXml(text)) << text;
  return document;
}

TEST(SchemaTest, EncodeName) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {"", ""},
      {"KERNEL32.DLL", "kernel32.dll"},
      {"O'Brien's", "o%27brien%27s"},
      {"100%", "100%25"},
      {R"(say "Hi")", "say %22hi%22"},
      {std::string_view("tab\t\x01\x1F\x7F ", 8), "tab%09%01%1F%7F "},
      {"\xC3\x84\xC3\x96.TXT", "\xC3\xA4\xC3\xB6.txt"}};
  Schema schema(kNoHostNames);
  for (const auto& [name, encoded] : cases) EXPECT_EQ(schema.EncodeName(name), encoded) << name;
}

// On every level: a find by the encoded name among the children only, or an append with the next
// id first; a full counter, no parent or bad text fail and add nothing.
TEST(SchemaTest, FindOrAddOnEveryLevel) {
  using AddMember = xml::Node (Schema::*)(std::string_view, std::string_view, xml::Node, int32_t&);
  const std::pair<AddMember, const char*> levels[] = {{&Schema::AddComputer, "c"},
                                                      {&Schema::AddDrive, "m"},
                                                      {&Schema::AddFolder, "d"},
                                                      {&Schema::AddFileEntry, "f"}};
  for (const auto& [add, t] : levels) {
    Schema schema(kNoHostNames);
    // Decoys: a sibling of another kind and a grandchild, both carrying the name.
    auto document =
        Load(fmt::format(R"(<r><x {0}_name="alpha"/><g><{0} {0}_name="alpha"/></g></r>)", t));
    xml::Node root = document->DocumentElement();
    int32_t counter = INT32_MAX - 2;
    xml::Node alpha = (schema.*add)("Alpha", "alpha", root, counter);
    xml::Node beta = (schema.*add)("BETA", "beta", root, counter);
    EXPECT_EQ((schema.*add)("ALPHA", "alpha", root, counter), alpha) << t;
    EXPECT_NE(beta, alpha) << t;
    const std::string expected =
        fmt::format(R"(<r><x {0}_name="alpha"/><g><{0} {0}_name="alpha"/></g>)"
                    R"(<{0} {0}_id="2147483646" {0}_text="Alpha" {0}_name="alpha"/>)"
                    R"(<{0} {0}_id="2147483647" {0}_text="BETA" {0}_name="beta"/></r>)",
                    t);
    EXPECT_EQ(document->Xml(), expected);
    EXPECT_EQ(FailureOf([&] { (schema.*add)("more", "more", root, counter); }), kOverflow);
    EXPECT_EQ(counter, INT32_MAX);
    counter = 7;
    EXPECT_EQ(FailureOf([&] { (schema.*add)("x", "x", xml::Node(), counter); }), kObjectNotSet);
    EXPECT_EQ(FailureOf([&] { (schema.*add)("bad\x01", "bad", root, counter); }), kInvalidArgument);
    EXPECT_EQ(counter, 7);
    EXPECT_EQ(document->Xml(), expected) << t;
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
                                                {"127.0.0.2", false},
                                                {"ws7", false},
                                                {"", false}};
  Schema schema({"workstation7", "WS7.example.org"});
  auto document = Load("<r/>");
  xml::Node root = document->DocumentElement();
  int32_t counter = 0;
  for (const auto& [text, isLocal] : cases) {
    xml::Node computer = schema.AddComputer(text, std::to_string(counter), root, counter);
    EXPECT_EQ(computer.Attributes().back().first == "c_local", isLocal) << text;
  }
  EXPECT_EQ(schema.AddDrive("localhost", "l", root, counter).GetAttribute("c_local"), std::nullopt);

  // By default the machine's host name and its first label, in any case, name it.
  std::array<char, 256> host{};
  ASSERT_EQ(gethostname(host.data(), host.size() - 1), 0);
  std::string label = std::string(host.data()).substr(0, std::string(host.data()).find('.'));
  for (char& c : label) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  Schema byHost;
  for (const std::string& text : {std::string(host.data()), label}) {
    EXPECT_EQ(byHost.AddComputer(text, "h" + text, root, counter).GetAttribute("c_local"), "1");
  }
}

TEST(SchemaTest, AddProperty) {
  const std::pair<int16_t, const char*> cases[] = {
      {1, "1"}, {2, "2"}, {4, "3"}, {8, "4"}, {0, nullptr}, {3, nullptr}, {16, nullptr}};
  Schema schema(kNoHostNames);
  for (const auto& [bit, type] : cases) {
    auto document = Load("<f/>");
    int32_t failure =
        FailureOf([&] { schema.AddProperty(bit, "v'1&", document->DocumentElement()); });
    EXPECT_EQ(failure, type ? 0 : kInvalidArgument) << bit;
    EXPECT_EQ(document->Xml(),
              type ? fmt::format(R"(<f><p p_type="{}" p_value="v'1&amp;"/></f>)", type) : "<f/>");
  }
}

// Applications and versions are found by id or copied from the fingerprint, which stays as it was.
TEST(SchemaTest, AddApplicationAndVersion) {
  const std::string fingerprintText =
      R"(<x><a a_name="Tool" a_id="7" a_empty=""><v v_max="9" v_id="3" v_other="x" v_seq="2">)"
      R"(<f f_id="10" f_name="one.dll" f_weight="5" f_other="y"><p p_type="1"/></f>)"
      R"(<n n_id="1">note<b c="d"/></n>)"
      R"(<g><f f_name="two.exe" f_id="11"/><f f_id="12" f_weight=""/></g>)"
      R"(<o o_id="2"/><n n_id="3"/></v><v v_seq="1" v_name="Four" v_id="4"/></a>)"
      R"(<a a_id="8"/></x>)";
  auto fingerprint = Load(fingerprintText);
  auto result = Load(R"(<d><a a_id="6"/></d>)");
  xml::Node folder = result->DocumentElement();
  std::vector<xml::Node> applications = fingerprint->AsNode().SelectNodes("//a");
  std::vector<xml::Node> versions = fingerprint->AsNode().SelectNodes("//v");
  Schema schema(kNoHostNames);

  xml::Node seven = schema.AddApplication(applications[0], folder);
  EXPECT_NE(schema.AddApplication(applications[1], folder), seven);
  EXPECT_EQ(schema.AddApplication(applications[0], folder), seven);
  xml::Node three = schema.AddVersion(versions[0], seven);
  EXPECT_NE(schema.AddVersion(versions[1], seven), three);
  EXPECT_EQ(schema.AddVersion(versions[0], seven), three);
  EXPECT_EQ(result->Xml(),
            R"(<d><a a_id="6"/><a a_name="Tool" a_id="7" a_empty="">)"
            R"(<v v_id="3" v_seq="2" v_max="9" f_max="3" f_act="0" v_act="0">)"
            R"(<f f_id="10" f_name="one.dll" f_weight="5" f_exists="0"/>)"
            R"(<f f_id="11" f_name="two.exe" f_exists="0"/>)"
            R"(<f f_id="12" f_weight="" f_exists="0"/>)"
            R"(<n n_id="1">note<b c="d"/></n><o o_id="2"/><n n_id="3"/></v>)"
            R"(<v v_id="4" v_name="Four" v_seq="1" f_max="0" f_act="0" v_act="0"/></a>)"
            R"(<a a_id="8"/></d>)");
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

// The answers follow changes to the options and a switch to other options.
TEST(SchemaTest, IsApplicationSelectedFollowsChangedOptions) {
  Schema schema(kNoHostNames);
  auto application = Load("<a a_id='1'/>");
  xml::Node a = application->DocumentElement();
  auto options = Load("<o><a a_id='1'/></o>");
  auto otherOptions = Load("<o a_selected='0'/>");
  EXPECT_TRUE(schema.IsApplicationSelected(a, *options));
  EXPECT_FALSE(schema.IsApplicationSelected(a, *otherOptions));
  options->DocumentElement().FirstChild().SetAttribute("a_selected", "0");
  EXPECT_FALSE(schema.IsApplicationSelected(a, *options));
  ASSERT_TRUE(options->LoadXml("<o a_selected='1'/>"));
  EXPECT_TRUE(schema.IsApplicationSelected(a, *options));
}

}  // namespace
}  // namespace trl
