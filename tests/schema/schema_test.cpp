#include "schema/schema.h"

#include <fmt/format.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <climits>
#include <string>

#include "platform/failure.h"
#include "support/failure_of.h"
#include "support/memory_file.h"

namespace trl {
namespace {

using testing::FailureOf;
using testing::MemoryFile;

TEST(SchemaTest, EncodeName) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {"KERNEL32.DLL", "kernel32.dll"},
      {"O'Brien's", "o%27brien%27s"},
      {"100%", "100%25"},
      {R"(say "Hi")", "say %22hi%22"},
      {std::string_view("tab\t\x01\x1F\x7F ", 8), "tab%09%01%1F%7F "},
      {"\xC3\x84\xC3\x96.TXT", "\xC3\xA4\xC3\xB6.txt"},
      // Past the first eight bytes, and in the last few
      {"readme-first'copy", "readme-first%27copy"},
      {"0123456789abcde\x7F", "0123456789abcde%7F"},
      {"0123456789ABCDEF\"", "0123456789abcdef%22"},
      {"0123456789abcdef\x05!", "0123456789abcdef%05!"}};
  Schema schema;
  for (const auto& [name, encoded] : cases) EXPECT_EQ(schema.EncodeName(name), encoded) << name;
}

// A find by the encoded name among the children, or an append with the next id first; a full
// counter or no parent fail and add nothing. Only a computer naming this machine is local.
TEST(SchemaTest, FindOrAdd) {
  xml::Document document;
  ASSERT_TRUE(document.LoadXml(R"(<r><x c_name="alpha"/><g><c c_name="alpha"/></g></r>)"));
  xml::Node root = document.DocumentElement();
  char host[256] = {};
  ASSERT_EQ(gethostname(host, sizeof host - 1), 0);
  std::string label = std::string(host).substr(0, std::string(host).find('.'));
  for (char& c : label) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  Schema schema;  // this machine's names by default
  int32_t counter = INT32_MAX - 3;
  xml::Node alpha = schema.AddComputer("Alpha", "alpha", root, counter);
  EXPECT_EQ(schema.AddComputer("ALPHA", "alpha", root, counter), alpha);
  schema.AddComputer(label, "host", root, counter);
  schema.AddDrive("localhost", "localhost", root, counter);
  EXPECT_EQ(FailureOf([&] { schema.AddComputer("::1", "more", root, counter); }), kOverflow);
  EXPECT_EQ(FailureOf([&] { schema.AddFolder("x", "x", xml::Node(), counter); }), kObjectNotSet);
  EXPECT_EQ(document.Xml(),
            fmt::format(R"(<r><x c_name="alpha"/><g><c c_name="alpha"/></g>)"
                        R"(<c c_id="2147483645" c_text="Alpha" c_name="alpha"/>)"
                        R"(<c c_id="2147483646" c_text="{}" c_name="host" c_local="1"/>)"
                        R"(<m m_id="2147483647" m_text="localhost" m_name="localhost"/></r>)",
                        label));
}

TEST(SchemaTest, LocalComputers) {
  const std::pair<std::string, bool> cases[] = {
      {"localhost", true}, {"LocalHost", true},    {"127.0.0.1", true},       {"::1", true},
      {".", true},         {"WORKSTATION7", true}, {"Ws7.Example.Org", true}, {"127.0.0.2", false},
      {"ws7", false},      {"ws", false}};
  Schema schema({"workstation7", "WS7.example.org"});
  xml::Document document;
  ASSERT_TRUE(document.LoadXml("<r/>"));
  int32_t counter = 0;
  for (const auto& [text, isLocal] : cases) {
    xml::Node computer = schema.AddComputer(text, text + "|", document.DocumentElement(), counter);
    EXPECT_EQ(computer.GetAttribute("c_local").value_or("none"), isLocal ? "1" : "none") << text;
  }
}

