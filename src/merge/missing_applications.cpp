#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "merge/merge_names.h"
#include "merge/place_index.h"
#include "platform/convert.h"
#include "schema/schema.h"
#include "trl/merge.h"

namespace trl {

bool Merge::MissingApplicationsRefresh() {
  OnError on{merge::kClass, merge::kRefreshLabel};
  std::vector<xml::Node> managed;
  on([&] {
    managed = Use(objSearchOptionsDOM).DocumentElement().SelectNodes("//a[@a_manage='1']");
  });
  if (managed.empty()) return true;
  on([&] { newPlaces_ = std::make_unique<merge::PlaceIndex>(Use(objNewResultsDOM)); });
  // A sequence keeps the old results' places from run to run, in step with their changes.
  if (!oldPlaces_) {
    on([&] { oldPlaces_ = std::make_unique<merge::PlaceIndex>(Use(objOldResultsDOM)); });
  }

  // A value that cannot be read keeps what the application before gave.
  int32_t id = 0;
  xml::Node folder, drive, computer;
  std::string folderName, driveName, computerName;
  for (xml::Node a : managed) {
    bool selected = false;
    on([&] { selected = Use(objSchema).IsApplicationSelected(a, *objApplicationOptionsDOM); });
    if (!selected) continue;
    on([&] { id = ToInt32(TextViewOf(a, vocab::a_id)); });
    on([&] { folder = a.ParentNode(); });
    on([&] { drive = folder.ParentNode(); });
    on([&] { computer = drive.ParentNode(); });
    on([&] { folderName = TextOf(folder, vocab::d_name); });
    on([&] { driveName = TextOf(drive, vocab::m_name); });
    on([&] { computerName = TextOf(computer, vocab::c_name); });

    std::string idText = std::to_string(id);
    xml::Node found;
    on([&] { found = Use(newPlaces_).Find(computerName, driveName, folderName, idText); });
    if (found) continue;  // found again at its place
    xml::Node old;
    on([&] { old = Use(oldPlaces_).Find(computerName, driveName, folderName, idText); });
    if (old) MissingApplication(old);
  }
  // The merge moves applications around: the places are only good for this check, unless a
  // sequence keeps them in step.
  newPlaces_.reset();
  if (!sequence_) oldPlaces_.reset();
  return true;
}

bool Merge::MissingApplicationsSearch() { return true; }

xml::Node Merge::MissingList() {
  xml::Node root = Use(objOldResultsDOM).DocumentElement();
  // The list is only ever appended to the root, so once found it stays the first one there.
  if (missingList_ && missingList_.ParentNode() == root) return missingList_;
  std::vector<xml::Node> lists = root.ChildElements(vocab::a_missing_list);
  missingList_ = lists.empty()
                     ? root.AppendChild(objOldResultsDOM->CreateElement(vocab::a_missing_list))
                     : lists.front();
  return missingList_;
}

bool Merge::MissingApplication(xml::Node& application) {
  OnError on{merge::kClass, merge::kMissingLabel};
  bool selected = false;
  on([&] {
    selected = Use(objSchema).IsApplicationSelected(application, *objApplicationOptionsDOM);
  });
  if (!selected) return false;

  xml::Node list;
  on([&] { list = MissingList(); });
  std::string name;
  on([&] { name = TextOf(application, vocab::a_name); });
  on([&] { application.SetAttribute(vocab::a_manage, "0"); });
  on([&] { application.SetAttribute(vocab::a_missing, "1"); });
  on([&] { list.AppendChild(application.CloneNode(false)); });

  RemoveFromTree(on, application);
  on([&] { e_match_missing = CheckedAdd(e_match_missing, 1); });

  Progress(on, [&](xml::Node e) {
    e.SetAttribute(vocab::a_name, name);
    AddStatusCounters(e);
  });
  return true;
}

void Merge::RemoveFromTree(const OnError& on, xml::Node application) {
  xml::Node folder, drive, computer, root;
  on([&] { folder = application.ParentNode(); });
  on([&] { drive = folder.ParentNode(); });
  on([&] { computer = drive.ParentNode(); });
  on([&] { root = objOldResultsDOM->DocumentElement(); });

  // Each level that the removal leaves empty goes too, the highest first; each removal is a step
  // of its own, so one that fails (a computer that is not the root's child) leaves the rest to run.
  bool folderEmpties = false, driveEmpties = false, computerGoes = false;
  on([&] { folderEmpties = folder.CountChildElements(vocab::a, 2) == 1; });
  if (folderEmpties) on([&] { driveEmpties = drive.CountChildElements(vocab::d, 2) == 1; });
  if (driveEmpties) {
    on([&] {
      computerGoes =
          computer.CountChildElements(vocab::m, 2) == 1 && Use(oldPlaces_).Computers() == 1;
    });
  }
  bool out = false;  // once a level has gone, what it held went with it
  auto takeOut = [&](xml::Node parent, xml::Node child) {
    out = on([&] {
      if (child.ParentNode() == parent) NoteRemoving(child);
      parent.RemoveChild(child);
    });
  };
  if (computerGoes) takeOut(root, computer);
  if (driveEmpties && !out) takeOut(computer, drive);
  if (folderEmpties && !out) takeOut(drive, folder);
  if (!out) takeOut(folder, application);
}

}  // namespace trl
