#include "platform/fs/posix/folder_listing.h"

#include <dirent.h>

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string_view>
#include <utility>

#include "platform/fs/posix/folder_entries.h"
#include "platform/fs/posix/posix_file.h"
#include "platform/fs/posix/sys_calls.h"
#include "platform/text.h"

namespace trl::fs::posix {
namespace {

// Only a name with a letter that lower-casing may change can have a sibling; most folders have
// none, and cost one pass over their names.
bool MayChangeCase(std::string_view name) {
  return std::any_of(name.begin(), name.end(), [](char c) {
    return (c >= 'A' && c <= 'Z') || static_cast<unsigned char>(c) >= 0x80;
  });
}

void AppendLowerCase(std::string& out, std::string_view name) {
  if (std::any_of(name.begin(), name.end(),
                  [](char c) { return static_cast<unsigned char>(c) >= 0x80; })) {
    out += LowerCase(name);
    return;
  }
  size_t start = out.size();
  out += name;
  std::for_each(out.begin() + static_cast<ptrdiff_t>(start), out.end(),
                [](char& c) { c = static_cast<char>(c >= 'A' && c <= 'Z' ? c + 32 : c); });
}

// FNV-1a: sorting by a number is far cheaper than sorting by text.
uint64_t Fingerprint(std::string_view text) {
  uint64_t hash = 0xcbf29ce484222325;
  for (char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3;
  return hash;
}

// Marks the items whose lower-cased names are equal. Their numbers are sorted once instead of the
// names put in a table: a folder holds few entries, and a name is lower-cased only once, into one
// buffer.
template <class Items, class NameOf, class Mark>
void MarkCaseSiblings(Items& items, NameOf nameOf, Mark mark) {
  if (std::none_of(items.begin(), items.end(),
                   [&](const auto& item) { return MayChangeCase(nameOf(item)); })) {
    return;
  }
  // Where each name's lower-cased form lies in `folded` (offset and size); none when the name is
  // its own.
  std::string folded;
  std::vector<std::optional<std::pair<size_t, size_t>>> spans(items.size());
  for (size_t i = 0; i < items.size(); ++i) {
    const std::string& name = nameOf(items[i]);
    if (!MayChangeCase(name)) continue;
    size_t start = folded.size();
    AppendLowerCase(folded, name);
    spans[i].emplace(start, folded.size() - start);
  }
  auto keyOf = [&](size_t i) {
    return spans[i] ? std::string_view(folded).substr(spans[i]->first, spans[i]->second)
                    : std::string_view(nameOf(items[i]));
  };
  std::vector<std::pair<uint64_t, size_t>> keys;
  keys.reserve(items.size());
  for (size_t i = 0; i < items.size(); ++i) keys.emplace_back(Fingerprint(keyOf(i)), i);
  std::sort(keys.begin(), keys.end());
  // Within a run of equal numbers, each key is held against the others: numbers can collide.
  for (size_t run = 0; run < keys.size();) {
    size_t end = run + 1;
    while (end < keys.size() && keys[end].first == keys[run].first) ++end;
    for (size_t k = run; k < end; ++k) {
      for (size_t other = run; other < end; ++other) {
        if (other != k && keyOf(keys[k].second) == keyOf(keys[other].second)) {
          mark(items[keys[k].second]);
          break;
        }
      }
    }
    run = end;
  }
}

}  // namespace

FolderListing ListFolder(const std::shared_ptr<const FolderPlace>& folder) {
  FolderEntries entries(folder->Native());
  return ListFolder(folder, entries);
}

FolderListing ListFolder(const std::shared_ptr<const FolderPlace>& folder, FolderEntries& entries) {
  FolderListing listing;
  std::string_view name;
  unsigned char type = DT_UNKNOWN;
  while (entries.Next(name, type)) {
    std::optional<ItemStatus> status;
    if (type == DT_UNKNOWN) {
      struct stat item {};
      if (LStat(folder->NativeChild(name), item) != 0) continue;  // gone since it was listed
      type = static_cast<unsigned char>(IFTODT(item.st_mode));
    }
    if (type == DT_LNK) {
      struct stat target {};
      if (Stat(folder->NativeChild(name), target) != 0) continue;
      if (S_ISDIR(target.st_mode)) {
        listing.folderLinks.emplace_back(name);
        continue;
      }
      status = ToItemStatus(target);
    }
    if (type == DT_DIR) {
      auto place =
          std::make_shared<FolderPlace>(folder->NativeChild(name), folder->PathChild(name), folder);
      listing.subFolders.push_back({std::move(place), std::string(name)});
    } else {
      listing.files.push_back(std::make_unique<PosixFile>(folder, std::string(name), type, status));
    }
  }
  listing.error = entries.Error();
  if (listing.error != 0) {
    listing.files.clear();
    listing.subFolders.clear();
    listing.folderLinks.clear();
  }
  MarkCaseSiblings(
      listing.files,
      [](const auto& file) -> const std::string& {
        return static_cast<const PosixFile&>(*file).NativeName();
      },
      [](auto& file) { static_cast<PosixFile&>(*file).MarkCaseSibling(); });
  MarkCaseSiblings(
      listing.subFolders, [](const auto& sub) -> const std::string& { return sub.nativeName; },
      [](auto& sub) { sub.caseSibling = true; });
  return listing;
}

}  // namespace trl::fs::posix
