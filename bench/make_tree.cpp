// make_tree DIR FILES [FOLDERS] [--random-start N]
//
// Creates a folder tree that looks like an installed-software disk, for timing the search stage:
// exactly FILES empty regular files spread unevenly over FOLDERS folders (DIR itself included,
// default FILES/20), at most 8 levels below DIR. The same arguments always give the same tree.
// Names are never hidden and never collide within a folder, even ignoring case, so every file is
// recorded under the default masks whatever case rules the reader applies.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <string_view>
#include <unordered_set>
#include <utility>
#include <vector>

#include "rng.h"
#include "words.h"

namespace {

constexpr int kMaxDepth = 8;

using trl::bench::kStemWords;
using trl::bench::Lower;
using trl::bench::Rng;
using trl::bench::Upper;

constexpr std::array<std::string_view, 40> kFolderWords = {
    "Program", "Common", "Shared",  "bin",       "lib",     "Resources", "Plugins",    "Data",
    "Tools",   "Docs",   "locale",  "share",     "include", "x64",       "x86",        "Themes",
    "Fonts",   "Help",   "Samples", "Templates", "Drivers", "Modules",   "Extensions", "Cache",
    "Config",  "Assets", "Images",  "Icons",     "Sounds",  "Scripts",   "Runtime",    "Components",
    "Updates", "Backup", "Logs",    "Languages", "Support", "Engine",    "Tutorials",  "Redist"};

constexpr std::array<std::string_view, 12> kLocales = {"en-US", "de-DE", "fr-FR", "ja-JP",
                                                       "zh-CN", "pt-BR", "es-ES", "it-IT",
                                                       "ru-RU", "ko-KR", "nl-NL", "sv-SE"};

constexpr std::array<std::string_view, 30> kExtensions = {
    "dll", "exe", "sys", "ocx",  "cab",  "msi", "txt", "rtf", "pdf",      "chm",
    "xml", "ini", "cfg", "json", "dat",  "bin", "pak", "png", "ico",      "bmp",
    "jpg", "ttf", "js",  "css",  "html", "qm",  "mo",  "lic", "manifest", "log"};

constexpr std::array<std::string_view, 8> kIconSizes = {"16x16", "24x24",   "32x32",   "48x48",
                                                        "64x64", "128x128", "256x256", "512x512"};

std::string Version(Rng& rng) {
  std::string v = std::to_string(rng.Below(20)) + "." + std::to_string(rng.Below(10));
  if (rng.Chance(70)) v += "." + std::to_string(rng.Below(5000));
  return v;
}

std::string FolderName(Rng& rng) {
  switch (rng.Below(10)) {
    case 0:
      return std::string(rng.Pick(kLocales));
    case 1:
      return (rng.Chance(50) ? "v" : "") + Version(rng);
    case 2:
      return std::string(rng.Pick(kFolderWords)) + " " + std::string(rng.Pick(kFolderWords));
    case 3:
      return std::string(rng.Pick(kStemWords)) + std::string(rng.Pick(kStemWords)) + " " +
             std::to_string(rng.Below(30) + 1);
    case 4:
      return Upper(rng.Pick(kFolderWords));
    default:
      return std::string(rng.Pick(kFolderWords));
  }
}

std::string Extension(Rng& rng) {
  const std::string_view ext = rng.Pick(kExtensions);
  return "." + (rng.Chance(20) ? Upper(ext) : std::string(ext));
}

std::string FileName(Rng& rng) {
  switch (rng.Below(12)) {
    case 0:  // libfoo.so.1, libfoo.so.2.3.1
      return "lib" + Lower(rng.Pick(kStemWords)) + ".so" +
             (rng.Chance(50) ? "." + std::to_string(rng.Below(9) + 1) : "." + Version(rng));
    case 1:
      return std::string(rng.Pick(kStemWords)) + "_" + std::string(rng.Pick(kIconSizes)) +
             (rng.Chance(80) ? ".png" : ".ICO");
    case 2:
      return Upper(rng.Pick(kStemWords)) + Upper(Extension(rng));
    case 3:
      return Lower(rng.Pick(kStemWords)) + Extension(rng);
    case 4:
      return std::string(rng.Pick(kStemWords)) + std::to_string(rng.Below(10000)) + Extension(rng);
    case 5:
      return std::string(rng.Pick(kStemWords)) + "-" + Version(rng) + Extension(rng);
    case 6:
      return std::string(rng.Pick(kStemWords)) + "." + std::string(rng.Pick(kLocales)) +
             Extension(rng);
    default:
      return std::string(rng.Pick(kStemWords)) + std::string(rng.Pick(kStemWords)) + Extension(rng);
  }
}

// Makes `name` unique in `taken` (compared without case) by numbering its stem, then claims it.
std::string Claim(std::string name, std::unordered_set<std::string>& taken) {
  if (taken.insert(Lower(name)).second) return name;
  const size_t dot = name.find('.', 1);
  const std::string stem = name.substr(0, dot);
  const std::string rest = dot == std::string::npos ? "" : name.substr(dot);
  for (int n = 2;; ++n) {
    std::string candidate = stem + "_" + std::to_string(n) + rest;
    if (taken.insert(Lower(candidate)).second) return candidate;
  }
}

struct Folder {
  Folder(size_t parent, int depth, std::string path)
      : parent(parent), depth(depth), path(std::move(path)) {}

