#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "platform/failure.h"
#include "platform/xml/key_table.h"
#include "trl/xml.h"

namespace trl::xml {
namespace {

const char* const kStarts[] = {
    "<r><p k=\"1\"><f k=\"1\"/><f k=\"2\" x=\"1\"/><f/><g k=\"1\"/><f k=\"1\" x=\"0\"/></p>t"
    "<p k=\"2\"><f k=\"3\">x</f></p><f k=\"0\"/></r>",
    "<r><f k=\"1\"/><f k=\"1\"/><g k=\"2\"><f k=\"2\"/></g></r>",
};

// Applies random changes through the public interface to two documents; Mismatch compares every
// FindChild answer with a scan of the children.
class RandomChanges {
 public:
  explicit RandomChanges(uint32_t start) : random_(start) {
    for (Document& doc : docs_) doc.LoadXml(kStarts[0]);
  }

  void Step() {
    size_t which = Pick(2);
    Document& doc = docs_[which];
    Node parent = Any(doc.AsNode().SelectNodes("//*"));
    Node child = Any(doc.AsNode().SelectNodes("/*//node()"));
    Node element = Any(doc.AsNode().SelectNodes("/*//*"));
    Node foreign = Any(docs_[1 - which].AsNode().SelectNodes("/*//node()"));
    Node sibling = Any(parent.ChildNodes());
    const std::function<void()> changes[] = {
        [&] { parent.RemoveChild(sibling); },
        [&] { parent.AppendChild(NewElement(doc)); },
        [&] { parent.InsertBefore(NewElement(doc), sibling); },
        [&] { parent.ReplaceChild(element && Chance(50) ? element : NewElement(doc), sibling); },
        [&] { element.SetAttribute(Chance(80) ? "k" : "x", Key()); },
        [&] { element.RemoveAttribute(Chance(80) ? "k" : "x"); },
        [&] { parent.InsertBefore(child, Chance(50) ? Node() : sibling); },
        [&] { parent.InsertBefore(foreign, sibling); },
        [&] { parent.ReplaceChild(foreign, sibling); },
        [&] { parent.AppendChild(child.CloneNode(Chance(50))); },
        [&] { parent.AppendChild(NewDetachedParent(doc)); },
        [&] {
          parent.AppendElement(Chance(70) ? "f" : "g", {{"x", Key()}, {"k", Key()}});
        },
        [&] { parent.SetText("text"); },
        [&] { doc.SetDocumentElement(element); },
        [&] { doc.LoadXml(kStarts[Pick(2)]); }};
    // Removals win while the documents are large, so they stay small enough to check fully; the
    // last three changes, which undo much, come seldom.
    size_t change = doc.AsNode().CountNodes("//node()") > 40 ? 0 : Pick(std::size(changes) - 3);
    if (Chance(5)) change = std::size(changes) - 1 - Pick(3);
    try {
      changes[change]();
    } catch (const Failure& failure) {
      // Moving a node below itself is refused, and so is a change to no object.
      if (failure.number != kInvalidArgument && failure.number != kObjectNotSet) throw;
    }
  }

  // The first FindChild answer that differs from a scan, "" when all agree. Either document
  // answers for a parent of either.
  std::string Mismatch() {
    for (Document& doc : docs_) {
      std::vector<Node> parents = doc.AsNode().SelectNodes("//*");
      parents.push_back(doc.AsNode());
      for (Node parent : parents) {
        for (auto [tag, attr] : {std::pair{"f", "k"}, {"g", "k"}, {"f", "x"}}) {
          for (const char* value : {"0", "1", "2", "3", "9"}) {
            Node expected;
            for (Node child : parent.ChildNodes()) {
              if (!expected && child.Type() == NodeType::kElement && child.NodeName() == tag &&
                  child.GetAttribute(attr) == value) {
                expected = child;
              }
            }
            if (docs_[Pick(2)].FindChild(parent, tag, attr, value) != expected) {
              return "under " + parent.Xml() + " " + tag + "[@" + attr + "='" + value + "']";
            }
          }
        }
      }
    }
    return "";
  }

