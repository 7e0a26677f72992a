// Filling an index that keeps few of the local files: the walk of the million others is the
// cost, and it reads the document only, so it is shared out among threads while nothing else
// uses the document; the few files kept are added on this thread, in document order.
#include <algorithm>
#include <functional>
#include <span>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "compare/drive_walk.h"
#include "compare/local_file_index.h"
#include "compare/local_files.h"
#include "frame/attributes.h"
#include "frame/vocabulary.h"
#include "platform/text.h"
#include "schema/schema.h"

namespace trl {
namespace {

// A folder of the local files, and what of it the index keeps.
struct ListedFolder {
  ListedFolder(xml::Node d, uint32_t drive) : d(d), drive(drive) {}

  xml::Node d;
  uint32_t drive;
  std::string folder, exactFolder;
  size_t caseExactFrom = std::string::npos;
  std::vector<std::pair<std::string, std::string>> kept;  // file name, encoded name
};

// Reads `folders` and the names of their files, keeping those the index may keep; false at the
// first value that cannot be read.
bool ReadFolders(std::span<ListedFolder> folders, const LocalFileIndex& index) {
  try {
    for (ListedFolder& listed : folders) {
      listed.exactFolder = TextOf(listed.d, vocab::d_text);
      listed.folder = LowerCase(listed.exactFolder);
      listed.caseExactFrom = Schema::ExactFrom(TextOf(listed.d, vocab::d_name), listed.exactFolder);
      for (const xml::Node& f : listed.d.ChildElements(vocab::f)) {
        auto text = f.GetAttributeView(vocab::f_text);
        auto name = f.GetAttributeView(vocab::f_name);
        if (!text || !name) return false;
        if (index.Covers(*name)) listed.kept.emplace_back(*text, *name);
      }
    }
  } catch (...) {
    return false;
  }
  return true;
}

}  // namespace

bool TryFillFilteredIndex(xml::Document& localFiles, LocalFileIndex& index,
                          const std::function<void()>& meanwhile) {
  std::vector<ListedFolder> folders;
  try {
    WalkDrives(
        localFiles, &index, [](auto&& step) { step(); },
        [&](const xml::Node& m) {
          auto drive = static_cast<uint32_t>(index.Drives() - 1);
          for (const xml::Node& d : m.ChildElements(vocab::d)) folders.emplace_back(d, drive);
        });
  } catch (...) {
    return false;
  }
  // Each thread reads a run of folders; this one the last, unless it has other work meanwhile.
  size_t threads = std::clamp<size_t>(std::thread::hardware_concurrency(), 1, 4);
  size_t parts = threads;
  size_t helping = meanwhile ? parts : parts - 1;
  size_t share = (folders.size() + parts - 1) / parts;
  std::span<ListedFolder> all(folders);
  std::vector<char> read(parts, 1);
  {
    std::vector<std::jthread> helpers;  // joined when the block ends, however it ends
    for (size_t i = 0; i < helping && i * share < folders.size(); ++i) {
      helpers.emplace_back([&, i] {
        read[i] =
            ReadFolders(all.subspan(i * share, std::min(share, folders.size() - i * share)), index);
      });
    }
    if (meanwhile) {
      meanwhile();
    } else if (helping * share < folders.size()) {
      read.back() = ReadFolders(all.subspan(helping * share), index);
    }
  }
  if (!std::all_of(read.begin(), read.end(), [](char ok) { return ok != 0; })) return false;
  try {
    for (ListedFolder& listed : folders) {
      if (listed.kept.empty()) continue;
      index.AddFolder(std::move(listed.folder), std::move(listed.exactFolder), listed.caseExactFrom,
                      listed.drive);
      for (const auto& [name, encoded] : listed.kept) index.AddFile(name, encoded);
    }
  } catch (...) {
    return false;
  }
  return true;
}

}  // namespace trl
