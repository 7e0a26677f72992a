#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "platform/failure.h"
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
    "<c c_id=\"1\"/><events><event e=\"x\"/></events></r>";

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

// A reverse axis and a union come back in document order too; a bad selection fails with 5 and
// names itself.
TEST(XmlDocumentTest, SelectionsFollowXPathInDocumentOrder) {
  struct Case {
    const char* context;
    const char* xpath;
    Strings expected;
  };
  const Case cases[] = {
      {"/r", "//a[@a_id='3' or @a_parent='3']", {"a=3", "a=4"}},
      {"/r", "//a[@a_name=\"O'Brien\"]", {"a=6"}},
      {"/r/c[2]", ".//a", {"a=4", "a=6"}},
      {"/r/c[2]", "//event", {"event=x"}},
      {"/r", "//a[@a_id='6']/preceding::a", {"a=1", "a=3", "a=4"}},
      {"/r", "//c[@c_id='1'] | //a[@a_id='1']", {"a=1", "c=1"}},
      {"/r", "//zzz", {}},
  };
  Document doc;
  Load(doc, kTree);
  for (const Case& c : cases) {
    Node context = doc.AsNode().SelectSingleNode(c.context);
    EXPECT_EQ(Labels(context.SelectNodes(c.xpath)), c.expected) << c.xpath;
    EXPECT_EQ(context.CountNodes(c.xpath), c.expected.size()) << c.xpath;
    Node first = context.SelectSingleNode(c.xpath);
    EXPECT_EQ(first ? Labels({first})[0] : "", c.expected.empty() ? "" : c.expected[0]);
  }
  Node root = doc.DocumentElement();
  for (const char* xpath : {"//a[", "count(//a)", "//a/@a_id"}) {
    try {
      root.SelectNodes(xpath);
      ADD_FAILURE() << xpath;
    } catch (const Failure& failure) {
      EXPECT_EQ(failure.number, kInvalidArgument) << xpath;
      EXPECT_THAT(failure.description, ::testing::HasSubstr(xpath));
    }
    EXPECT_EQ(FailureOf([&] { root.SelectSingleNode(xpath); }), kInvalidArgument) << xpath;
    EXPECT_EQ(FailureOf([&] { root.CountNodes(xpath); }), kInvalidArgument) << xpath;
  }
}

// Attributes keep their order and tell absent from empty; documents are written raw, without
// declaration or blank text between elements, and read back as they were.
TEST(XmlDocumentTest, AttributesAndWriting) {
  Document doc;
  Load(doc, "<x b=\"1\" a=\"2\" c=\"\"/>");
  Node x = doc.DocumentElement();
  EXPECT_EQ(x.GetAttribute("c"), std::optional<std::string>(""));
  EXPECT_EQ(x.GetAttribute("z"), std::nullopt);
  x.SetAttribute("a", "9");
  x.SetAttribute("d", "tab\tline\nquote\"<&>");
  x.RemoveAttribute("b");
  x.RemoveAttribute("zz");
  std::string written = doc.Xml();
  EXPECT_EQ(written, "<x a=\"9\" c=\"\" d=\"tab&#09;line&#10;quote&quot;&lt;&amp;>\"/>");
  Load(doc, written);
  EXPECT_EQ(doc.DocumentElement().Attributes(),
            (std::vector<std::pair<std::string, std::string>>{
                {"a", "9"}, {"c", ""}, {"d", "tab\tline\nquote\"<&>"}}));

  const std::pair<const char*, const char*> cases[] = {
      {"<?xml version=\"1.0\"?>\n<r>\n  <a x=\"1\"/>\n  <b>t &amp; u</b>\n</r>\n",
       "<r><a x=\"1\"/><b>t &amp; u</b></r>"},
      {"<!-- c --><?pi data?><r><![CDATA[a<b]]> \xC3\xA9 </r><!--d-->",
       "<!-- c --><?pi data?><r><![CDATA[a<b]]> \xC3\xA9 </r><!--d-->"},
  };
  for (auto [text, expected] : cases) {
    Load(doc, text);
    EXPECT_EQ(doc.Xml(), expected);
  }
  EXPECT_EQ(Document().Xml(), "");
}

