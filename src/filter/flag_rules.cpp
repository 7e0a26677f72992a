#include <string>
#include <vector>

#include "filter/filter_names.h"
#include "filter/filter_rules.h"
#include "filter/version_values.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/vocabulary.h"
#include "platform/convert.h"

namespace trl::filter {

int16_t FlagAsUnknown(xml::Node a) {
  OnError on{kClass, kFlagAsUnknownLabel};
  int16_t count = 0;
  on([&] { count = CountVersions(a); });
  std::vector<xml::Node> versions;
  on([&] { versions = a.ChildElements(vocab::v); });
  for (xml::Node& v : versions) {
    bool partly = false;
    on([&] { partly = PartlyMatched(v); });
    if (!partly) continue;
    on([&] {
      // A version relabelled before has lost its own v_id: its v_guess still holds it.
      std::string id = TextOf(v, vocab::v_id);
      if (id != kUnidentified) v.SetAttribute(vocab::v_guess, id);
    });
    Relabel(on, v, kUnsupportedVersion);
  }
  return count;
}

int16_t FlagAsUnmanaged(xml::Node a) {
  OnError on{kClass, kFlagAsUnmanagedLabel};
  int16_t count = 0;
  on([&] { count = CountVersions(a); });
  std::vector<xml::Node> versions;
  on([&] { versions = a.ChildElements(vocab::v); });
  for (const xml::Node& v : versions) {
    bool lacking = false;  // found files that differ from the version's files, either way
    on([&] { lacking = FileCountOf(v) != ToInt32(TextOf(v, vocab::f_act)); });
    if (lacking) on([&] { a.SetAttribute(vocab::a_manage, kUnmanaged); });
  }
  return count;
}

}  // namespace trl::filter
