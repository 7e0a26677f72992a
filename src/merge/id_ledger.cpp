#include "merge/id_ledger.h"

#include "frame/vocabulary.h"
#include "platform/convert.h"
#include "platform/failure.h"

namespace trl::merge {
namespace {

constexpr std::array<std::string_view, 3> kLevels = {vocab::c, vocab::m, vocab::d};

// The id an element holds, or nothing when its first attribute is missing or not a number.
std::optional<int32_t> IdOf(const xml::Node& element) {
  auto attributes = element.Attributes();
  if (attributes.empty()) return std::nullopt;
  try {
    return ToInt32(attributes.front().second);
  } catch (const Failure&) {
    return std::nullopt;
  }
}

}  // namespace

IdLedger::IdLedger(const OnError& on, const xml::Node& root) {
  for (size_t level = 0; level < kLevels.size(); ++level) {
    for (const xml::Node& element : root.GetElementsByTagName(kLevels[level])) {
      on([&] {
        auto attributes = element.Attributes();
        if (attributes.empty()) Fail(kObjectNotSet);
        ++levels_[level][ToInt32(attributes.front().second)];
      });
    }
  }
}

IdLedger::Counts* IdLedger::LevelOf(std::string_view tag) {
  for (size_t level = 0; level < kLevels.size(); ++level) {
    if (kLevels[level] == tag) return &levels_[level];
  }
  return nullptr;
}

template <class Visit>
void IdLedger::ForEachIn(const xml::Node& node, Visit visit) {
  auto one = [&](const xml::Node& element) {
    Counts* counts = LevelOf(element.NodeName());
    if (!counts) return;
    if (auto id = IdOf(element)) visit(*counts, *id);
  };
  one(node);
  for (const xml::Node& element : node.GetElementsByTagName("*")) one(element);
}

void IdLedger::Added(const xml::Node& node) {
  ForEachIn(node, [](Counts& counts, int32_t id) { ++counts[id]; });
}

void IdLedger::Removing(const xml::Node& node) {
  ForEachIn(node, [](Counts& counts, int32_t id) {
    auto found = counts.find(id);
    if (found != counts.end() && --found->second == 0) counts.erase(found);
  });
}

int32_t IdLedger::Highest(std::string_view tag) const {
  for (size_t level = 0; level < kLevels.size(); ++level) {
    if (kLevels[level] == tag) return levels_[level].empty() ? 0 : levels_[level].rbegin()->first;
  }
  return 0;
}

}  // namespace trl::merge