 private:
  size_t Pick(size_t n) { return std::uniform_int_distribution<size_t>(0, n - 1)(random_); }
  bool Chance(size_t percent) { return Pick(100) < percent; }
  std::string Key() { return std::to_string(Pick(4)); }
  Node Any(const std::vector<Node>& nodes) {
    return nodes.empty() ? Node() : nodes[Pick(nodes.size())];
  }

  Node NewElement(Document& doc) {
    Node element = doc.CreateElement(Chance(70) ? "f" : "g");
    if (Chance(85)) element.SetAttribute("k", Key());
    return element;
  }

  // A detached parent whose index is used and kept in step before it joins the tree.
  Node NewDetachedParent(Document& doc) {
    Node parent = NewElement(doc);
    for (size_t i = Pick(4); i > 0; --i) parent.AppendChild(NewElement(doc));
    doc.FindChild(parent, "f", "k", Key());
    parent.AppendChild(NewElement(doc));
    return parent;
  }

  std::mt19937 random_;
  Document docs_[2];
};

TEST(XmlChildIndexTest, AgreesWithAScanThroughRandomChanges) {
  for (uint32_t start : {20240611u, 1u, 2u, 3u, 4u}) {
    RandomChanges changes(start);
    for (int step = 0; step < (start > 4 ? 4000 : 1000); ++step) {
      changes.Step();
      std::string mismatch = changes.Mismatch();
      ASSERT_TRUE(mismatch.empty()) << "start " << start << ", step " << step << ": " << mismatch;
    }
  }
}

// pugixml hands the memory of a freed subtree out again; a new parent at the same place must not
// inherit the index of the old one. Nodes copied in from another document leave nothing else in
// this one's memory page.
TEST(XmlChildIndexTest, NewNodeInFreedMemoryStartsWithoutAnIndex) {
  Document doc;
  Document source;
  auto addParent = [&](std::string_view text) {
    source.LoadXml(text);
    return doc.AsNode().AppendChild(source.DocumentElement());
  };
  Node parent = addParent("<p><f k=\"1\"/></p>");
  const void* place = parent.Id();
  ASSERT_EQ(doc.FindChild(parent, "f", "k", "1"), parent.FirstChild());
  doc.AsNode().RemoveChild(parent);
  Node again = addParent("<p><f k=\"2\"/><f k=\"1\"/></p>");
  ASSERT_EQ(again.Id(), place) << "the allocator no longer reuses freed memory this way";
  EXPECT_EQ(doc.FindChild(again, "f", "k", "1"), again.ChildNodes()[1]);
}

// Inserts and erases keys in random order and checks every key after each step against the set
// of keys that should be present: erasing must never cut a probe run short. A key has one holder:
// a second element with it is neither added nor erased.
TEST(KeyTableTest, FindsExactlyThePresentKeysThroughInsertsAndErases) {
  pugi::xml_document doc;
  std::vector<pugi::xml_node> elements;
  for (int i = 0; i < 300; ++i) {
    elements.push_back(doc.append_child("f"));
    elements.back().append_attribute("k").set_value(("key" + std::to_string(i)).c_str());
  }
  pugi::xml_node_struct* twin = doc.append_child("f").internal_object();
  std::mt19937 random(7);
  KeyTable table("k");
  std::vector<bool> present(elements.size(), false);
  for (int step = 0; step < 3000; ++step) {
    size_t i = random() % elements.size();
    std::string_view key = elements[i].attribute("k").value();
    ASSERT_FALSE(table.Erase(key, twin));
    if (present[i]) {
      ASSERT_TRUE(table.Erase(key, elements[i].internal_object()));
    } else {
      ASSERT_TRUE(table.Insert(key, elements[i].internal_object()));
      ASSERT_FALSE(table.Insert(key, twin));
    }
    present[i] = !present[i];
    ASSERT_EQ(table.Size(), static_cast<size_t>(std::count(present.begin(), present.end(), true)));
    for (size_t j = 0; j < elements.size(); ++j) {
      auto* expected = present[j] ? elements[j].internal_object() : nullptr;
      ASSERT_EQ(table.Find(elements[j].attribute("k").value()), expected) << "step " << step;
    }
  }
}

}  // namespace
}  // namespace trl::xml
