// Links to folders met by a walk: noted while a drive's folders are walked, and written under the
// drive's element for those that lead into a folder the search walks, so that Compare can place
// the files below a link's target where the link puts them too.

#include <optional>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/fs/file_system.h"
#include "search/search_names.h"
#include "trl/search.h"

namespace trl {
namespace {

// What follows `root` in `real` (both real paths, "" when they are equal), or none when `real`
// does not lie in `root`.
std::optional<std::string_view> Below(std::string_view real, std::string_view root) {
  if (root == "\\") return real.substr(1);
  if (!real.starts_with(root)) return std::nullopt;
  if (real.size() == root.size()) return std::string_view();
  if (real[root.size()] != '\\') return std::nullopt;
  return real.substr(root.size() + 1);
}

}  // namespace

void Search::NoteSearchedRoot(const std::string& relativePath) {
  try {
    linkNotes_.roots.push_back(
        {Use(objFSO).RealPath(FullPath(relativePath)), relativePath, read_.recurse});
  } catch (const std::exception&) {
    // A folder that cannot be reached is reported by the walk; no link can lead into it.
  }
}

void Search::NoteFolderLinks(fs::Folder& folder, const std::string& relativePath) {
  for (const fs::FolderLink& link : folder.FolderLinks()) {
    linkNotes_.links.emplace_back(relativePath + link.name + "\\", link.target);
  }
}

void Search::WriteFolderLinks() {
  OnError on{search::kClass, search::kRunLabel};
  LinkNotes notes = std::exchange(linkNotes_, {});
  std::unordered_set<std::string> written;  // a folder walked twice lists its links twice
  for (const auto& note : notes.links) {
    const std::string& text = note.first;
    for (const auto& root : notes.roots) {
      auto rest = Below(note.second, root.real);
      // A walk without recursion walks its folder only.
      if (!rest || (!root.recurse && !rest->empty())) continue;
      std::string relative = root.relative;
      if (!rest->empty()) relative.append(*rest).push_back('\\');
      if (written.insert(text).second) {
        on([&] {
          xml::Node link = Use(results_).CreateElement(vocab::l);
          link.SetAttribute(vocab::l_text, text);
          link.SetAttribute(vocab::l_target, relative);
          read_.drive.AppendChild(link);
        });
      }
      break;
    }
  }
}

}  // namespace trl