// A failed load leaves the document empty and tells where, in lines and byte columns.
TEST(XmlDocumentTest, FailedLoadEmptiesAndTellsWhere) {
  testing::TempTree tree;
  tree.AddFile("bad.xml", "<r>\n\n <x></r>");
  struct Case {
    std::function<bool(Document&)> load;
    int64_t line, column;
  };
  const Case cases[] = {
      {[](Document& doc) { return doc.LoadXml("<r>\n<a>\n</b></r>"); }, 3, 3},
      {[&](Document& doc) { return doc.Load(tree.Native("bad.xml")); }, 3, 7},
      {[&](Document& doc) { return doc.Load(tree.Native("missing.xml")); }, 0, 0},
  };
  for (const Case& c : cases) {
    Document doc;
    Load(doc, kTree);
    EXPECT_FALSE(c.load(doc));
    const ParseError& error = doc.LastParseError();
    EXPECT_FALSE(error.ok || error.reason.empty());
    EXPECT_EQ(std::pair(error.line, error.column), std::pair(c.line, c.column)) << error.reason;
    EXPECT_EQ(doc.Xml(), "");
    EXPECT_TRUE(doc.DocumentElement().IsNull());
    EXPECT_TRUE(doc.LoadXml("<ok/>"));
    EXPECT_TRUE(doc.LastParseError().ok);
  }
}

TEST(XmlDocumentTest, HandlesToNoObjectFailWithNinetyOne) {
  Document doc;
  Load(doc, kTree);
  Node root = doc.DocumentElement();
  Node c = root.FirstChild();
  Node none;
  EXPECT_EQ(none.Type(), NodeType::kNull);
  const std::function<void()> actions[] = {[&] { none.NodeName(); },
                                           [&] { none.GetAttribute("a"); },
                                           [&] { none.SetAttribute("a", "1"); },
                                           [&] { none.OwnerDocument(); },
                                           [&] { none.ChildNodes(); },
                                           [&] { none.SelectNodes("a"); },
                                           [&] { none.RemoveChild(c); },
                                           [&] { none.Xml(); },
                                           [&] { root.AppendChild(none); },
                                           [&] { root.InsertBefore(none, c); },
                                           [&] { root.ReplaceChild(none, c); },
                                           [&] { root.ReplaceChild(c, none); },
                                           [&] { root.RemoveChild(none); },
                                           [&] { doc.SetDocumentElement(none); },
                                           [&] { doc.FindChild(none, "c", "c_id", "2"); }};
  for (size_t i = 0; i < std::size(actions); ++i) {
    EXPECT_EQ(FailureOf(actions[i]), kObjectNotSet) << "action " << i;
  }
  EXPECT_EQ(doc.Xml(), kTree);
}

TEST(XmlDocumentTest, MisuseFailsWithFiveAndChangesNothing) {
  Document doc;
  Load(doc, kTree);
  Document other;
  Load(other, "<o>text</o>");
  Node root = doc.DocumentElement();
  Node c = root.FirstChild();
  Node a = c.FirstChild();
  Node fresh = doc.CreateElement("n");
  Node text = other.DocumentElement().FirstChild();
  std::vector<std::function<void()>> actions = {[&] { c.AppendChild(root); },
                                                [&] { c.AppendChild(c); },
                                                [&] { c.InsertBefore(root, a); },
                                                [&] { root.AppendChild(doc.AsNode()); },
                                                [&] { root.AppendChild(other.AsNode()); },
                                                [&] { root.RemoveChild(a); },
                                                [&] { root.ReplaceChild(fresh, a); },
                                                [&] { root.InsertBefore(fresh, a); },
                                                [&] { doc.AsNode().AppendChild(fresh); },
                                                [&] { doc.AsNode().AppendChild(text); },
                                                [&] { text.AppendChild(fresh); },
                                                [&] { text.SetAttribute("v", "1"); },
                                                [&] { doc.SetDocumentElement(text); },
                                                [&] { doc.AsNode().SetText("t"); },
                                                [&] { doc.AsNode().CloneNode(true); },
                                                [&] { doc.AsNode().AppendElement("n", {}); },
                                                [&] { text.AppendElement("n", {}); },
                                                [&] {
                                                  a.AppendElement("n", {{"v", "1"}, {"v", "2"}});
                                                }};
  for (std::string_view name : {"-x", "", "a b", "a\xFF", "\xCC\x80"}) {
    actions.push_back([&doc, name] { doc.CreateElement(name); });
    actions.push_back([&a, name] { a.SetAttribute(name, "1"); });
    actions.push_back([&a, name] { a.AppendElement(name, {{"v", "1"}}); });
    actions.push_back([&a, name] { a.AppendElement("n", {{"v", "1"}, {name, "1"}}); });
  }
  for (std::string_view value : {"bell\x07", "\xC3"}) {
    actions.push_back([&a, value] { a.SetAttribute("v", value); });
    actions.push_back([&a, value] { a.SetText(value); });
    actions.push_back([&a, value] { a.AppendElement("n", {{"v", "1"}, {"w", value}}); });
  }
  uint64_t count = doc.ModificationCount();
  for (size_t i = 0; i < actions.size(); ++i) {
    EXPECT_EQ(FailureOf(actions[i]), kInvalidArgument) << "action " << i;
  }
  EXPECT_EQ(doc.Xml(), kTree);
  EXPECT_EQ(other.Xml(), "<o>text</o>");
  EXPECT_EQ(doc.ModificationCount(), count);

  for (const char* name : {"_x-1.2", "a:b", "\xC3\xA9t\xC3\xA9", "\xE6\x97\xA5\xE6\x9C\xAC"}) {
    root.AppendChild(doc.CreateElement(name)).SetAttribute(name, "\t\n");
  }
  Load(doc, doc.Xml());
  EXPECT_EQ(doc.AsNode().CountNodes("/r/*[@*='\t\n']"), 4u);
}