  size_t parent;
  int depth;
  std::string path;
  size_t files = 0;
  std::unordered_set<std::string> taken;  // lower-cased names of the children made so far
};

// Parents follow a walk that mostly stays near the last folder made, so folders come in
// clusters and deep chains like real installs, with some jumps anywhere to spread the tree.
std::vector<Folder> PlanFolders(const std::string& root, size_t count, Rng& rng) {
  std::vector<Folder> folders;
  folders.reserve(count);
  folders.emplace_back(0, 0, root);
  std::vector<size_t> open = {0};  // folders that may still get children
  for (size_t i = 1; i < count; ++i) {
    const size_t last = folders.size() - 1;
    size_t parent;
    const size_t roll = rng.Below(100);
    if (roll < 30 && folders[last].depth < kMaxDepth) {
      parent = last;
    } else if (roll < 65) {
      parent = folders[last].parent;
    } else {
      // Climbing a little from a random folder keeps the tree from piling up at the depth limit.
      parent = open[rng.Below(open.size())];
      for (size_t up = rng.Below(folders[parent].depth / 2 + 1); up > 0; --up) {
        parent = folders[parent].parent;
      }
    }
    Folder& p = folders[parent];
    std::string name = Claim(FolderName(rng), p.taken);
    folders.emplace_back(parent, p.depth + 1, p.path + "/" + name);
    if (folders.back().depth < kMaxDepth) open.push_back(i);
  }
  return folders;
}

// A quarter of the folders hold no files; the rest get a heavy-tailed (Lomax) share, so most hold
// a handful and a few hold hundreds or thousands, while the total is exactly `files`.
void PlanFileCounts(std::vector<Folder>& folders, size_t files, Rng& rng) {
  std::vector<double> weights(folders.size());
  double total = 0;
  for (double& w : weights) {
    w = rng.Chance(25) ? 0.0 : std::pow(rng.Unit(), -0.5) - 1;
    total += w;
  }
  if (total == 0) weights[0] = total = 1;
  size_t given = 0;
  for (size_t i = 0; i < folders.size(); ++i) {
    folders[i].files = static_cast<size_t>(static_cast<double>(files) * weights[i] / total);
    given += folders[i].files;
  }
  while (given < files) {
    const size_t i = rng.Below(folders.size());
    if (weights[i] > 0) {
      ++folders[i].files;
      ++given;
    }
  }
}

[[noreturn]] void Fail(const std::string& what) {
  std::fprintf(stderr, "make_tree: %s: %s\n", what.c_str(), std::strerror(errno));
  std::exit(1);
}

[[noreturn]] void Usage() {
  std::fprintf(stderr, "usage: make_tree DIR FILES [FOLDERS] [--random-start N]\n");
  std::exit(2);
}

size_t ParseCount(const char* text) {
  char* end = nullptr;
  errno = 0;
  const unsigned long long value = std::strtoull(text, &end, 10);
  if (errno != 0 || end == text || *end != '\0') Usage();
  return static_cast<size_t>(value);
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<const char*> args;
  uint64_t randomStart = 20240601;
  for (int i = 1; i < argc; ++i) {
    if (std::strcmp(argv[i], "--random-start") == 0 && i + 1 < argc) {
      randomStart = ParseCount(argv[++i]);
    } else {
      args.push_back(argv[i]);
    }
  }
  if (args.size() < 2 || args.size() > 3) Usage();
  const std::string root = args[0];
  const size_t files = ParseCount(args[1]);
  const size_t folderCount =
      std::max<size_t>(1, args.size() == 3 ? ParseCount(args[2]) : files / 20);

  std::error_code ec;
  std::filesystem::create_directories(root, ec);
  if (ec || !std::filesystem::is_empty(root, ec) || ec) {
    std::fprintf(stderr, "make_tree: %s must be an empty folder or absent\n", root.c_str());
    return 1;
  }

  const auto started = std::chrono::steady_clock::now();
  Rng rng(randomStart);
  std::vector<Folder> folders = PlanFolders(root, folderCount, rng);
  PlanFileCounts(folders, files, rng);

  // Folders come before their children in the plan, so plain mkdir in order works.
  for (size_t i = 1; i < folders.size(); ++i) {
    if (mkdir(folders[i].path.c_str(), 0755) != 0) Fail("mkdir " + folders[i].path);
  }
  int maxDepth = 0;
  for (Folder& folder : folders) {
    maxDepth = std::max(maxDepth, folder.depth);
    if (folder.files == 0) continue;
    // openat on a held folder spares the kernel a full path walk per file.
    const int dir = open(folder.path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (dir < 0) Fail("open " + folder.path);
    for (size_t n = 0; n < folder.files; ++n) {
      const std::string name = Claim(FileName(rng), folder.taken);
      const int fd = openat(dir, name.c_str(), O_CREAT | O_WRONLY | O_EXCL | O_CLOEXEC, 0644);
      if (fd < 0) Fail("create " + folder.path + "/" + name);
      close(fd);
    }
    close(dir);
    std::unordered_set<std::string>().swap(folder.taken);
  }

  const double seconds =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();
  std::printf("make_tree: %zu files, %zu folders, max depth %d, %.1f s\n", files, folders.size(),
              maxDepth, seconds);
  return 0;
}
