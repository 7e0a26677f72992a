#include <algorithm>
#include <array>
#include <utility>

#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/clock.h"
#include "platform/convert.h"
#include "platform/fs/file_system.h"
#include "platform/glob_match.h"
#include "platform/regexp.h"
#include "platform/text.h"
#include "schema/schema.h"
#include "search/search_names.h"
#include "trl/search.h"

namespace trl {

using search::kClass;

namespace {

// The attribute bits a mask can turn an item away for, in the order they are tested. Only these
// are read from the file system: an allowed bit can never fail the test.
constexpr std::array<uint16_t, 4> kTestedBits{fs::kArchive, fs::kReadOnly, fs::kHidden,
                                              fs::kSystem};

uint16_t BitsToRead(int16_t mask) {
  return static_cast<uint16_t>(fs::kAllAttributes & ~static_cast<uint16_t>(mask));
}

int16_t AttributeWord(uint16_t attributes) { return static_cast<int16_t>(attributes); }

// A listing that cannot be read counts as empty.
template <class List>
auto ListedOrNone(List list) -> decltype(&list()) {
  try {
    return &list();
  } catch (const std::exception&) {
    return nullptr;
  }
}

}  // namespace

bool Search::CheckAttributes(int16_t attributes, int16_t mask) {
  for (uint16_t bit : kTestedBits) {
    if ((attributes & bit) != 0 && (mask & bit) == 0) return false;
  }
  return true;
}

void Search::RaiseProgress(const OnError& on, const std::string& path) {
  Progress(on, [&](xml::Node e) {
    e.SetAttribute(vocab::e_d_name, path);
    e.SetAttribute(vocab::e_d_count, std::to_string(lngFolderCount));
    e.SetAttribute(vocab::e_f_count, std::to_string(lngFileCounter));
  });
}

void Search::FindFiles(const std::string& path, xml::Node parent, const std::string& relativePath,
                       bool recurse, int16_t folderMask, int16_t fileMask, int16_t properties) {
  OnError on{kClass, search::kFindFilesLabel};
  RaiseProgress(on, path);
  if (status_ == kStatusCancelled) return;

  bool isFile = false;
  if (!on([&] { isFile = Use(objFSO).FileExists(path); })) return;
  fs::FileSystem& fileSystem = *objFSO;
  if (isFile) {
    std::unique_ptr<fs::File> file;
    bool passes = false;
    if (!on([&] { file = fileSystem.GetFile(path); })) return;
    on([&] {
      passes = CheckAttributes(AttributeWord(file->Attributes(BitsToRead(fileMask))), fileMask);
    });
    if (!passes) return;
    xml::Node folder;
    if (!on([&] {
          Schema& schema = Use(objSchema);
          folder =
              schema.AddFolder(relativePath, EncodedFolder(relativePath), parent, lngFolderCounter);
        })) {
      return;
    }
    AddFile(folder, *file, properties);
    return;
  }

  bool isFolder = false;
  on([&] { isFolder = fileSystem.FolderExists(path); });
  if (!isFolder) {
    ReportWarning(kErrPathNotFound, "Path '" + path + "' could not be found", kClass,
                  search::kFindFilesLabel);
    return;
  }
  ReportSubject subject(path);
  std::unique_ptr<fs::Folder> folder;
  if (!on([&] { folder = fileSystem.GetFolder(path); })) return;
  bool searched = false;
  // The attribute test first: it is free for most folders, the root test costs a stat.
  on([&] {
    searched =
        CheckAttributes(AttributeWord(folder->Attributes(BitsToRead(folderMask))), folderMask) ||
        folder->IsRootFolder();
  });
  if (searched) {
    const auto* files = ListedOrNone([&]() -> const auto& { return folder->Files(); });
    if (files != nullptr && !files->empty()) {
      xml::Node record;
      // The record is made before any file is tested: a folder whose files all fail still shows.
      bool recorded = on([&] {
        Schema& schema = Use(objSchema);
        record =
            schema.AddFolder(relativePath, EncodedFolder(relativePath), parent, lngFolderCounter);
      });
      for (const auto& file : *files) {
        if (!recorded) break;
        bool passes = false;
        on([&] {
          passes = CheckAttributes(AttributeWord(file->Attributes(BitsToRead(fileMask))), fileMask);
        });
        if (passes) AddFile(record, *file, properties);
        YieldIfAsynchronous(on);
        if (status_ == kStatusCancelled) return;
      }
    }
    on([&] { lngFolderCount = CheckedAdd(lngFolderCount, 1); });
    if (read_.links) on([&] { NoteFolderLinks(*folder, relativePath); });
    if (recurse) {
      const auto* subFolders = ListedOrNone([&]() -> const auto& { return folder->SubFolders(); });
      if (subFolders != nullptr) {
        for (const auto& subFolder : *subFolders) {
          YieldIfAsynchronous(on);
          std::string name;
          std::string subPath;
          bool sibling = false;
          if (on([&] {
                name = subFolder->Name();
                subPath = subFolder->Path() + "\\";
                sibling = subFolder->HasCaseSibling();
              }) &&
              !name.empty() && !Excluded(name, subPath)) {
            // Below the first folder with a case sibling, folders are told apart from there on.
            size_t outer = caseExactFrom_;
            if (sibling && outer == std::string::npos) caseExactFrom_ = relativePath.size();
            FindFiles(subPath, parent, relativePath + name + "\\", recurse, folderMask, fileMask,
                      properties);
            caseExactFrom_ = outer;
          }
          if (status_ == kStatusCancelled) return;
        }
      }
    }
  }
  YieldIfAsynchronous(on);
}

bool Search::Excluded(const std::string& name, const std::string& path) const {
  if (read_.excluded.empty()) return false;
  // Matched as a person wrote them: on native names, "/" between them.
  std::string native = NameToNative(name);
  std::string slashed = path;
  std::replace(slashed.begin(), slashed.end(), '\\', '/');
  std::string nativePath = NameToNative(slashed);
  if (nativePath.size() > 1 && nativePath.ends_with('/')) nativePath.pop_back();
  return std::any_of(read_.excluded.begin(), read_.excluded.end(), [&](const std::string& glob) {
    return GlobMatches(glob, native, false) || GlobMatches(glob, nativePath, true);
  });
}

bool Search::LeadsOutside(const fs::File& file) {
  OnError on{kClass, search::kAddFileLabel};
  bool link = false;
  on([&] { link = file.IsLink(); });
  if (!link) return false;
  // Its properties would be those of a file outside what the client asked to have searched (a
  // planted link to /etc/shadow): left out, as a file the walk cannot see.
  bool outside = true;
  on([&] {
    fs::FileSystem& fileSystem = Use(objFSO);
    if (!read_.realFolder) read_.realFolder = fileSystem.RealPath(FullPath(read_.folder));
    std::string folder = *read_.realFolder;
    if (!folder.ends_with('\\')) folder += '\\';
    outside = !fileSystem.RealPath(file.Path()).starts_with(folder);
  });
  return outside;
}

std::string Search::EncodedFolder(const std::string& relativePath) const {
  Schema& schema = Use(objSchema);
  return caseExactFrom_ != std::string::npos ? schema.EncodeExactName(relativePath, caseExactFrom_)
                                             : schema.EncodeName(relativePath);
}

bool Search::AddFile(xml::Node folder, const fs::File& file, int16_t properties) {
  OnError on{kClass, search::kAddFileLabel};
  std::string name;
  bool matches = false;
  if (!on([&] { name = file.Name(); })) return false;
  if (properties != 0 && !read_.fileLinksAnywhere && LeadsOutside(file)) return false;
  if (patternUsable_) on([&] { matches = Use(objRegExp).Test(name); });
  if (!matches) return false;

  xml::Node entry;
  if (!on([&] {
        Schema& schema = Use(objSchema);
        entry = schema.AddFileEntry(
            name, file.HasCaseSibling() ? schema.EncodeExactName(name) : schema.EncodeName(name),
            folder, lngFileCounter);
      })) {
    return false;
  }
  if (properties == 0) return true;
  std::string path;
  on([&] { path = file.Path(); });
  ReportSubject subject(path);
  Schema& schema = *objSchema;
  on([&] {
    if ((properties & 1) != 0) schema.AddProperty(1, schema.ReadPropertyType1(file), entry);
  });
  on([&] {
    if ((properties & 2) != 0) {
      schema.AddProperty(2, std::to_string(schema.ReadPropertyType2(file)), entry);
    }
  });
  on([&] {
    if ((properties & 4) != 0) schema.AddProperty(4, schema.ReadPropertyType3(file), entry);
  });
  on([&] {
    if ((properties & 8) != 0) {
      schema.AddProperty(8, FormatDateTime(schema.ReadPropertyType4(file)), entry);
    }
  });
  return true;
}

}  // namespace trl
