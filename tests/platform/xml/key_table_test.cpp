#include "platform/xml/key_table.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

namespace trl::xml {
namespace {

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
