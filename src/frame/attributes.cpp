#include "frame/attributes.h"

#include "platform/failure.h"

namespace trl {

std::string TextOf(const xml::Node& node, std::string_view attribute) {
  auto value = node.GetAttribute(attribute);
  if (!value) Fail(kInvalidUseOfNull);
  return std::move(*value);
}

}  // namespace trl
