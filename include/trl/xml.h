#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "trl/export.h"

namespace trl::xml {

class Document;

enum class NodeType { kNull, kDocument, kElement, kText, kCData, kComment, kProcessingInstruction };

// A handle to one node of a Document, or to no node ("no object"). Copying a handle does not copy
// the node. A handle is valid while its document lives and the node stays in it; every operation
// on a handle to no node fails with kObjectNotSet (91) instead of doing nothing.
class TRL_API Node {
 public:
  Node() = default;

  bool IsNull() const { return node_ == nullptr; }
  explicit operator bool() const { return node_ != nullptr; }
  bool operator==(const Node& other) const { return node_ == other.node_; }

  NodeType Type() const;  // kNull for no object; never fails
  std::string NodeName() const;
  Document& OwnerDocument() const;

  // Null (std::nullopt) when the attribute is absent; "" only when it is present and empty.
  std::optional<std::string> GetAttribute(std::string_view name) const;
  // The same without a copy, valid until the attribute is changed or removed.
  std::optional<std::string_view> GetAttributeView(std::string_view name) const;
  // Updates the value in place, or appends the attribute after the existing ones. Fails with
  // kInvalidArgument (5) for a bad name or for text that XML 1.0 cannot carry.
  void SetAttribute(std::string_view name, std::string_view value);
  void RemoveAttribute(std::string_view name);
  // All attributes, in document order.
  std::vector<std::pair<std::string, std::string>> Attributes() const;

  Node ParentNode() const;  // no object for a document or a node not in a tree
  Node FirstChild() const;
  std::vector<Node> ChildNodes() const;
  // The child elements with this tag, in document order: "./tag" without the cost of a selection.
  std::vector<Node> ChildElements(std::string_view tag) const;
  // How many child elements have this tag, counting no further than `limit`.
  size_t CountChildElements(std::string_view tag, size_t limit = SIZE_MAX) const;

  // XPath 1.0 from this node. The result is a snapshot in document order: later changes to the
  // document do not change it. A bad expression fails with kInvalidArgument (5).
  std::vector<Node> SelectNodes(std::string_view xpath) const;
  Node SelectSingleNode(std::string_view xpath) const;  // first in document order, or no object
  size_t CountNodes(std::string_view xpath) const;
  // The descendant elements with this tag ("*" for all), in document order.
  std::vector<Node> GetElementsByTagName(std::string_view tag) const;
  // How many of them there are, without listing them.
  size_t CountElementsByTagName(std::string_view tag) const;
  // The first of them that `accept` takes, or no object; the walk stops there.
  Node FirstElementByTagName(std::string_view tag,
                             const std::function<bool(const Node&)>& accept) const;

  // Tree changes. A node of this document moves (handles to it stay valid); a node of another
  // document is copied here and removed from its own document: use the returned handle.
  Node AppendChild(Node child);
  Node InsertBefore(Node child, Node reference);    // reference no object: append
  Node ReplaceChild(Node newChild, Node oldChild);  // returns the handle of the inserted node
  // Appends a new `tag` element holding `attributes` (names and values, in this order) to this
  // element and returns it: CreateElement, SetAttribute for each and AppendChild in one step, for
  // building large trees. Fails with kInvalidArgument (5), changing nothing, when this is no
  // element, for a bad name, a name given twice or text that XML 1.0 cannot carry.
  Node AppendElement(
      std::string_view tag,
      std::initializer_list<std::pair<std::string_view, std::string_view>> attributes);
  // Removes and destroys the child and everything below it; handles to them become invalid.
  void RemoveChild(Node child);
  // A copy in the same document, not in the tree until appended somewhere.
  Node CloneNode(bool deep) const;

  // The text of all descendant text and CDATA nodes, concatenated.
  std::string Text() const;
  // Replaces all children with one text node.
  void SetText(std::string_view text);

  // Raw serialisation of the node and everything below it, without declaration.
  std::string Xml() const;
  // The same text handed to `out` in pieces, in order, instead of held whole.
  void WriteXml(const std::function<void(std::string_view)>& out) const;

  // The underlying node object (for the layer's own tests and for hashing); opaque to callers.
  const void* Id() const { return node_; }

 private:
  friend class Document;
  Node(void* node, Document* document) : node_(node), document_(document) {}

  void* node_ = nullptr;
  Document* document_ = nullptr;
};

// Where and why the last load failed.
struct ParseError {
  bool ok = true;
  std::string reason;
  // 1-based; both 0 when the failure has no place in the text (a file that cannot be read, a
  // document larger than its limit).
  int64_t line = 0;
  int64_t column = 0;  // in bytes of the text as UTF-8
  // The document breaks one of the Limits, not a rule of XML; the reason names the limit.
  bool limit = false;
};

// The most a load accepts. The defaults are far beyond any real document (the largest a run of the
// component makes is a few hundred megabytes, nested eight deep), so that a document made to
// exhaust memory or time is refused before it is parsed.
struct Limits {
  size_t bytes = size_t{2} << 30;  // the text, as UTF-8
  size_t depth = 256;              // elements nested in one another
  size_t elements = 50'000'000;
};

// An XML document: the tree the component reads and writes, with XPath 1.0 selections, raw
// serialisation and attribute order kept as written.
class TRL_API Document {
 public:
  Document();
  ~Document();
  Document(const Document&) = delete;
  Document& operator=(const Document&) = delete;

  // Replace the content with the parsed text or file. On failure the document is left empty and
  // LastParseError tells where and why. A document loads only when it is well formed in what the
  // parser behind it lets pass too: every character, raw or as a character reference, one that
  // XML 1.0 allows, the text valid UTF-8, no attribute given twice on one element, no "<" in an
  // attribute value; and when it keeps within `limits`. A file is read as its byte order mark,
  // its UTF-16 or UTF-32 spelling of "<?xml" or its declared encoding says, else as UTF-8; text
  // in memory is UTF-8 whatever it declares.
  bool LoadXml(std::string_view text, const Limits& limits = Limits());
  bool Load(const std::string& path, const Limits& limits = Limits());
  const ParseError& LastParseError() const;

  // The whole document, raw, without declaration; "" when it has no content.
  std::string Xml() const;
  // The same text handed to `out` in pieces, in order: nothing when it has no content.
  void WriteXml(const std::function<void(std::string_view)>& out) const;

  Node AsNode();           // the document node itself: selections from here start at the root
  Node DocumentElement();  // no object when there is none
  // Makes `element` the document element, in place of the current one if any. An element of
  // another document is copied (see Node::AppendChild); returns the handle in this document.
  Node SetDocumentElement(Node element);
  // A new element owned by this document but not yet in its tree.
  Node CreateElement(std::string_view tag);

  // The first child of `parent` (in document order) that is a `tag` element whose attribute `attr`
  // equals `value`, or no object: the same answer as a scan of the children, in amortised O(1).
  // The index behind it is built on first use per (parent, tag, attr) and kept in step with every
  // change made through this layer (children added, inserted, removed or replaced, key attributes
  // rewritten).
  Node FindChild(Node parent, std::string_view tag, std::string_view attr, std::string_view value);

  // Changes made through this layer so far; grows with every change, never repeats.
  uint64_t ModificationCount() const;
  // Unique per document object in this process, never reused.
  uint64_t Serial() const;

  struct TRL_LOCAL Impl;

 private:
  friend class Node;
  std::unique_ptr<Impl> impl_;
};

using DocumentPtr = std::shared_ptr<Document>;

}  // namespace trl::xml
