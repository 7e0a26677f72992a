#include <fmt/format.h>

#include "platform/failure.h"
#include "platform/text.h"
#include "platform/xml/document_impl.h"
#include "platform/xml/tree_walk.h"

namespace trl::xml {
namespace {

// The nodes `xpath` selects from `context`, in document order, never the holder. While some nodes
// are detached, only those of the context's own fragment count: the tree for a node of the tree,
// the detached subtree for a detached node.
std::vector<Node> Select(Document::Impl& impl, pugi::xml_node context, std::string_view xpath) {
  std::string expression(xpath);
  pugi::xpath_node_set found;
  try {
    found = pugi::xpath_query(expression.c_str()).evaluate_node_set(context);
  } catch (const pugi::xpath_exception& e) {
    Fail(kInvalidArgument, fmt::format("{} in the selection \"{}\"", e.what(), xpath));
  }
  found.sort();
  bool filter = impl.HasDetached();
  pugi::xml_node fragment = filter ? impl.FragmentOf(context) : pugi::xml_node();
  std::vector<Node> nodes;
  nodes.reserve(found.size());
  for (const pugi::xpath_node& item : found) {
    if (item.attribute()) {
      Fail(kInvalidArgument, fmt::format("The selection \"{}\" yields attributes", xpath));
    }
    pugi::xml_node node = item.node();
    if (node != impl.holder && (!filter || impl.FragmentOf(node) == fragment)) {
      nodes.push_back(impl.Wrap(node));
    }
  }
  return nodes;
}

// Hands `found` each `tag` element below `node` in document order, by a walk of the subtree that
// the document's index of descendants takes note of.
template <class Found>
void ForEachElementBelow(Document::Impl& impl, pugi::xml_node node, std::string_view tag,
                         Found found) {
  size_t visited = 0;
  // The holder is the document's last child, so meeting it ends the tree.
  for (pugi::xml_node at = NextInSubtree(node, node); at && at != impl.holder;
       at = NextInSubtree(at, node)) {
    ++visited;
    if (at.type() == pugi::node_element && (tag == "*" || TerminatedEquals(at.name(), tag))) {
      found(at);
    }
  }
  impl.descendants.Walked(node, visited, impl.doc, impl.holder);
}

}  // namespace

std::vector<Node> Node::SelectNodes(std::string_view xpath) const {
  pugi::xml_node node = Require(*this);
  return Select(*document_->impl_, node, xpath);
}

Node Node::SelectSingleNode(std::string_view xpath) const {
  pugi::xml_node node = Require(*this);
  auto nodes = Select(*document_->impl_, node, xpath);
  return nodes.empty() ? Node() : nodes.front();
}

size_t Node::CountNodes(std::string_view xpath) const {
  pugi::xml_node node = Require(*this);
  return Select(*document_->impl_, node, xpath).size();
}

std::vector<Node> Node::GetElementsByTagName(std::string_view tag) const {
  pugi::xml_node node = Require(*this);
  Document::Impl& impl = *document_->impl_;
  std::vector<Node> found;
  if (auto below = impl.descendants.Below(node, tag)) {
    found.reserve(below->size());
    for (uint32_t position : *below) found.push_back(impl.Wrap(impl.descendants.At(position)));
    return found;
  }
  ForEachElementBelow(impl, node, tag, [&](pugi::xml_node at) { found.push_back(impl.Wrap(at)); });
  return found;
}

size_t Node::CountElementsByTagName(std::string_view tag) const {
  pugi::xml_node node = Require(*this);
  Document::Impl& impl = *document_->impl_;
  if (auto below = impl.descendants.Below(node, tag)) return below->size();
  size_t count = 0;
  ForEachElementBelow(impl, node, tag, [&](pugi::xml_node) { ++count; });
  return count;
}

Node Node::FirstElementByTagName(std::string_view tag,
                                 const std::function<bool(const Node&)>& accept) const {
  pugi::xml_node node = Require(*this);
  Document::Impl& impl = *document_->impl_;
  if (auto below = impl.descendants.Below(node, tag)) {
    for (uint32_t position : *below) {
      Node at = impl.Wrap(impl.descendants.At(position));
      if (accept(at)) return at;
    }
    return {};
  }
  for (pugi::xml_node at = NextInSubtree(node, node); at && at != impl.holder;
       at = NextInSubtree(at, node)) {
    if (at.type() != pugi::node_element || !(tag == "*" || TerminatedEquals(at.name(), tag))) {
      continue;
    }
    Node wrapped = impl.Wrap(at);
    if (accept(wrapped)) return wrapped;
  }
  return {};
}

}  // namespace trl::xml
