#include "platform/xml/key_table.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

namespace trl::xml {
namespace {

// Inserts and erases keys in random order and checks every key after each step against the set
// of keys that should be present: erasing must never cut a probe run short.
TEST(KeyTableTest, FindsExactlyThePresentKeysThroughInsertsAndErases) {
  pugi::xml_document doc;
  std::vector<pugi::xml_node> elements;
  for (int i = 0; i < 300; ++i) {
    pugi::xml_node element = doc.append_child("f");
    element.append_attribute("k").set_value(("key" + std::to_string(i)).c_str());
    elements.push_back(element);
  }
  std::mt19937 random(7);
  KeyTable table("k");
  std::vector<bool> present(elements.size(), false);
  for (int step = 0; step < 3000; ++step) {
    size_t i = random() % elements.size();
    std::string_view key = elements[i].attribute("k").value();
    if (present[i]) {
      ASSERT_TRUE(table.Erase(key, elements[i].internal_object()));
    } else {
      ASSERT_TRUE(table.Insert(key, elements[i].internal_object()));
    }
    present[i] = !present[i];
    ASSERT_EQ(table.Size(), static_cast<size_t>(std::count(present.begin(), present.end(), true)));
    for (size_t j = 0; j < elements.size(); ++j) {
      auto* expected = present[j] ? elements[j].internal_object() : nullptr;
      ASSERT_EQ(table.Find(elements[j].attribute("k").value()), expected) << "step " << step;
    }
  }
}

TEST(KeyTableTest, KeepsTheFirstHolderOfAKey) {
  pugi::xml_document doc;
  pugi::xml_node first = doc.append_child("f");
  pugi::xml_node second = doc.append_child("f");
  first.append_attribute("k") = "same";
  second.append_attribute("k") = "same";
  KeyTable table("k");
  EXPECT_TRUE(table.Insert("same", first.internal_object()));
  EXPECT_FALSE(table.Insert("same", second.internal_object()));
  EXPECT_FALSE(table.Erase("same", second.internal_object()));
  EXPECT_EQ(table.Find("same"), first.internal_object());
  EXPECT_EQ(table.Find("other"), nullptr);
}

}  // namespace
}  // namespace trl::xml
