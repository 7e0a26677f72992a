#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/general.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "merge/merge_names.h"
#include "platform/clock.h"
#include "platform/convert.h"
#include "schema/schema.h"
#include "trl/merge.h"

namespace trl {
namespace {

// The first child element named `tag`, or no object.
xml::Node FirstChildElement(const xml::Node& parent, std::string_view tag) {
  std::vector<xml::Node> children = parent.ChildElements(tag);
  return children.empty() ? xml::Node() : children.front();
}

}  // namespace

void Merge::MergeApplication(xml::Node application, xml::Node oldFolder, const Defaults& defaults) {
  OnError on{merge::kClass, merge::kMergeLabel};
  xml::Node old;
  on([&] { old = Use(objSchema).AddApplication(application, oldFolder); });

  // The client's settings in the old results win; flags the new entry has are its own.
  on([&] {
    application.SetAttribute(vocab::a_manage,
                             FixNulls(old.GetAttribute(vocab::a_manage), std::string("1")));
  });
  on([&] {
    if (!application.GetAttribute(vocab::a_update_q)) {
      application.SetAttribute(vocab::a_update_q,
                               FixNulls(old.GetAttribute(vocab::a_update_q), defaults.update));
    }
  });
  on([&] {
    if (!application.GetAttribute(vocab::a_dupes_q)) {
      application.SetAttribute(vocab::a_dupes_q,
                               FixNulls(old.GetAttribute(vocab::a_dupes_q), defaults.dupes));
    }
  });

  int32_t newId = 0;
  int32_t oldId = 0;
  on([&] { newId = ToInt32(TextViewOf(application, vocab::v_id)); });
  on([&] { oldId = ToInt32(FixNulls(old.GetAttribute(vocab::v_id), std::string("0"))); });
  // No longer identified (old id 0 counts as identified: its versions were gone or unknown).
  if (newId == -1 && oldId != -1) on([&] { application.SetAttribute(vocab::a_update_q, "1"); });

  // The history travels with the application; a change of the identified version adds the
  // version it had, stamped with the time of the change. Both are taken from the old entry
  // before it is discarded, and join the new one where it then stands.
  xml::Node history;
  on([&] { history = FirstChildElement(old, vocab::v_history); });
  xml::Node carried;
  if (history) on([&] { carried = history.CloneNode(true); });
  xml::Node entry;
  if (newId != oldId && oldId != 0) {
    on([&] {
      if (!carried) carried = objOldResultsDOM->CreateElement(vocab::v_history);
    });
    xml::Node version;
    on([&] { version = FirstChildElement(old, vocab::v); });
    on([&] { version.SetAttribute(vocab::v_updated, FormatDateTime(Now())); });
    on([&] { version.SetAttribute(vocab::v_update_q, "1"); });
    on([&] { entry = version.CloneNode(false); });
  }

  xml::Node merged = application;
  bool placed = on([&] {
    if (sequence_) NoteRemoving(old);
    merged = oldFolder.ReplaceChild(application, old);
  });
  if (sequence_ && placed) on([&] { NoteAdded(merged); });
  if (entry) on([&] { carried.AppendChild(entry); });
  if (carried) on([&] { merged.AppendChild(carried); });
}

}  // namespace trl