TEST(XmlDocumentTest, DocumentElementIsReplacedInPlace) {
  Document doc;
  Node first = doc.CreateElement("n");
  EXPECT_EQ(doc.SetDocumentElement(first), first);
  EXPECT_EQ(doc.Xml(), "<n/>");
  Load(doc, "<!--c--><r><a/></r><!--d-->");
  Node a = doc.DocumentElement().FirstChild();
  EXPECT_EQ(doc.SetDocumentElement(a), a);
  EXPECT_EQ(doc.Xml(), "<!--c--><a/><!--d-->");

  Document other;
  Load(other, "<m x=\"1\"><k/></m>");
  Node copied = doc.SetDocumentElement(other.DocumentElement());
  EXPECT_EQ(doc.DocumentElement(), copied);
  EXPECT_EQ(doc.Xml(), "<!--c--><m x=\"1\"><k/></m><!--d-->");
  EXPECT_EQ(other.Xml(), "");
}

// Within a document a node moves and its handle stays; from another document it is copied here
// and removed there.
TEST(XmlDocumentTest, Moves) {
  Document doc;
  Load(doc, "<r><x><a/><b/></x><y/></r>");
  Node x = doc.DocumentElement().FirstChild();
  Node a = x.FirstChild();
  Node b = x.ChildNodes()[1];
  Node y = x.ParentNode().ChildNodes()[1];
  EXPECT_EQ(y.AppendChild(a), a);
  EXPECT_EQ(y.InsertBefore(b, a), b);
  EXPECT_EQ(doc.Xml(), "<r><x/><y><b/><a/></y></r>");
  EXPECT_EQ(y.InsertBefore(a, b), a);
  EXPECT_EQ(y.InsertBefore(a, a), a);
  EXPECT_EQ(doc.Xml(), "<r><x/><y><a/><b/></y></r>");
  // Replacing a node by its own child lifts the child into its place.
  EXPECT_EQ(doc.DocumentElement().ReplaceChild(b, y), b);
  EXPECT_EQ(doc.Xml(), "<r><x/><b/></r>");

  Document source;
  Load(source, "<s><a k=\"1\"><b/></a><c/></s>");
  Node moved = doc.DocumentElement().InsertBefore(source.DocumentElement().FirstChild(), b);
  EXPECT_EQ(&moved.OwnerDocument(), &doc);
  moved.SetAttribute("k", "2");
  EXPECT_EQ(doc.Xml(), "<r><x/><a k=\"2\"><b/></a><b/></r>");
  EXPECT_EQ(source.Xml(), "<s><c/></s>");
}

