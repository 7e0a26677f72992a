// The local-files side of a match: the index of the files a search recorded, and the test of
// whether a local folder fits where a fingerprint file expects to lie.
#include "compare/local_files.h"

#include <new>

#include "compare/compare_names.h"
#include "compare/drive_walk.h"
#include "compare/folder_fit.h"
#include "compare/local_file_index.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/every_element.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/convert.h"
#include "platform/text.h"
#include "schema/schema.h"
#include "trl/compare.h"

namespace trl {

using compare::kClass;

namespace {

// Fills the index, each step run through `on`, which reports a failure or passes it on.
template <class Steps>
void Fill(xml::Document& localFiles, LocalFileIndex* index, const Steps& on) {
  // A value that cannot be read keeps what the element before gave.
  std::string folder, exactFolder, encodedFolder, filename, encodedFilename;
  WalkDrives(localFiles, index, on, [&](const xml::Node& m) {
    for (const xml::Node& d : m.ChildElements(vocab::d)) {
      on([&] {
        exactFolder = TextOf(d, vocab::d_text);
        folder = LowerCase(exactFolder);
      });
      on([&] { encodedFolder = TextOf(d, vocab::d_name); });
      on([&] {
        Use(index).AddFolder(folder, exactFolder, Schema::ExactFrom(encodedFolder, exactFolder));
      });
      for (const xml::Node& f : d.ChildElements(vocab::f)) {
        on([&] { filename = TextOf(f, vocab::f_text); });
        on([&] { encodedFilename = TextOf(f, vocab::f_name); });
        on([&] { Use(index).AddFile(filename, encodedFilename); });
      }
    }
  });
}

}  // namespace

void FillLocalFileIndex(xml::Document& localFiles, LocalFileIndex* index) {
  Fill(localFiles, index, OnError{kClass, compare::kFillRecordsetLabel});
}

bool TryFillLocalFileIndex(xml::Document& localFiles, LocalFileIndex& index) {
  try {
    Fill(localFiles, &index, [](auto&& step) {
      step();
      return true;
    });
  } catch (...) {
    return false;
  }
  return true;
}

void RefillLocalFileIndex(xml::Document& localFiles, LocalFileIndex& index) {
  Fill(localFiles, &index, [](auto&& step) {
    try {
      step();
    } catch (...) {
      return false;
    }
    return true;
  });
}

void Compare::KeepOnlyAskedNames(LocalFileIndex& index, size_t files) const {
  std::vector<std::string> keys{""};  // what a version whose first name cannot be read asks for
  try {
    std::vector<xml::Node> named = EveryElement(*objFingerprintDOM, vocab::f);
    // Worth it only where most local files have names no fingerprint file has.
    if (files < 4 * named.size()) return;
    for (const xml::Node& f : named) {
      if (auto name = f.GetAttribute(vocab::f_name)) {
        keys.push_back(objSchema->EncodeName(LowerCase(*name)));
      }
    }
  } catch (...) {
    return;  // every file, as without a filter
  }
  index.KeepOnly(keys);
}

void Compare::IndexEveryFile() {
  StopReadAhead();  // its plans hold records of the index replaced
  auto index = std::make_unique<LocalFileIndex>();
  RefillLocalFileIndex(*objLocalFilesDOM, *index);
  rsLocalFiles = std::move(index);
}

void Compare::FillRecordset(size_t files) {
  if (indexBuiltEarly_) return;
  OnError on{kClass, compare::kFillRecordsetLabel};
  rsLocalFiles.reset();
  on([&] {
    try {
      rsLocalFiles = std::make_unique<LocalFileIndex>();
      if (objSchema) KeepOnlyAskedNames(*rsLocalFiles, files);
      rsLocalFiles->Reserve(files);
    } catch (const std::bad_alloc&) {
      Raise(kErrUnableToCreate, "Unable to create an instance of ADODB.Recordset", kClass,
            compare::kFillRecordsetLabel);
    }
  });
  on([&] { FillLocalFileIndex(Use(objLocalFilesDOM), rsLocalFiles.get()); });
}

std::string Compare::FindCommonPath(const xml::Node& f, std::string folder) {
  return FolderFit(f).AppFolder(folder);
}

}  // namespace trl
