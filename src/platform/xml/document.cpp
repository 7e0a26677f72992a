#include <fmt/format.h>

#include <algorithm>
#include <atomic>

#include "platform/failure.h"
#include "platform/text.h"
#include "platform/xml/document_impl.h"
#include "platform/xml/file_text.h"
#include "platform/xml/load_check.h"
#include "platform/xml/name.h"

namespace trl::xml {
namespace {

// The parser's defaults keep no comments, no processing instructions and no declaration, and drop
// text between elements that is only white space.
constexpr unsigned kParseOptions = pugi::parse_default | pugi::parse_comments | pugi::parse_pi;

std::atomic<uint64_t> lastSerial{0};

}  // namespace

pugi::xml_node Require(const Node& node) {
  if (node.IsNull()) Fail(kObjectNotSet);
  return ToPugi(node);
}

void CheckName(std::string_view name) {
  if (!IsXmlName(name)) Fail(kInvalidArgument, fmt::format("\"{}\" is not a valid XML name", name));
}

void CheckText(std::string_view text) {
  if (!IsXmlSafe(text)) {  // which also refuses what is not UTF-8
    Fail(kInvalidArgument, "The text is not UTF-8 that an XML document can carry");
  }
}

void FailOutOfMemory() { Fail(kOutOfMemory); }

Document::Impl::Impl(Document& owner) : owner(owner), serial(++lastSerial) {}

void Document::Impl::Reset(ParseError error) {
  index.Clear();
  holder = pugi::xml_node();
  pool = pugi::xml_node();
  tagPrototypes.clear();
  attributePrototypes.clear();
  recentPrototypes = {};
  doc.reset();
  descendants.Reset(0);
  parseError = std::move(error);
  Changed();
}

bool Document::Impl::Load(std::string_view text, const Limits& limits) {
  Reset(ParseError{});
  if (text.size() > limits.bytes) {
    Reset(TooLarge(limits.bytes));
    return false;
  }
  TextCheck check = CheckDocumentText(text, limits);
  if (check.overLimit) {
    ParseError error = ErrorAt(text, check.fault->offset, check.fault->reason);
    error.limit = check.fault->limit;
    Reset(std::move(error));
    return false;
  }
  pugi::xml_parse_result result =
      doc.load_buffer(text.data(), text.size(), kParseOptions, pugi::encoding_utf8);
  // Of a fault of the parser's and one of the check's, the first in the text is told.
  if (!result && (!check.fault || static_cast<size_t>(result.offset) < check.fault->offset)) {
    Reset(ErrorAt(text, static_cast<size_t>(result.offset), result.description()));
    return false;
  }
  if (check.fault) {
    Reset(ErrorAt(text, check.fault->offset, check.fault->reason));
    return false;
  }
  // The parser takes several top-level elements; XML has one root only.
  pugi::xml_node second =
      doc.document_element() ? doc.document_element().next_sibling() : pugi::xml_node();
  while (second && second.type() != pugi::node_element) second = second.next_sibling();
  if (second) {
    Reset(ErrorAt(text, static_cast<size_t>(std::max<ptrdiff_t>(second.offset_debug(), 0)),
                  "a second root element"));
    return false;
  }
  descendants.Reset(check.elements);
  return true;
}

pugi::xml_node Document::Impl::Holder() {
  if (!holder) {
    // Not a valid XML name, so no selection by name and no find by tag can meet it.
    holder = doc.append_child("#detached");
    if (!holder) FailOutOfMemory();
  }
  return holder;
}

pugi::xml_node Document::Impl::NamePool() {
  if (!pool) {
    pool = Holder().prepend_child(pugi::node_element);
    if (!pool) FailOutOfMemory();
  }
  return pool;
}

pugi::xml_node Document::Impl::Prototype(std::string_view name, bool attribute) {
  // The first letter counts too: names that differ only there ("f_bitmask", "p_bitmask") are
  // set in turn over a whole document.
  size_t ends = name.empty() ? 0 : static_cast<size_t>(name.front()) * 31 + name.back();
  size_t slot = (name.size() * 7 + ends + (attribute ? 1 : 0)) % recentPrototypes.size();
  RecentPrototype& recent = recentPrototypes[slot];
  if (recent.prototype && recent.attribute == attribute && recent.name == name) {
    return recent.prototype;
  }
  pugi::xml_node prototype = FindOrAddPrototype(name, attribute);
  recent = {std::string(name), attribute, prototype};
  return prototype;
}

pugi::xml_node Document::Impl::FindOrAddPrototype(std::string_view name, bool attribute) {
  auto& prototypes = attribute ? attributePrototypes : tagPrototypes;
  auto found = prototypes.find(name);
  if (found != prototypes.end()) return found->second;
  CheckName(name);
  std::string key(name);
  // `name` is a checked XML name, so the text parses; the element is the last one appended.
  std::string text = attribute ? "<n " + key + "=\"\"/>" : "<" + key + "/>";
  pugi::xml_node pool = NamePool();
  if (!pool.append_buffer(text.data(), text.size(), pugi::parse_minimal)) FailOutOfMemory();
  return prototypes.emplace(std::move(key), pool.last_child()).first->second;
}

pugi::xml_node Document::Impl::NewElement(std::string_view tag) {
  pugi::xml_node element = Holder().append_copy(Prototype(tag, false));
  if (!element) FailOutOfMemory();
  return element;
}

pugi::xml_attribute Document::Impl::NewAttribute(pugi::xml_node element, std::string_view name) {
  return element.append_copy(Prototype(name, true).first_attribute());
}

pugi::xml_node Document::Impl::FragmentOf(pugi::xml_node node) const {
  for (pugi::xml_node at = node; at; at = at.parent()) {
    if (at == holder) return holder;
    if (at.parent() == holder) return at;
  }
  return doc;
}

void Document::Impl::CheckPlacement(pugi::xml_node parent, pugi::xml_node child,
                                    pugi::xml_node replacing) const {
  if (parent.type() != pugi::node_element && parent.type() != pugi::node_document) {
    Fail(kInvalidArgument, "Only elements and documents have child nodes");
  }
  if (child.type() == pugi::node_document) {
    Fail(kInvalidArgument, "A document cannot be placed in another node");
  }
  if (parent.type() == pugi::node_document) {
    if (child.type() == pugi::node_pcdata || child.type() == pugi::node_cdata) {
      Fail(kInvalidArgument, "Text cannot stand outside the document element");
    }
    if (child.type() == pugi::node_element) {
      for (pugi::xml_node other : doc.children()) {
        if (other.type() == pugi::node_element && other != holder && other != child &&
            other != replacing) {
          Fail(kInvalidArgument, "The document has a document element already");
        }
      }
    }
  }
}

pugi::xml_node Document::Impl::Place(pugi::xml_node parent, const Node& child,
                                     pugi::xml_node before, pugi::xml_node replacing) {
  Impl& source = *child.OwnerDocument().impl_;
  pugi::xml_node node = ToPugi(child);
  CheckPlacement(parent, node, replacing);
  if (!before && parent == doc && holder) before = holder;
  pugi::xml_node placed;
  if (&source == this) {
    pugi::xml_node from = node.parent();
    // Checked above but for one case, which pugixml refuses before it changes anything.
    placed = before ? parent.insert_move_before(node, before) : parent.append_move(node);
    if (!placed) Fail(kInvalidArgument, "A node cannot be placed under itself or its descendant");
    // The holder never has an index: nothing outside this layer can name it.
    if (from != holder) index.ChildLeaving(from, node);
  } else {
    placed = before ? parent.insert_copy_before(node, before) : parent.append_copy(node);
    if (!placed) FailOutOfMemory();
    source.Destroy(node);
  }
  if (replacing) {
    index.ChildLeaving(parent, replacing);
    index.SubtreeDestroying(replacing);
    parent.remove_child(replacing);
  }
  index.ChildArrived(parent, placed);
  TreeChanged();
  return placed;
}

pugi::xml_node Document::Impl::AppendElement(
    pugi::xml_node parent, std::string_view tag,
    std::initializer_list<std::pair<std::string_view, std::string_view>> attributes) {
  for (auto at = attributes.begin(); at != attributes.end(); ++at) {
    CheckText(at->second);
    if (std::any_of(attributes.begin(), at,
                    [&](const auto& other) { return other.first == at->first; })) {
      Fail(kInvalidArgument, fmt::format("The attribute \"{}\" is given twice", at->first));
    }
  }
  // Straight into place: the element is complete before anything can see it, so it needs neither
  // the detached elements' holder nor index updates per attribute.
  pugi::xml_node element = parent.append_copy(Prototype(tag, false));
  if (!element) FailOutOfMemory();
  try {
    for (const auto& [name, value] : attributes) {
      pugi::xml_attribute attr = NewAttribute(element, name);
      if (!attr || !attr.set_value(value.data(), value.size())) FailOutOfMemory();
    }
  } catch (...) {
    parent.remove_child(element);  // as if nothing had been tried
    throw;
  }
  index.ChildArrived(parent, element);
  TreeChanged();
  return element;
}

void Document::Impl::Destroy(pugi::xml_node node) {
  pugi::xml_node parent = node.parent();
  index.ChildLeaving(parent, node);
  index.SubtreeDestroying(node);
  parent.remove_child(node);
  TreeChanged();
}

Document::Document() : impl_(std::make_unique<Impl>(*this)) {}

Document::~Document() = default;

bool Document::LoadXml(std::string_view text, const Limits& limits) {
  return impl_->Load(text, limits);
}

bool Document::Load(const std::string& path, const Limits& limits) {
  FileText file = ReadXmlFile(path, limits.bytes);
  if (file.error) {
    impl_->Reset(std::move(*file.error));
    return false;
  }
  return impl_->Load(file.text, limits);
}

const ParseError& Document::LastParseError() const { return impl_->parseError; }

std::string Document::Xml() const { return impl_->Wrap(impl_->doc).Xml(); }

void Document::WriteXml(const std::function<void(std::string_view)>& out) const {
  impl_->Wrap(impl_->doc).WriteXml(out);
}

Node Document::AsNode() { return impl_->Wrap(impl_->doc); }

Node Document::DocumentElement() {
  for (pugi::xml_node child : impl_->doc.children()) {
    if (child.type() == pugi::node_element && child != impl_->holder) return impl_->Wrap(child);
  }
  return Node();
}

Node Document::SetDocumentElement(Node element) {
  pugi::xml_node node = Require(element);
  if (node.type() != pugi::node_element) {
    Fail(kInvalidArgument, "Only an element can be the document element");
  }
  pugi::xml_node current = ToPugi(DocumentElement());
  if (current == node) return element;
  return impl_->Wrap(impl_->Place(impl_->doc, element, current, current));
}

Node Document::CreateElement(std::string_view tag) { return impl_->Wrap(impl_->NewElement(tag)); }

Node Document::FindChild(Node parent, std::string_view tag, std::string_view attr,
                         std::string_view value) {
  pugi::xml_node node = Require(parent);
  Document& owner = parent.OwnerDocument();
  if (&owner != this) return owner.FindChild(parent, tag, attr, value);
  return impl_->Wrap(impl_->index.Find(node, tag, attr, value));
}

uint64_t Document::ModificationCount() const { return impl_->modifications; }

uint64_t Document::Serial() const { return impl_->serial; }

}  // namespace trl::xml