// Created and cloned nodes are in no listing, selection or text until placed; a detached node
// selects within its own subtree.
TEST(XmlDocumentTest, DetachedNodesStayOutOfSight) {
  Document doc;
  Node detached = doc.CreateElement("c");
  EXPECT_EQ(doc.Xml(), "");
  EXPECT_TRUE(doc.DocumentElement().IsNull());
  EXPECT_TRUE(doc.AsNode().FirstChild().IsNull());
  Load(doc, "<r><c id=\"1\"><m/></c></r>");
  Node root = doc.DocumentElement();
  detached = doc.CreateElement("c");
  detached.SetAttribute("id", "2");
  detached.AppendChild(doc.CreateElement("m"));
  Node clone = root.FirstChild().CloneNode(true);
  for (Node node : {detached, clone}) EXPECT_TRUE(node.ParentNode().IsNull());
  EXPECT_EQ(Labels(doc.AsNode().SelectNodes("//c")), Strings{"c=1"});
  EXPECT_EQ(doc.AsNode().CountNodes("//*"), 3u);
  EXPECT_EQ(root.GetElementsByTagName("*").size(), 2u);
  EXPECT_EQ(doc.AsNode().GetElementsByTagName("m").size(), 1u);
  EXPECT_EQ(doc.AsNode().ChildNodes(), std::vector<Node>{root});
  EXPECT_EQ(doc.Xml(), "<r><c id=\"1\"><m/></c></r>");
  EXPECT_EQ(detached.SelectNodes("//m").size(), 1u);
  EXPECT_EQ(detached.SelectSingleNode("."), detached);

  EXPECT_EQ(root.AppendChild(detached), detached);
  EXPECT_EQ(detached.ParentNode(), root);
  EXPECT_EQ(Labels(doc.AsNode().SelectNodes("//c")), (Strings{"c=1", "c=2"}));
  root.AppendChild(clone);
  EXPECT_EQ(doc.AsNode().CountNodes("/node()"), 1u);
  EXPECT_EQ(root.CloneNode(false).Xml(), "<r/>");
  EXPECT_EQ(clone.Xml(), "<c id=\"1\"><m/></c>");
}

// Children by tag, as "./tag" selects them, and node names, texts and their changes.
TEST(XmlDocumentTest, ChildrenNamesAndText) {
  Document doc;
  Load(doc, "<r>t<a i='1'/><b/><a i='2'><a i='3'/></a><!--a--><a i='4'/></r>");
  Node r = doc.DocumentElement();
  EXPECT_EQ(Labels(r.ChildElements("a")), (Strings{"a=1", "a=2", "a=4"}));
  EXPECT_EQ(r.CountChildElements("a"), 3u);
  EXPECT_EQ(r.CountChildElements("a", 2), 2u);
  EXPECT_EQ(r.CountChildElements("b", 2), 1u);

  Load(doc, "<r>a<b>b<![CDATA[c]]></b><!--z--><?p q?>d</r>");
  r = doc.DocumentElement();
  EXPECT_EQ(doc.AsNode().Text(), "abcd");
  Strings names;
  for (Node node : doc.AsNode().SelectNodes("//node()")) names.push_back(node.NodeName());
  EXPECT_EQ(names,
            (Strings{"r", "#text", "b", "#text", "#cdata-section", "#comment", "p", "#text"}));
  EXPECT_EQ(doc.AsNode().NodeName(), "#document");
  r.ChildNodes()[2].SetText(" y ");
  EXPECT_EQ(FailureOf([&] { r.ChildNodes()[2].SetText("a--b"); }), kInvalidArgument);
  EXPECT_EQ(FailureOf([&] { r.ChildNodes()[3].SetText("?>"); }), kInvalidArgument);
  r.FirstChild().SetText("A");
  EXPECT_EQ(doc.Xml(), "<r>A<b>b<![CDATA[c]]></b><!-- y --><?p q?>d</r>");
  r.SetText("x < y");
  EXPECT_EQ(doc.Xml(), "<r>x &lt; y</r>");
  r.SetText("");
  EXPECT_EQ(doc.Xml(), "<r/>");
}

TEST(XmlDocumentTest, CountsChangesAndNumbersDocuments) {
  Document doc;
  Load(doc, "<r/>");
  Node r = doc.DocumentElement();
  uint64_t last = doc.ModificationCount();
  const std::function<void()> changes[] = {
      [&] { r.SetAttribute("a", "1"); }, [&] { r.SetAttribute("a", "2"); },
      [&] { r.RemoveAttribute("a"); },   [&] { r.AppendChild(doc.CreateElement("b")); },
      [&] { r.SetText("t"); },           [&] { r.RemoveChild(r.FirstChild()); },
      [&] { doc.LoadXml("<r/>"); },      [&] { doc.LoadXml("<"); }};
  for (size_t i = 0; i < std::size(changes); ++i) {
    changes[i]();
    EXPECT_GT(doc.ModificationCount(), last) << "change " << i;
    last = doc.ModificationCount();
  }
  auto gone = std::make_unique<Document>();
  uint64_t goneSerial = gone->Serial();
  gone.reset();
  EXPECT_GT(Document().Serial(), goneSerial);
}

}  // namespace
}  // namespace trl::xml
