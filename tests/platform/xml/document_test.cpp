#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include "platform/failure.h"
#include "platform/xml/text_builder.h"
#include "support/failure_of.h"
#include "support/temp_tree.h"
#include "trl/xml.h"

namespace trl::xml {
namespace {

using testing::FailureOf;
using Strings = std::vector<std::string>;

constexpr const char* kTree =
    "<r><c c_id=\"2\"><a a_id=\"1\" a_parent=\"0\"/><a a_id=\"3\" a_parent=\"1\"/></c>"
    "<c c_id=\"5\"><a a_id=\"4\" a_parent=\"3\"/><a a_id=\"6\" a_name=\"O'Brien\"/></c>"
    "<c c_id=\"1\"/></r>";

void Load(Document& doc, std::string_view text) { ASSERT_TRUE(doc.LoadXml(text)) << text; }

// "tag=first attribute value" per node, which names every element of kTree.
Strings Labels(const std::vector<Node>& nodes) {
  Strings labels;
  for (const Node& node : nodes) {
    auto attributes = node.Attributes();
    labels.push_back(node.NodeName() + "=" + (attributes.empty() ? "" : attributes[0].second));
  }
  return labels;
}

// A reverse axis and a union come back in document order too; a bad selection fails with 5.
TEST(XmlDocumentTest, SelectionsFollowXPathInDocumentOrder) {
  const std::pair<const char*, Strings> cases[] = {
      {"//a[@a_name=\"O'Brien\"]", {"a=6"}},
      {"//a[@a_id='6']/preceding::a", {"a=1", "a=3", "a=4"}},
      {"//c[@c_id='1'] | //a[@a_id='1']", {"a=1", "c=1"}},
      {"//zzz", {}}};
  Document doc;
  Load(doc, kTree);
  Node c = doc.DocumentElement().ChildNodes()[1];
  EXPECT_EQ(Labels(c.SelectNodes(".//a")), (Strings{"a=4", "a=6"}));
  for (const auto& [xpath, expected] : cases) {
    EXPECT_EQ(Labels(c.SelectNodes(xpath)), expected) << xpath;
    EXPECT_EQ(c.CountNodes(xpath), expected.size()) << xpath;
    Node first = c.SelectSingleNode(xpath);
    EXPECT_EQ(first ? Labels({first})[0] : "", expected.empty() ? "" : expected[0]);
  }
  for (const char* xpath : {"//a[", "count(//a)", "//a/@a_id"}) {
    EXPECT_EQ(FailureOf([&] { c.SelectSingleNode(xpath); }), kInvalidArgument) << xpath;
    EXPECT_EQ(FailureOf([&] { c.CountNodes(xpath); }), kInvalidArgument) << xpath;
  }
}

// A failed load leaves the document empty and tells where, in lines and byte columns; a
// document is written raw, without declaration or blank text between elements.
TEST(XmlDocumentTest, LoadsAndWrites) {
  testing::TempTree tree;
  tree.AddFile("bad.xml", "<r>\n\n <x></r>");
  const std::pair<std::function<bool(Document&)>, std::pair<int64_t, int64_t>> cases[] = {
      {[](Document& doc) { return doc.LoadXml("<r>\n<a>\n</b></r>"); }, {3, 3}},
      {[&](Document& doc) { return doc.Load(tree.Native("bad.xml")); }, {3, 7}},
      {[&](Document& doc) { return doc.Load(tree.Native("missing.xml")); }, {0, 0}}};
  Document doc;
  for (const auto& [load, where] : cases) {
    Load(doc, "<?xml version=\"1.0\"?>\n<!--c--><r>\n <a x=\"1\"/> <?p q?></r>\n");
    EXPECT_EQ(doc.Xml(), "<!--c--><r><a x=\"1\"/><?p q?></r>");
    EXPECT_TRUE(doc.LastParseError().ok);
    EXPECT_FALSE(load(doc));
    const ParseError& error = doc.LastParseError();
    EXPECT_FALSE(error.ok || error.reason.empty());
    EXPECT_EQ(std::pair(error.line, error.column), where) << error.reason;
    EXPECT_EQ(doc.Xml(), "");
  }
}

// What the parser lets pass is refused as XML refuses it, raw or as a character reference, in
// text, attribute values and markup alike, at the first fault in the text, the parser's or not.
// What XML allows in those places loads, and writes a text that loads again.
TEST(XmlDocumentTest, LoadsOnlyWellFormedText) {
  std::string many = "<r";
  for (int i = 0; i < 20; ++i) many += " a" + std::to_string(i) + "='1'";
  const std::tuple<std::string, int64_t, int64_t> refused[] = {
      {"<r>\x01</r>", 1, 4},
      {"<r>\n &#1;</r>", 2, 2},
      {"<r a='&#x110000;'/>", 1, 7},
      {"<r>&#xD800;</r>", 1, 4},
      {"<r>&#;</r>", 1, 4},
      {"<r>&#12a;</r>", 1, 4},
      {"<r>\xC3</r>", 1, 4},
      {"<r>\xEF\xBF\xBE</r>", 1, 4},
      {"<r><!-- \x02 --></r>", 1, 9},
      {"<r a='1' b='2' a='3'/>", 1, 16},
      {many + " a3='2'/>", 1, static_cast<int64_t>(many.size()) + 2},
      {"<r a='<'/>", 1, 7},
      {"<r>&#1;<a></b></r>", 1, 4},
      {"<r><a></b>&#1;</r>", 1, 9},
      {"<!DOCTYPE r><r>&#1;</r>", 1, 16},
      {"<r/>\n<s/>", 2, 2}};
  const std::string accepted[] = {
      "<r a='x>y' b=\"it's\">&#x10FFFF;&#9;&#65;<![CDATA[&#1;<]]><!--&#0;--><?p &#1;?></r>",
      "<!DOCTYPE r SYSTEM \"x>&#1;\" [<!ENTITY e \"&#1;>\">]><r/>", many + "/>"};
  Document doc;
  for (const auto& [text, line, column] : refused) {
    EXPECT_FALSE(doc.LoadXml(text)) << text;
    const ParseError& error = doc.LastParseError();
    EXPECT_EQ(std::pair(error.line, error.column), std::pair(line, column)) << text;
    EXPECT_FALSE(error.limit);
  }
  for (const std::string& text : accepted) {
    Load(doc, text);
    Load(doc, doc.Xml());
  }
}

// A document beyond a limit is refused before it is parsed, and says which limit; one that
// reaches every limit loads. A pipe is read no further than the limit.
TEST(XmlDocumentTest, RefusesWhatExceedsItsLimits) {
  const Limits small{21, 2, 3};
  testing::TempTree tree;
  tree.AddFifo("pipe");
  std::signal(SIGPIPE, SIG_IGN);  // the writer finds the pipe closed early
  std::thread writer([&] {
    int pipe = ::open(tree.Native("pipe").c_str(), O_WRONLY);
    std::string text = "<r>" + std::string(200000, 'x') + "</r>";
    EXPECT_GT(::write(pipe, text.data(), text.size()), 0);
    ::close(pipe);
  });
  const std::tuple<std::function<bool(Document&)>, int64_t, int64_t, const char*> cases[] = {
      {[&](Document& doc) { return doc.LoadXml("<r><a><b/></a></r>", small); }, 1, 7, "2 deep"},
      {[&](Document& doc) { return doc.LoadXml("<r><a/><b/><c/></r>", small); }, 1, 12, "3 el"},
      {[&](Document& doc) {
         return doc.Load(tree.Native("pipe"), Limits{100000, 2, 3});
       },
       0, 0, "100000 bytes"},
      {[&](Document& doc) { return doc.LoadXml("<r>" + std::string(15, 'x') + "</r>", small); }, 0,
       0, "21 bytes"}};
  Document doc;
  for (const auto& [load, line, column, reason] : cases) {
    EXPECT_FALSE(load(doc)) << reason;
    const ParseError& error = doc.LastParseError();
    EXPECT_EQ(std::pair(error.line, error.column), std::pair(line, column)) << error.reason;
    EXPECT_TRUE(error.limit && error.reason.find(reason) != std::string::npos) << error.reason;
  }
  EXPECT_TRUE(doc.LoadXml("<r><a></a><b></b></r>", small));
  writer.join();
}

// A file is read in the encoding its byte order mark, its spelling of "<" or its declaration
// gives; bytes that are not in that encoding, or an encoding unknown, are refused.
TEST(XmlDocumentTest, ReadsFilesInTheirEncoding) {
  using namespace std::string_literals;
  const std::pair<std::string, std::string> cases[] = {
      {"\xFF\xFE<\0r\0>\0\xE9\0<\0/\0r\0>\0"s, "<r>\xC3\xA9</r>"},
      {"\0<\0r\0>\0\xE9\0<\0/\0r\0>"s, "<r>\xC3\xA9</r>"},
      {"\xFF\xFE\0\0<\0\0\0r\0\0\0/\0\0\0>\0\0\0"s, "<r/>"},
      {"<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?><r>\xE9</r>", "<r>\xC3\xA9</r>"},
      {"\xFF\xFE<\0r\0>\0\x00\xD8<\0/\0r\0>\0"s, ""},
      {"<?xml version='1.0' encoding='x-none'?><r/>", ""}};
  testing::TempTree tree;
  Document doc;
  for (const auto& [bytes, xml] : cases) {
    tree.AddFile("doc.xml", bytes);
    EXPECT_EQ(doc.Load(tree.Native("doc.xml")), !xml.empty()) << doc.LastParseError().reason;
    EXPECT_EQ(doc.Xml(), xml);
  }
  EXPECT_EQ(std::pair(doc.LastParseError().line, doc.LastParseError().column), std::pair(1l, 1l));
  EXPECT_NE(doc.LastParseError().reason.find("not supported"), std::string::npos);
}

// Handles to no object fail with 91, misuse fails with 5; neither changes anything.
TEST(XmlDocumentTest, FailuresChangeNothing) {
  Document doc;
  Load(doc, kTree);
  Document other;
  Load(other, "<o>text</o>");
  Node root = doc.DocumentElement();
  Node c = root.FirstChild();
  Node a = c.FirstChild();
  Node fresh = doc.CreateElement("n");
  Node text = other.DocumentElement().FirstChild();
  Node none;
  std::vector<std::pair<int, std::function<void()>>> actions = {
      {kObjectNotSet, [&] { none.NodeName(); }},
      {kObjectNotSet, [&] { none.OwnerDocument(); }},
      {kObjectNotSet, [&] { none.RemoveChild(c); }},
      {kObjectNotSet, [&] { root.AppendChild(none); }},
      {kObjectNotSet, [&] { root.InsertBefore(none, c); }},
      {kObjectNotSet, [&] { root.ReplaceChild(none, c); }},
      {kObjectNotSet, [&] { root.RemoveChild(none); }},
      {kObjectNotSet, [&] { doc.SetDocumentElement(none); }},
      {kObjectNotSet, [&] { doc.FindChild(none, "c", "c_id", "2"); }},
      {kInvalidArgument, [&] { c.AppendChild(root); }},
      {kInvalidArgument, [&] { c.AppendChild(c); }},
      {kInvalidArgument, [&] { root.AppendChild(doc.AsNode()); }},
      {kInvalidArgument, [&] { root.RemoveChild(a); }},
      {kInvalidArgument, [&] { root.ReplaceChild(fresh, a); }},
      {kInvalidArgument, [&] { doc.AsNode().AppendChild(fresh); }},
      {kInvalidArgument, [&] { doc.AsNode().AppendChild(text); }},
      {kInvalidArgument, [&] { text.AppendChild(fresh); }},
      {kInvalidArgument, [&] { text.SetAttribute("v", "1"); }},
      {kInvalidArgument, [&] { doc.SetDocumentElement(text); }},
      {kInvalidArgument, [&] { doc.AsNode().SetText("t"); }},
      {kInvalidArgument, [&] { doc.AsNode().CloneNode(true); }},
      {kInvalidArgument, [&] { doc.AsNode().AppendElement("n", {}); }},
      {kInvalidArgument, [&] {
         a.AppendElement("n", {{"v", "1"}, {"v", "2"}});
       }}};
  for (std::string_view name : {"-x", "", "a b", "a\xFF", "\xCC\x80"}) {
    actions.emplace_back(kInvalidArgument, [&doc, name] { doc.CreateElement(name); });
    actions.emplace_back(kInvalidArgument, [&a, name] { a.SetAttribute(name, "1"); });
    actions.emplace_back(kInvalidArgument, [&a, name] { a.AppendElement(name, {}); });
    actions.emplace_back(kInvalidArgument, [&a, name] {
      a.AppendElement("n", {{"v", "1"}, {name, "1"}});
    });
  }
  for (std::string_view value : {"bell\x07", "\xC3"}) {
    actions.emplace_back(kInvalidArgument, [&a, value] { a.SetAttribute("v", value); });
    actions.emplace_back(kInvalidArgument, [&a, value] { a.SetText(value); });
    actions.emplace_back(kInvalidArgument, [&a, value] {
      a.AppendElement("n", {{"v", "1"}, {"w", value}});
    });
  }
  uint64_t count = doc.ModificationCount();
  for (size_t i = 0; i < actions.size(); ++i) {
    EXPECT_EQ(FailureOf(actions[i].second), actions[i].first) << "action " << i;
  }
  EXPECT_EQ(doc.Xml(), kTree);
  EXPECT_EQ(other.Xml(), "<o>text</o>");
  EXPECT_EQ(doc.ModificationCount(), count);
  // Names beyond ASCII are welcome, and so are values with tabs and line ends.
  for (const char* name : {"_x-1.2", "a:b", "\xC3\xA9t\xC3\xA9", "\xE6\x97\xA5\xE6\x9C\xAC"}) {
    root.AppendChild(doc.CreateElement(name)).SetAttribute(name, "\t\n");
  }
  Load(doc, doc.Xml());
  EXPECT_EQ(doc.AsNode().CountNodes("/r/*[@*='\t\n']"), 4u);
}

// Within a document a node moves and its handle stays; from another document it is copied here
// and removed there; the document element is replaced in place.
TEST(XmlDocumentTest, Moves) {
  Document doc;
  Load(doc, "<!--c--><r><x><a/><b/></x><y/></r>");
  Node x = doc.DocumentElement().FirstChild();
  Node a = x.FirstChild();
  Node b = x.ChildNodes()[1];
  Node y = x.ParentNode().ChildNodes()[1];
  EXPECT_EQ(y.AppendChild(a), a);
  EXPECT_EQ(y.InsertBefore(b, a), b);
  EXPECT_EQ(y.InsertBefore(a, a), a);
  EXPECT_EQ(doc.Xml(), "<!--c--><r><x/><y><b/><a/></y></r>");
  EXPECT_EQ(doc.DocumentElement().ReplaceChild(b, y), b);  // lifts the child into its place
  EXPECT_EQ(doc.Xml(), "<!--c--><r><x/><b/></r>");
  Document source;
  Load(source, "<s><a k=\"1\"><b/></a><c/></s>");
  Node moved = doc.DocumentElement().InsertBefore(source.DocumentElement().FirstChild(), b);
  EXPECT_EQ(&moved.OwnerDocument(), &doc);
  moved.SetAttribute("k", "2");
  EXPECT_EQ(doc.Xml(), "<!--c--><r><x/><a k=\"2\"><b/></a><b/></r>");
  EXPECT_EQ(doc.SetDocumentElement(b), b);
  EXPECT_EQ(doc.Xml(), "<!--c--><b/>");
  EXPECT_EQ(doc.SetDocumentElement(source.DocumentElement()).Xml(), "<s><c/></s>");
  EXPECT_EQ(doc.Xml() + source.Xml(), "<!--c--><s><c/></s>");
}

// Created and cloned nodes are in no listing, selection or text until placed; a detached node
// selects within its own subtree.
TEST(XmlDocumentTest, DetachedNodesStayOutOfSight) {
  Document doc;
  Node n = doc.SetDocumentElement(doc.CreateElement("n"));
  EXPECT_EQ(doc.DocumentElement(), n);
  EXPECT_EQ(doc.Xml(), "<n/>");
  Load(doc, "<r><c id=\"1\">t<m/></c></r>");
  Node root = doc.DocumentElement();
  Node detached = doc.CreateElement("c");
  detached.SetAttribute("id", "2");
  detached.AppendChild(doc.CreateElement("m"));
  Node clone = root.FirstChild().CloneNode(true);
  EXPECT_TRUE(clone.ParentNode().IsNull());
  EXPECT_EQ(Labels(doc.AsNode().SelectNodes("//c")), Strings{"c=1"});
  EXPECT_EQ(root.GetElementsByTagName("*").size(), 2u);
  EXPECT_EQ(doc.AsNode().GetElementsByTagName("m").size(), 1u);
  EXPECT_EQ(doc.AsNode().CountElementsByTagName("*"), 3u);
  EXPECT_EQ(doc.AsNode().ChildNodes(), std::vector<Node>{root});
  EXPECT_EQ(doc.AsNode().Text() + doc.Xml(), "t<r><c id=\"1\">t<m/></c></r>");
  std::string pieces;
  doc.WriteXml([&](std::string_view piece) { pieces += piece; });
  EXPECT_EQ(pieces, doc.Xml());
  EXPECT_EQ(detached.SelectNodes("//m").size(), 1u);
  EXPECT_EQ(detached.SelectSingleNode("."), detached);
  EXPECT_EQ(root.AppendChild(detached), detached);
  EXPECT_EQ(Labels(doc.AsNode().SelectNodes("//c")), (Strings{"c=1", "c=2"}));
  root.AppendChild(clone);
  EXPECT_EQ(root.CloneNode(false).Xml(), "<r/>");
  EXPECT_EQ(clone.Xml(), "<c id=\"1\">t<m/></c>");
}

// Children by tag, as "./tag" selects them, and node names, texts and their changes.
TEST(XmlDocumentTest, ChildrenNamesAndText) {
  Document doc;
  Load(doc, "<r>a<b i='1'>b<![CDATA[c]]></b><!--z--><?p q?><b i='2'/>d<b i='3'/></r>");
  Node r = doc.DocumentElement();
  EXPECT_EQ(Labels(r.ChildElements("b")), (Strings{"b=1", "b=2", "b=3"}));
  EXPECT_EQ(r.CountChildElements("b", 2), 2u);
  EXPECT_EQ(doc.AsNode().Text(), "abcd");
  Strings names;
  for (Node node : r.ChildNodes()) names.push_back(node.NodeName());
  EXPECT_EQ(names, (Strings{"#text", "b", "#comment", "p", "b", "#text", "b"}));
  EXPECT_EQ(r.ChildNodes()[1].ChildNodes()[1].NodeName(), "#cdata-section");
  EXPECT_EQ(doc.AsNode().NodeName(), "#document");
  r.ChildNodes()[2].SetText(" y ");
  EXPECT_EQ(FailureOf([&] { r.ChildNodes()[2].SetText("a--b"); }), kInvalidArgument);
  EXPECT_EQ(FailureOf([&] { r.ChildNodes()[3].SetText("?>"); }), kInvalidArgument);
  r.FirstChild().SetText("A");
  EXPECT_EQ(doc.Xml(),
            "<r>A<b i=\"1\">b<![CDATA[c]]></b><!-- y --><?p q?><b i=\"2\"/>d<b i=\"3\"/></r>");
  r.SetText("x < y");
  EXPECT_EQ(doc.Xml(), "<r>x &lt; y</r>");
  r.SetText("");
  EXPECT_EQ(doc.Xml(), "<r/>");
}

// The first element taken is the first in document order, nested ones included; none taken is
// no object.
TEST(XmlDocumentTest, FirstElementByTagNameWalksInDocumentOrder) {
  Document doc;
  Load(doc, "<r><a><c l=\"0\"/><c l=\"1\" n=\"1\"/></a><c l=\"1\" n=\"2\"/></r>");
  auto labelled = [](const Node& c) { return c.GetAttribute("l") == "1"; };
  EXPECT_EQ(doc.DocumentElement().FirstElementByTagName("c", labelled).GetAttribute("n"), "1");
  EXPECT_TRUE(doc.AsNode().FirstElementByTagName("c", [](const Node&) { return false; }).IsNull());
}

// In a chain of nested elements, each asked for the elements below it, every level gets what a
// walk of its subtree gives, in one walk of the chain rather than one per level (the test's time
// limit sees the difference), also once the tree changes.
TEST(XmlDocumentTest, FindsElementsBelowEachLevelOfADeepChain) {
  constexpr int kDepth = 100000;
  std::string text;
  for (int level = 0; level < kDepth; ++level) {
    text += level == 1 ? "<x>t" : level == kDepth / 2 ? "<x><y/>" : "<x>";
  }
  for (int level = 1; level < kDepth; ++level) text += level == 1 ? "<y/></x>" : "</x>";
  Limits deep;
  deep.depth = kDepth + 1;
  Document doc;
  ASSERT_TRUE(doc.LoadXml(text + "<y/></x>", deep));
  std::vector<Node> chain{doc.DocumentElement()};
  while (chain.size() < kDepth) chain.push_back(chain.back().ChildElements("x")[0]);
  Node middle = chain[kDepth / 2].FirstChild();
  Node bottom = chain.back().FirstChild();
  Node last = chain[0].ChildElements("y")[0];
  auto expect = [&](const std::vector<Node>& top, const std::vector<Node>& upper,
                    const std::vector<Node>& lower) {
    for (int level = 0; level < kDepth; ++level) {
      const std::vector<Node>& below = level == 0 ? top : level <= kDepth / 2 ? upper : lower;
      ASSERT_EQ(chain[level].GetElementsByTagName("y"), below) << level;
      ASSERT_EQ(chain[level].CountElementsByTagName("y"), below.size()) << level;
      Node wanted = below.empty() ? Node() : below.back();
      ASSERT_EQ(chain[level].FirstElementByTagName("y", [&](const Node& y) { return y == wanted; }),
                wanted)
          << level;
    }
  };
  expect({middle, bottom, last}, {middle, bottom}, {bottom});
  EXPECT_EQ(chain[1].FirstChild().GetElementsByTagName("y"), std::vector<Node>{});  // a text
  chain.back().RemoveChild(bottom);
  chain[0].InsertBefore(doc.CreateElement("z"), chain[1]);  // every later element moves on
  expect({middle, last}, {middle}, {});
  EXPECT_EQ(chain[kDepth - 2].GetElementsByTagName("*"), std::vector<Node>{chain.back()});
}

// Pieces of all lengths, across the end of the start and the ends of blocks, come out whole and
// in order; a builder is empty once its text is taken.
TEST(TextBuilderTest, HandsOverEveryPieceInOrder) {
  const std::pair<size_t, size_t> sizes[] = {{0, 1}, {5, 7}, {100, 4096}, {64 << 10, 4 << 20}};
  for (const auto& [startSize, blockSize] : sizes) {
    SCOPED_TRACE(std::to_string(startSize) + " then blocks of " + std::to_string(blockSize));
    TextBuilder builder(startSize, blockSize);
    std::string expected;
    for (size_t n = 0; n < 300; ++n) {
      std::string piece(n % 23, static_cast<char>('a' + n % 26));
      builder.write(piece.data(), piece.size());
      expected += piece;
    }
    EXPECT_EQ(builder.Take(), expected);
    builder.write("again", 5);
    EXPECT_EQ(builder.Take(), "again");
  }
}

}  // namespace
}  // namespace trl::xml
