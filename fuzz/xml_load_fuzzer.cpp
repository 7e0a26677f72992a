// The document layer on any text: a load either fails cleanly or gives a document whose text
// loads again to the same text, whose lookups by key agree with a scan of the children, and whose
// root can be carried into another document unchanged.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz_input.h"
#include "platform/failure.h"
#include "trl/xml.h"

namespace {

using trl::fuzz::Require;
using trl::xml::Document;
using trl::xml::Node;
using trl::xml::NodeType;

// Lookups by key are checked on this many elements at most, to keep an input's run short.
constexpr size_t kMostKeyedElements = 64;

// The first child element of `parent` with this tag whose attribute `name` reads `value`.
Node ScanChildren(const Node& parent, const std::string& tag, const std::string& name,
                  const std::string& value) {
  for (const Node& child : parent.ChildElements(tag)) {
    if (child.GetAttribute(name) == value) return child;
  }
  return Node();
}

// Whether FindChild answers as a scan of the children does.
void RequireScanAnswer(Document& document, const Node& parent, const std::string& tag,
                       const std::string& name, const std::string& value, std::string_view what) {
  Require(document.FindChild(parent, tag, name, value) == ScanChildren(parent, tag, name, value),
          what);
}

// For elements with attributes: the index behind FindChild answers as a scan does, and still
// does after an element's key was rewritten and after the element was removed. Elements are
// changed last to first, so that each is still there when its turn comes.
void CheckKeyedLookups(Document& document) {
  std::vector<Node> elements = document.AsNode().GetElementsByTagName("*");
  elements.resize(std::min(elements.size(), kMostKeyedElements));
  for (const Node& element : elements) {
    Node parent = element.ParentNode();
    if (parent.Type() != NodeType::kElement) continue;
    std::string tag = element.NodeName();
    for (const auto& [name, value] : element.Attributes()) {
      RequireScanAnswer(document, parent, tag, name, value, "FindChild differs from a scan");
      // A name given twice keys the element by its first value only.
      if (element.GetAttribute(name) == value) {
        Require(!document.FindChild(parent, tag, name, value).IsNull(),
                "FindChild missed an element that is there");
      }
    }
  }
  for (auto element = elements.rbegin(); element != elements.rend(); ++element) {
    Node parent = element->ParentNode();
    if (parent.Type() != NodeType::kElement || element->Attributes().empty()) continue;
    auto [name, value] = element->Attributes().front();
    std::string tag = element->NodeName();
    std::string changed = value + "~";
    try {
      element->SetAttribute(name, changed);
    } catch (const trl::Failure&) {
      changed = value;  // text loaded that the layer would not write: the key stays
    }
    RequireScanAnswer(document, parent, tag, name, value, "FindChild differs after a key change");
    RequireScanAnswer(document, parent, tag, name, changed, "FindChild misses a changed key");
    parent.RemoveChild(*element);
    RequireScanAnswer(document, parent, tag, name, changed, "FindChild differs after a removal");
  }
}

// Elements straight under the document node: the loader takes more than one.
size_t TopElements(Document& document) {
  auto children = document.AsNode().ChildNodes();
  return std::count_if(children.begin(), children.end(),
                       [](const Node& child) { return child.Type() == NodeType::kElement; });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view text(reinterpret_cast<const char*>(data), size);
  Document document;
  if (!document.LoadXml(text)) {
    const trl::xml::ParseError& error = document.LastParseError();
    Require(!error.ok && error.line >= 1 && error.column >= 1, "a failed load tells no place");
    Require(document.Xml().empty() && document.DocumentElement().IsNull(),
            "a failed load left content");
    return 0;
  }
  std::string written = document.Xml();
  Document again;
  Require(again.LoadXml(written), "the text the layer wrote does not load");
  Require(again.Xml() == written, "a second load and write changed the text");

  Node root = document.DocumentElement();
  if (root.IsNull()) return 0;
  std::string rootText = root.Xml();
  size_t topElements = TopElements(document);
  Document other;
  Node carried = other.SetDocumentElement(root);
  Require(carried.Xml() == rootText && other.Xml() == rootText, "the carried root changed");
  Require(TopElements(document) + 1 == topElements, "the carried root stayed in its document");

  CheckKeyedLookups(again);
  return 0;
}
