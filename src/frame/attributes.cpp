#include "frame/attributes.h"

#include "platform/failure.h"

namespace trl {

std::string TextOf(const xml::Node& node, std::string_view attribute) {
  auto value = node.GetAttribute(attribute);
  if (!value) Fail(kInvalidUseOfNull);
  return std::move(*value);
}

std::string_view TextViewOf(const xml::Node& node, std::string_view attribute) {
  auto value = node.GetAttributeView(attribute);
  if (!value) Fail(kInvalidUseOfNull);
  return *value;
}

}  // namespace trl
