#include "frame/highest_id.h"

#include <algorithm>
#include <optional>

#include "platform/convert.h"
#include "platform/failure.h"

namespace trl {

int32_t HighestId(const OnError& on, xml::Node root, std::string_view tag) {
  std::optional<int32_t> highest;
  for (const xml::Node& element : root.GetElementsByTagName(tag)) {
    on([&] {
      auto attributes = element.Attributes();
      if (attributes.empty()) Fail(kObjectNotSet);
      int32_t id = ToInt32(attributes.front().second);
      highest = highest ? std::max(*highest, id) : id;
    });
  }
  return highest.value_or(0);
}

}  // namespace trl