// Property bits 1, 2, 4 and 8 are types 1 to 4; other bits add nothing.
TEST(SchemaTest, AddProperty) {
  xml::Document document;
  ASSERT_TRUE(document.LoadXml("<f/>"));
  std::string failures;
  for (int16_t bit : {1, 2, 4, 8, 0, 3, 16}) {
    failures += std::to_string(FailureOf(
                    [&] { Schema().AddProperty(bit, "v'1&", document.DocumentElement()); })) +
                " ";
  }
  EXPECT_EQ(failures, "0 0 0 0 5 5 5 ");
  EXPECT_EQ(document.Xml(),
            R"(<f><p p_type="1" p_value="v'1&amp;"/><p p_type="2" p_value="v'1&amp;"/>)"
            R"(<p p_type="3" p_value="v'1&amp;"/><p p_type="4" p_value="v'1&amp;"/></f>)");
}

// Listed applications follow their own a_selected, the others the root's; answers follow changes.
TEST(SchemaTest, IsApplicationSelected) {
  Schema schema;
  xml::Document options;
  ASSERT_TRUE(
      options.LoadXml("<o a_selected='0'><g><a a_id='1' a_selected='0'/></g><a a_id='1'/><a "
                      "a_id='2' a_selected='1'/><a a_id='4'/></o>"));
  auto selected = [&](const char* id) {
    xml::Document application;
    EXPECT_TRUE(application.LoadXml(fmt::format("<a a_id='{}'/>", id)));
    return schema.IsApplicationSelected(application.DocumentElement(), options);
  };
  auto answers = [&] {
    return fmt::format("{} {} {} {}", selected("1"), selected("2"), selected("3"), selected("4"));
  };
  EXPECT_EQ(answers(), "false true false true");
  options.DocumentElement().RemoveAttribute("a_selected");
  options.DocumentElement().FirstChild().FirstChild().SetAttribute("a_selected", "1");
  EXPECT_EQ(answers(), "true true true true");
  ASSERT_TRUE(options.LoadXml("<o><a a_id='2' a_selected='0'/></o>"));
  EXPECT_EQ(answers(), "true false true true");
  ASSERT_FALSE(options.LoadXml(""));  // no options at all
  EXPECT_EQ(answers(), "true true true true");
}

TEST(PropertyReadersTest, ReadFromMemory) {
  std::string allBytes;  // more than three read chunks, and not a multiple of one
  for (int i = 0; i < 12289 * 256; ++i) allBytes.push_back(static_cast<char>(i));
  const std::pair<std::string, const char*> samples[] = {
      {"", "d41d8cd98f00b204e9800998ecf8427e"},
      {"abc", "900150983cd24fb0d6963f7d28e17f72"},
      {allBytes, "87655cb9e87a968c3f7254e28db408de"},  // digests from an independent tool
  };
  Schema schema;
  const DateTime modified{2021, 3, 4, 5, 6, 7};
  for (const auto& [content, md5] : samples) {
    for (size_t maxRead : {SIZE_MAX, size_t{4093}}) {  // short reads must be continued
      MemoryFile file("x", content, modified);
      file.SetMaxRead(maxRead);
      EXPECT_EQ(schema.ReadPropertyType1(file), "");
      EXPECT_EQ(schema.ReadPropertyType2(file), std::ssize(content));
      EXPECT_EQ(schema.ReadPropertyType3(file), md5) << maxRead;
      EXPECT_EQ(schema.ReadPropertyType4(file), modified);
    }
  }
  MemoryFile broken("broken", std::string(5000, 'x'));
  broken.FailReadsFrom(0, kDeviceIoError);
  EXPECT_EQ(FailureOf([&] { schema.ReadPropertyType1(broken); }), kDeviceIoError);
  EXPECT_EQ(FailureOf([&] { schema.ReadPropertyType3(broken); }), kDeviceIoError);
}

}  // namespace
}  // namespace trl
