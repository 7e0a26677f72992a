#pragma once

#include <string_view>

namespace trl::xml {

// Whether `name` is an XML 1.0 Name (valid UTF-8): the test element and attribute names pass
// before they reach the tree, since the parser behind it would write any name as given.
bool IsXmlName(std::string_view name);

}  // namespace trl::xml
