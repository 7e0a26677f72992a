#include <cstring>
#include <string>

#include "platform/failure.h"
#include "platform/text.h"
#include "platform/xml/document_impl.h"
#include "platform/xml/text_builder.h"
#include "platform/xml/tree_walk.h"

namespace trl::xml {
namespace {

// Prints `node` (a whole document without the detached elements' holder) to `out`.
void Print(pugi::xml_node node, pugi::xml_node holder, pugi::xml_writer& out) {
  if (node.type() != pugi::node_document) {
    node.print(out, "", pugi::format_raw, pugi::encoding_utf8);
    return;
  }
  for (pugi::xml_node child : node.children()) {
    if (child != holder) child.print(out, "", pugi::format_raw, pugi::encoding_utf8);
  }
}

// Hands each piece the printer makes to a function.
class PieceWriter final : public pugi::xml_writer {
 public:
  explicit PieceWriter(const std::function<void(std::string_view)>& out) : out_(out) {}
  void write(const void* data, size_t size) override {
    out_(std::string_view(static_cast<const char*>(data), size));
  }

 private:
  const std::function<void(std::string_view)>& out_;
};

pugi::xml_node RequireElement(const Node& node) {
  pugi::xml_node element = Require(node);
  if (element.type() != pugi::node_element) Fail(kInvalidArgument, "Only elements have attributes");
  return element;
}

// The attribute called `name`. The library's own search walks the attributes without a call per
// attribute, but wants a terminated name: short names are copied to the stack for it.
pugi::xml_attribute AttributeNamed(pugi::xml_node node, std::string_view name) {
  char terminated[64];
  if (name.size() < sizeof terminated && name.find('\0') == std::string_view::npos) {
    std::memcpy(terminated, name.data(), name.size());
    terminated[name.size()] = '\0';
    return node.attribute(terminated);
  }
  pugi::xml_attribute attr = node.first_attribute();
  while (attr && !TerminatedEquals(attr.name(), name)) attr = attr.next_attribute();
  return attr;
}

// Fails unless `child` is a child of `parent`; returns it.
pugi::xml_node RequireChild(const Node& parent, const Node& child) {
  pugi::xml_node node = Require(child);
  if (node.parent() != ToPugi(parent)) {
    Fail(kInvalidArgument, "The node is not a child of this node");
  }
  return node;
}

// Comments and processing instructions have no escapes for their closing sequences.
void CheckValue(pugi::xml_node_type type, std::string_view text) {
  CheckText(text);
  if (type == pugi::node_comment && (text.find("--") != text.npos || text.ends_with('-'))) {
    Fail(kInvalidArgument, "A comment cannot hold \"--\" or end with \"-\"");
  }
  if (type == pugi::node_pi && text.find("?>") != text.npos) {
    Fail(kInvalidArgument, "A processing instruction cannot hold \"?>\"");
  }
}

}  // namespace

NodeType Node::Type() const {
  switch (ToPugi(*this).type()) {
    case pugi::node_document:
      return NodeType::kDocument;
    case pugi::node_element:
      return NodeType::kElement;
    case pugi::node_pcdata:
      return NodeType::kText;
    case pugi::node_cdata:
      return NodeType::kCData;
    case pugi::node_comment:
      return NodeType::kComment;
    case pugi::node_pi:
      return NodeType::kProcessingInstruction;
    default:  // no node; declarations and document types are never kept
      return NodeType::kNull;
  }
}

std::string Node::NodeName() const {
  pugi::xml_node node = Require(*this);
  switch (node.type()) {
    case pugi::node_document:
      return "#document";
    case pugi::node_pcdata:
      return "#text";
    case pugi::node_cdata:
      return "#cdata-section";
    case pugi::node_comment:
      return "#comment";
    default:  // elements and processing instructions have names of their own
      return node.name();
  }
}

Document& Node::OwnerDocument() const {
  Require(*this);
  return *document_;
}

std::optional<std::string> Node::GetAttribute(std::string_view name) const {
  if (auto value = GetAttributeView(name)) return std::string(*value);
  return std::nullopt;
}

std::optional<std::string_view> Node::GetAttributeView(std::string_view name) const {
  pugi::xml_attribute attr = AttributeNamed(Require(*this), name);
  if (attr) return std::string_view(attr.value());
  return std::nullopt;
}

void Node::SetAttribute(std::string_view name, std::string_view value) {
  pugi::xml_node node = RequireElement(*this);
  CheckText(value);
  Document::Impl& impl = *document_->impl_;
  pugi::xml_attribute attr = AttributeNamed(node, name);
  // A detached element is in no index yet: it joins its parent's when it is placed.
  bool indexed = node.parent() != impl.holder;
  bool written = false;
  if (attr) {
    if (indexed) impl.index.KeyChanging(node, name);
    written = attr.set_value(value.data(), value.size());
  } else {
    attr = impl.NewAttribute(node, name);  // checks the name
    written = attr && attr.set_value(value.data(), value.size());
    if (attr && !written) node.remove_attribute(attr);
  }
  // Also after a failed write, which leaves the old value (or no attribute) in place.
  if (indexed) impl.index.KeyChanged(node, name);
  if (!written) FailOutOfMemory();
  impl.Changed();
}

void Node::RemoveAttribute(std::string_view name) {
  pugi::xml_node node = RequireElement(*this);
  std::string attrName(name);
  pugi::xml_attribute attr = node.attribute(attrName.c_str());
  if (!attr) return;
  Document::Impl& impl = *document_->impl_;
  impl.index.KeyChanging(node, attrName);
  node.remove_attribute(attr);
  impl.Changed();
}

std::vector<std::pair<std::string, std::string>> Node::Attributes() const {
  std::vector<std::pair<std::string, std::string>> attributes;
  for (pugi::xml_attribute attr : Require(*this).attributes()) {
    attributes.emplace_back(attr.name(), attr.value());
  }
  return attributes;
}

Node Node::ParentNode() const {
  pugi::xml_node parent = Require(*this).parent();
  Document::Impl& impl = *document_->impl_;
  return parent == impl.holder ? Node() : impl.Wrap(parent);
}

Node Node::FirstChild() const {
  pugi::xml_node child = Require(*this).first_child();
  Document::Impl& impl = *document_->impl_;
  return child == impl.holder ? Node() : impl.Wrap(child);
}

std::vector<Node> Node::ChildNodes() const {
  pugi::xml_node node = Require(*this);
  Document::Impl& impl = *document_->impl_;
  std::vector<Node> children;
  for (pugi::xml_node child : node.children()) {
    if (child != impl.holder) children.push_back(impl.Wrap(child));
  }
  return children;
}

std::vector<Node> Node::ChildElements(std::string_view tag) const {
  pugi::xml_node node = Require(*this);
  Document::Impl& impl = *document_->impl_;
  std::vector<Node> children;
  for (pugi::xml_node child : node.children()) {
    if (child.type() == pugi::node_element && child != impl.holder &&
        TerminatedEquals(child.name(), tag)) {
      children.push_back(impl.Wrap(child));
    }
  }
  return children;
}

size_t Node::CountChildElements(std::string_view tag, size_t limit) const {
  pugi::xml_node node = Require(*this);
  pugi::xml_node holder = document_->impl_->holder;
  size_t count = 0;
  for (pugi::xml_node child : node.children()) {
    if (count == limit) break;
    if (child.type() == pugi::node_element && child != holder &&
        TerminatedEquals(child.name(), tag))
      ++count;
  }
  return count;
}

Node Node::AppendChild(Node child) {
  pugi::xml_node node = Require(*this);
  Require(child);
  Document::Impl& impl = *document_->impl_;
  return impl.Wrap(impl.Place(node, child, pugi::xml_node(), pugi::xml_node()));
}

Node Node::AppendElement(
    std::string_view tag,
    std::initializer_list<std::pair<std::string_view, std::string_view>> attributes) {
  pugi::xml_node node = Require(*this);
  if (node.type() != pugi::node_element) Fail(kInvalidArgument, "Only elements take new elements");
  Document::Impl& impl = *document_->impl_;
  return impl.Wrap(impl.AppendElement(node, tag, attributes));
}

Node Node::InsertBefore(Node child, Node reference) {
  if (reference.IsNull()) return AppendChild(child);
  pugi::xml_node node = Require(*this);
  Require(child);
  pugi::xml_node before = RequireChild(*this, reference);
  if (child == reference) return child;
  Document::Impl& impl = *document_->impl_;
  return impl.Wrap(impl.Place(node, child, before, pugi::xml_node()));
}

Node Node::ReplaceChild(Node newChild, Node oldChild) {
  pugi::xml_node node = Require(*this);
  Require(newChild);
  pugi::xml_node old = RequireChild(*this, oldChild);
  if (newChild == oldChild) return newChild;
  Document::Impl& impl = *document_->impl_;
  return impl.Wrap(impl.Place(node, newChild, old, old));
}

void Node::RemoveChild(Node child) {
  Require(*this);
  pugi::xml_node node = RequireChild(*this, child);
  document_->impl_->Destroy(node);
}

Node Node::CloneNode(bool deep) const {
  pugi::xml_node node = Require(*this);
  if (node.type() == pugi::node_document) Fail(kInvalidArgument, "A document cannot be cloned");
  Document::Impl& impl = *document_->impl_;
  pugi::xml_node holder = impl.Holder();
  pugi::xml_node copy;
  if (deep || node.type() != pugi::node_element) {
    copy = holder.append_copy(node);
  } else if ((copy = holder.append_child(node.name()))) {
    for (pugi::xml_attribute attr : node.attributes()) {
      if (!copy.append_copy(attr)) FailOutOfMemory();
    }
  }
  if (!copy) FailOutOfMemory();
  return impl.Wrap(copy);
}

std::string Node::Text() const {
  pugi::xml_node node = Require(*this);
  if (node.type() != pugi::node_element && node.type() != pugi::node_document) {
    return node.value();
  }
  pugi::xml_node holder = document_->impl_->holder;
  std::string text;
  // The holder is the document's last child, so meeting it ends the tree.
  for (pugi::xml_node at = NextInSubtree(node, node); at && at != holder;
       at = NextInSubtree(at, node)) {
    if (at.type() == pugi::node_pcdata || at.type() == pugi::node_cdata) text += at.value();
  }
  return text;
}

void Node::SetText(std::string_view text) {
  pugi::xml_node node = Require(*this);
  CheckValue(node.type(), text);
  Document::Impl& impl = *document_->impl_;
  if (node.type() == pugi::node_document) {
    Fail(kInvalidArgument, "Text cannot stand outside the document element");
  }
  if (node.type() == pugi::node_element) {
    impl.index.ChildrenDestroying(node);
    node.remove_children();
    // An empty text leaves no text node behind, so the element writes as <tag/>.
    if (!text.empty() &&
        !node.append_child(pugi::node_pcdata).set_value(text.data(), text.size())) {
      FailOutOfMemory();
    }
  } else if (!node.set_value(text.data(), text.size())) {
    FailOutOfMemory();
  }
  impl.TreeChanged();
}

void Node::WriteXml(const std::function<void(std::string_view)>& out) const {
  pugi::xml_node node = Require(*this);
  PieceWriter writer(out);
  Print(node, document_->impl_->holder, writer);
}

std::string Node::Xml() const {
  pugi::xml_node node = Require(*this);
  pugi::xml_node holder = document_->impl_->holder;
  TextBuilder out;
  Print(node, holder, out);
  return out.Take();
}

}  // namespace trl::xml
