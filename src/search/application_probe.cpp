#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/fs/file_system.h"
#include "platform/text.h"
#include "schema/schema.h"
#include "search/search_names.h"
#include "trl/search.h"

namespace trl {

using search::kClass;
using search::kRunLabel;

const std::vector<xml::Node>& Search::FingerprintApplications(const std::string& id) {
  static const std::vector<xml::Node> kNone;
  if (!applicationsById_) {
    // One pass over the fingerprint instead of a selection per probed application.
    applicationsById_ = std::make_unique<std::unordered_map<std::string, std::vector<xml::Node>>>();
    xml::Node root = Use(objFingerprintDOM).DocumentElement();
    if (!root) return kNone;
    for (const xml::Node& application : root.SelectNodes("./a")) {
      auto ownId = application.GetAttribute(vocab::a_id);
      auto parentId = application.GetAttribute(vocab::a_parent);
      if (ownId) (*applicationsById_)[*ownId].push_back(application);
      if (parentId && parentId != ownId) (*applicationsById_)[*parentId].push_back(application);
    }
  }
  auto found = applicationsById_->find(id);
  return found == applicationsById_->end() ? kNone : found->second;
}

bool Search::ProbeApplication(xml::Node application) {
  OnError on{kClass, kRunLabel};
  Reading& r = read_;
  bool selected = false;
  on([&] {
    selected = Use(objSchema).IsApplicationSelected(application, Use(objApplicationOptionsDOM));
  });
  if (!selected) return true;

  on([&] { r.aId = TextOf(application, vocab::a_id); });
  const std::vector<xml::Node>* applications = nullptr;
  if (!on([&] { applications = &FingerprintApplications(r.aId); })) return true;
  if (applications->empty()) {
    on([&] { r.aName = TextOf(application, vocab::a_name); });
    on([&] {
      ReportWarning(kErrNotSupported, "'" + r.aName + "' is not currently supported", kClass,
                    kRunLabel);
    });
    return true;
  }

  for (const xml::Node& fingerprintApplication : *applications) {
    std::vector<xml::Node> files;
    on([&] { files = fingerprintApplication.SelectNodes(".//f"); });
    for (const xml::Node& f : files) {
      on([&] { r.fName = LowerCase(TextOf(f, vocab::f_name)); });
      on([&] { r.fRelpath = TextOf(f, vocab::f_relpath); });
      std::string probeFolder = r.folder;
      if (!r.fRelpath.empty()) {
        // Only a relative path says whether it is whole; authored files often carry no flag.
        on([&] { r.fFullpath = TextOf(f, vocab::f_fullpath); });
        std::string relpath = r.fRelpath;
        if (!relpath.ends_with('\\')) relpath += '\\';
        if (r.fFullpath == "True") {
          probeFolder = relpath;
        } else if (relpath.starts_with('\\')) {
          probeFolder += relpath.substr(1);
        } else {
          probeFolder += relpath;
        }
      }
      probeFolder = LowerCase(probeFolder);

      xml::Node folder;
      bool recorded = on([&] {
        Schema& schema = Use(objSchema);
        folder = schema.AddFolder(probeFolder, schema.EncodeName(probeFolder), r.drive,
                                  lngFolderCounter);
      });
      lngFolderCount = lngFolderCounter;
      std::string path = FullPath(probeFolder + r.fName);
      if (recorded) {
        on([&] {
          fs::FileSystem& fileSystem = Use(objFSO);
          if (fileSystem.FileExists(path)) AddFile(folder, *fileSystem.GetFile(path), 0);
        });
      }
      RaiseProgress(on, path);
      if (status_ == kStatusCancelled) return false;
    }
  }
  return true;
}

}  // namespace trl
