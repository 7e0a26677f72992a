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
  // A value that cannot be read stays what the version before gave.
  int32_t most = 0, reached = 0;
  std::string id;
  for (xml::Node& v : versions) {
    on([&] { most = Int32Of(v, vocab::v_max); });
    on([&] { reached = Int32Of(v, vocab::v_act); });
    if (most == reached) continue;
    on([&] { id = TextOf(v, vocab::v_id); });
    // A version relabelled before has lost its own v_id: its v_guess still holds it.
    if (id != kUnidentified) on([&] { v.SetAttribute(vocab::v_guess, id); });
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
  // Found files that differ from the version's files, either way; a value that cannot be read
  // stays what the version before gave.
  int32_t files = 0, found = 0;
  for (const xml::Node& v : versions) {
    on([&] { files = FileCountOf(v); });
    on([&] { found = Int32Of(v, vocab::f_act); });
    if (files != found) on([&] { a.SetAttribute(vocab::a_manage, kUnmanaged); });
  }
  return count;
}

}  // namespace trl::filter
