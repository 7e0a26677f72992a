// make_compare_data OUT_DIR APPS [LOCAL_FILES]
//
// Writes the inputs for timing the compare stage; the same arguments always give the same bytes.
//   OUT_DIR/fingerprint.xml  APPS applications, each with 5 versions of the same 20 files; every
//                            file carries its size (p_type 2) and lower-case hex MD5 (p_type 3).
//                            Sizes run from 1 KiB to 4 MiB, spread evenly over the powers of two
//                            between (mean about 520 KiB, median about 64 KiB), as installed
//                            programs and libraries measure. A version that is installed nowhere
//                            has no content, so its digests are drawn at random.
//   OUT_DIR/disk/            one version of every 20th application (N % 20 == 0) installed under
//                            "Program Files", its files holding exactly that version's content.
//   OUT_DIR/local-files.xml  exactly LOCAL_FILES files (default APPS * 100) as the search stage
//                            records them: the installed files in their folders plus filler in
//                            folders of other software. About 5% of the filler carries names of
//                            fingerprint files in folders that do not fit their relative path, and
//                            about 1% in folders that fit but exist only in the listing.
// OUT_DIR/disk is removed first, so a rerun leaves no files from an earlier one.
#include <algorithm>
#include <array>
#include <bit>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <initializer_list>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

#include "rng.h"
#include "schema/schema.h"
#include "words.h"

namespace {

namespace fs = std::filesystem;

constexpr int kVersions = 5;
constexpr int kFilesPerVersion = 20;
constexpr size_t kInstallEvery = 20;
constexpr uint64_t kRandomStart = 20260101;

using trl::bench::kStemWords;
using trl::bench::Lower;
using trl::bench::Rng;
using trl::bench::Upper;

// A start for an Rng of its own per item, so an item's data does not depend on the order or the
// number of other items drawn before it.
uint64_t StartFor(uint64_t a, uint64_t b, uint64_t c = 0) {
  Rng rng(kRandomStart ^ a);
  Rng second(rng.Next() ^ b);
  Rng third(second.Next() ^ c);
  return third.Next();
}

// RFC 1321, over a whole buffer at once: every content is generated in full before it is hashed.
constexpr std::array<uint32_t, 64> kMd5Sines = {
    0xd76aa478, 0xe8c7b756, 0x242070db, 0xc1bdceee, 0xf57c0faf, 0x4787c62a, 0xa8304613, 0xfd469501,
    0x698098d8, 0x8b44f7af, 0xffff5bb1, 0x895cd7be, 0x6b901122, 0xfd987193, 0xa679438e, 0x49b40821,
    0xf61e2562, 0xc040b340, 0x265e5a51, 0xe9b6c7aa, 0xd62f105d, 0x02441453, 0xd8a1e681, 0xe7d3fbc8,
    0x21e1cde6, 0xc33707d6, 0xf4d50d87, 0x455a14ed, 0xa9e3e905, 0xfcefa3f8, 0x676f02d9, 0x8d2a4c8a,
    0xfffa3942, 0x8771f681, 0x6d9d6122, 0xfde5380c, 0xa4beea44, 0x4bdecfa9, 0xf6bb4b60, 0xbebfbc70,
    0x289b7ec6, 0xeaa127fa, 0xd4ef3085, 0x04881d05, 0xd9d4d039, 0xe6db99e5, 0x1fa27cf8, 0xc4ac5665,
    0xf4292244, 0x432aff97, 0xab9423a7, 0xfc93a039, 0x655b59c3, 0x8f0ccc92, 0xffeff47d, 0x85845dd1,
    0x6fa87e4f, 0xfe2ce6e0, 0xa3014314, 0x4e0811a1, 0xf7537e82, 0xbd3af235, 0x2ad7d2bb, 0xeb86d391};

constexpr std::array<int, 16> kMd5Shifts = {7, 12, 17, 22, 5, 9,  14, 20,
                                            4, 11, 16, 23, 6, 10, 15, 21};

void Md5Block(std::array<uint32_t, 4>& state, const uint8_t* block) {
  std::array<uint32_t, 16> words;
  for (size_t i = 0; i < 16; ++i) {
    words[i] = static_cast<uint32_t>(block[4 * i]) | static_cast<uint32_t>(block[4 * i + 1]) << 8 |
               static_cast<uint32_t>(block[4 * i + 2]) << 16 |
               static_cast<uint32_t>(block[4 * i + 3]) << 24;
  }
  uint32_t a = state[0], b = state[1], c = state[2], d = state[3];
  auto step = [&](size_t i, uint32_t f, size_t g) {
    const uint32_t rotated =
        std::rotl(a + f + kMd5Sines[i] + words[g], kMd5Shifts[i / 16 * 4 + i % 4]);
    a = d;
    d = c;
    c = b;
    b += rotated;
  };
  // One loop per round rather than a branch per step, unrolled even at -O2 so the constants fold
  // into straight-line code; hashing is most of a full-scale run. The first two mixing functions
  // are the usual cheaper equivalents of RFC 1321's.
#pragma GCC unroll 16
  for (size_t i = 0; i < 16; ++i) step(i, d ^ (b & (c ^ d)), i);
#pragma GCC unroll 16
  for (size_t i = 16; i < 32; ++i) step(i, c ^ (d & (b ^ c)), (5 * i + 1) % 16);
#pragma GCC unroll 16
  for (size_t i = 32; i < 48; ++i) step(i, b ^ c ^ d, (3 * i + 5) % 16);
#pragma GCC unroll 16
  for (size_t i = 48; i < 64; ++i) step(i, c ^ (b | ~d), (7 * i) % 16);
  state[0] += a;
  state[1] += b;
  state[2] += c;
  state[3] += d;
}

std::string Md5Hex(const std::vector<uint8_t>& data) {
  std::array<uint32_t, 4> state = {0x67452301, 0xefcdab89, 0x98badcfe, 0x10325476};
  const size_t whole = data.size() / 64 * 64;
  for (size_t at = 0; at < whole; at += 64) Md5Block(state, data.data() + at);
  // The tail, the 0x80 marker and the bit length fill one block or spill into a second.
  std::array<uint8_t, 128> tail{};
  const size_t rest = data.size() - whole;
  std::copy(data.begin() + static_cast<ptrdiff_t>(whole), data.end(), tail.begin());
  tail[rest] = 0x80;
  const size_t tailSize = rest < 56 ? 64 : 128;
  const uint64_t bits = static_cast<uint64_t>(data.size()) * 8;
  for (size_t i = 0; i < 8; ++i) tail[tailSize - 8 + i] = static_cast<uint8_t>(bits >> (8 * i));
  for (size_t at = 0; at < tailSize; at += 64) Md5Block(state, tail.data() + at);

  static constexpr char kHex[] = "0123456789abcdef";
  std::string hex;
  hex.reserve(32);
  for (uint32_t word : state) {
    for (size_t i = 0; i < 4; ++i) {
      const auto byte = static_cast<uint8_t>(word >> (8 * i));
      hex += kHex[byte >> 4];
      hex += kHex[byte & 0xF];
    }
  }
  return hex;
}

// Words for invented application names; plain dictionary words so no name points anywhere real.
constexpr std::array<std::string_view, 36> kBrands = {
    "Acme",    "Brisk",   "Cobalt", "Delta",  "Ember",  "Falcon", "Granite", "Harbor", "Indigo",
    "Juniper", "Kestrel", "Lumen",  "Maple",  "Nimbus", "Onyx",   "Pioneer", "Quartz", "Raven",
    "Summit",  "Tundra",  "Umber",  "Vertex", "Willow", "Xylo",   "Yonder",  "Zephyr", "Beacon",
    "Cascade", "Drift",   "Fable",  "Glyph",  "Helix",  "Jade",   "Lark",    "Mosaic", "Orbit"};

constexpr std::array<std::string_view, 30> kProducts = {
    "View",  "Ledger", "Draw", "Mail",   "Sync",   "Scan",   "Chart", "Player", "Notes", "Backup",
    "Sound", "Photo",  "Code", "Shield", "Desk",   "Cloud",  "Print", "Forms",  "Maps",  "Tasks",
    "Term",  "Clip",   "Pack", "Cast",   "Reader", "Writer", "Calc",  "Paint",  "Vault", "Studio"};

constexpr std::array<std::string_view, 10> kEditions = {
    "", "", "", "", "Pro", "Lite", "Suite", "Express", "Server", "Plus"};

constexpr std::array<std::string_view, 20> kExtensions = {
    "dll", "exe", "dat", "xml",  "ini", "cfg", "pak", "png", "ico", "ttf",
    "qm",  "chm", "txt", "json", "bin", "cab", "sys", "ocx", "lic", "manifest"};

constexpr std::array<std::string_view, 12> kLocales = {"en-US", "de-DE", "fr-FR", "ja-JP",
                                                       "zh-CN", "pt-BR", "es-ES", "it-IT",
                                                       "ru-RU", "ko-KR", "nl-NL", "sv-SE"};

// Names that many installers ship, so one lower-cased name has many fingerprint candidates.
constexpr std::array<std::string_view, 10> kSharedNames = {
    "license.txt", "uninstall.exe", "Readme.TXT", "Changes.txt", "EULA.rtf",
    "Setup.ini",   "Update.exe",    "Icon.ico",   "Help.chm",    "Config.xml"};

constexpr std::array<std::string_view, 16> kRelpaths = {
    "bin",       "lib",     "lib\\plugins", "Resources", "Resources\\Images", "Docs",
    "Plugins",   "x64",     "bin\\x86",     "Data",      "locale\\de-DE",     "Help",
    "Templates", "Drivers", "Modules",      "Fonts"};

constexpr std::array<std::string_view, 12> kSubfolders = {
    "bin",  "lib",   "Resources", "Plugins", "Data",         "x64",
    "Docs", "Cache", "Logs",      "Config",  "lib\\plugins", "Resources\\Icons"};

constexpr std::array<std::string_view, 10> kSystemFolders = {
    "\\Windows",           "\\Windows\\System32",
    "\\Windows\\SysWOW64", "\\Windows\\System32\\drivers",
    "\\Windows\\Fonts",    "\\Windows\\Help",
    "\\Windows\\Temp",     "\\Windows\\inf",
    "\\Windows\\Media",    "\\Windows\\System32\\en-US"};

std::string Extension(Rng& rng) {
  const std::string_view ext = rng.Pick(kExtensions);
  return "." + (rng.Chance(20) ? Upper(ext) : std::string(ext));
}

std::string Number(Rng& rng, size_t below) { return std::to_string(rng.Below(below) + 1); }

// Concatenates parts that draw from an Rng. The parts of a braced list are evaluated in order,
// unlike the operands of +, so every compiler makes the draws in the same order.
std::string Join(std::initializer_list<std::string_view> parts) {
  std::string joined;
  for (std::string_view part : parts) joined += part;
  return joined;
}

// Names any application might ship; different applications share some of these by chance.
std::string GenericName(Rng& rng) {
  switch (rng.Below(3)) {
    case 0:  // libCore12.dll
      return Join({"lib", rng.Pick(kStemWords), Number(rng, 99), ".dll"});
    case 1:
      return Join({rng.Pick(kStemWords), rng.Pick(kStemWords), Extension(rng)});
    default:
      return Join({Lower(rng.Pick(kStemWords)), Number(rng, 9999), Extension(rng)});
  }
}

// Names built on the application's own stem, hence almost never shared.
std::string OwnName(std::string_view stem, Rng& rng) {
  switch (rng.Below(5)) {
    case 0:
      return Join({stem, rng.Pick(kStemWords), Extension(rng)});
    case 1:
      return Join({Lower(stem), "_", Lower(rng.Pick(kStemWords)), Extension(rng)});
    case 2:
      return Join({stem, ".", rng.Pick(kLocales), ".qm"});
    case 3:
      return Join({rng.Pick(kStemWords), stem, Number(rng, 99), Extension(rng)});
    default:
      return Join({stem, Number(rng, 64), Extension(rng)});
  }
}

std::string FingerprintFileName(std::string_view stem, Rng& rng) {
  const size_t roll = rng.Below(100);
  if (roll < 2) {
    const std::string_view shared = rng.Pick(kSharedNames);
    return rng.Chance(30) ? Upper(shared) : std::string(shared);
  }
  return roll < 30 ? GenericName(rng) : OwnName(stem, rng);
}

// Filler shares no pattern with fingerprint names except by chance; the caller rejects those.
std::string FillerName(Rng& rng) {
  switch (rng.Below(4)) {
    case 0:
      return Join({Lower(rng.Pick(kStemWords)), Lower(rng.Pick(kStemWords)), Number(rng, 999),
                   Extension(rng)});
    case 1:
      return Join({rng.Pick(kStemWords), "_", Number(rng, 512), "x", Number(rng, 512),
                   rng.Chance(80) ? ".png" : ".ICO"});
    case 2:
      return Join({Upper(rng.Pick(kStemWords)), Number(rng, 9999), Upper(Extension(rng))});
    default:
      return Join(
          {rng.Pick(kStemWords), "-", Number(rng, 20), ".", Number(rng, 99), Extension(rng)});
  }
}

struct AppFile {
  std::string name;
  std::string relpath;  // backslash separators, no leading or trailing one; "" is the app folder
  bool weightless = false;
  std::array<uint32_t, kVersions> sizes{};
};

struct App {
  std::string name;
  std::string folder;  // under \Program Files
  std::array<std::string, kVersions> versions;
  std::array<AppFile, kFilesPerVersion> files;
};

// From 1 KiB up to 4 MiB: a power of two between, then evenly within it.
uint32_t FileSize(Rng& rng) {
  const uint32_t low = uint32_t{1} << (10 + rng.Below(12));
  return static_cast<uint32_t>(low + rng.Below(low));
}

bool Installed(size_t number) { return number % kInstallEvery == 0; }
int InstalledVersion(size_t number) {
  return static_cast<int>(number / kInstallEvery % kVersions) + 1;
}

// Claims `text` in `taken` (compared without case), numbering it if another holds it already.
std::string Claim(const std::string& text, std::unordered_set<std::string>& taken) {
  if (taken.insert(Lower(text)).second) return text;
  for (int n = 2;; ++n) {
    std::string candidate = text + " " + std::to_string(n);
    if (taken.insert(Lower(candidate)).second) return candidate;
  }
}

std::vector<App> PlanApps(size_t count) {
  std::vector<App> apps(count);
  std::unordered_set<std::string> names;
  std::unordered_set<std::string> folders;
  for (size_t i = 0; i < count; ++i) {
    const size_t number = i + 1;
    Rng rng(StartFor(1, number));
    App& app = apps[i];
    const std::string_view brand = rng.Pick(kBrands);
    const std::string_view product = rng.Pick(kProducts);
    const std::string_view edition = rng.Pick(kEditions);
    std::string name = std::string(brand) + " " + std::string(product);
    if (!edition.empty()) name += " " + std::string(edition);
    app.name = Claim(name, names);

    size_t major = rng.Below(15) + 1;
    size_t minor = rng.Below(5);
    app.folder = Claim(app.name + " " + std::to_string(major), folders);
    for (std::string& version : app.versions) {
      version = std::to_string(major) + "." + std::to_string(minor);
      if (rng.Chance(30)) {
        ++major;
        minor = 0;
      } else {
        minor += rng.Below(3) + 1;
      }
    }

    // A few subfolders per application, so its files cluster the way installs do.
    std::vector<std::string_view> relpaths;
    const size_t relpathCount = rng.Below(3) + 1;
    while (relpaths.size() < relpathCount) {
      const std::string_view relpath = rng.Pick(kRelpaths);
      if (std::find(relpaths.begin(), relpaths.end(), relpath) == relpaths.end()) {
        relpaths.push_back(relpath);
      }
    }

    const std::string stem = std::string(brand) + std::string(product);
    std::unordered_set<std::string> taken;
    for (size_t f = 0; f < app.files.size(); ++f) {
      AppFile& file = app.files[f];
      do {
        file.name = f == 0 ? stem + ".exe" : FingerprintFileName(stem, rng);
      } while (!taken.insert(Lower(file.name)).second);
      file.relpath = rng.Chance(50) ? "" : std::string(relpaths[rng.Below(relpaths.size())]);
      file.weightless = rng.Chance(10);
      // Distinct sizes, so no two versions of a file agree on size alone.
      for (size_t v = 0; v < kVersions; ++v) {
        uint32_t size;
        do {
          size = FileSize(rng);
        } while (std::find(file.sizes.begin(), file.sizes.begin() + static_cast<ptrdiff_t>(v),
                           size) != file.sizes.begin() + static_cast<ptrdiff_t>(v));
        file.sizes[v] = size;
      }
    }
  }
  return apps;
}

// The content of file `f` (0-based) of version `version` (1-based) of application `number`.
void Content(size_t number, int version, size_t f, uint32_t size, std::vector<uint8_t>& out) {
  out.resize(size);
  Rng rng(StartFor(number, static_cast<uint64_t>(version), f + 1));
  // Byte by byte rather than memcpy, so the content does not depend on the host's byte order.
  for (size_t at = 0; at < size; at += 8) {
    const uint64_t word = rng.Next();
    const size_t count = std::min<size_t>(8, size - at);
    for (size_t i = 0; i < count; ++i) out[at + i] = static_cast<uint8_t>(word >> 8 * i);
  }
}

// The digest of a file no disk holds: 32 lower-case hex digits, like an MD5.
std::string RandomDigest(size_t number, int version, size_t f) {
  Rng rng(StartFor(number, static_cast<uint64_t>(version), f + 1));
  static constexpr char kHex[] = "0123456789abcdef";
  std::string hex;
  for (int word = 0; word < 2; ++word) {
    const uint64_t bits = rng.Next();
    for (int i = 0; i < 16; ++i) hex += kHex[bits >> (4 * i) & 0xF];
  }
  return hex;
}

[[noreturn]] void Fail(const std::string& what, const std::string& why = std::strerror(errno)) {
  std::fprintf(stderr, "make_compare_data: %s: %s\n", what.c_str(), why.c_str());
  std::exit(1);
}

// Buffers output itself: a million small writes through stdio cost more than the data.
class XmlOut {
 public:
  explicit XmlOut(fs::path path) : path_(std::move(path)), file_(std::fopen(path_.c_str(), "wb")) {
    if (file_ == nullptr) Fail("create " + path_.string());
    buffer_.reserve(kFlushAt + 4096);
  }
  XmlOut(const XmlOut&) = delete;
  XmlOut& operator=(const XmlOut&) = delete;

  XmlOut& operator<<(std::string_view raw) {
    buffer_ += raw;
    return *this;
  }

  // Writes ` name="value"` with the value escaped for a double-quoted attribute.
  XmlOut& Attr(std::string_view name, std::string_view value) {
    buffer_ += ' ';
    buffer_ += name;
    buffer_ += "=\"";
    for (char c : value) {
      switch (c) {
        case '&':
          buffer_ += "&amp;";
          break;
        case '<':
          buffer_ += "&lt;";
          break;
        case '>':
          buffer_ += "&gt;";
          break;
        case '"':
          buffer_ += "&quot;";
          break;
        default:
          buffer_ += c;
      }
    }
    buffer_ += '"';
    return *this;
  }
  XmlOut& Attr(std::string_view name, size_t value) { return Attr(name, std::to_string(value)); }

  // Called between elements, so the buffer never grows far past kFlushAt.
  void MaybeFlush() {
    if (buffer_.size() >= kFlushAt) Flush();
  }

  void Close() {
    Flush();
    if (std::fclose(file_) != 0) Fail("close " + path_.string());
  }

 private:
  static constexpr size_t kFlushAt = 1 << 20;

  void Flush() {
    if (std::fwrite(buffer_.data(), 1, buffer_.size(), file_) != buffer_.size()) {
      Fail("write " + path_.string());
    }
    buffer_.clear();
  }

  fs::path path_;
  std::FILE* file_;
  std::string buffer_;
};

fs::path DiskFolder(const fs::path& disk, const App& app, const std::string& relpath) {
  fs::path folder = disk / "Program Files" / app.folder;
  std::string rest = relpath;
  std::replace(rest.begin(), rest.end(), '\\', '/');
  return rest.empty() ? folder : folder / rest;
}

void WriteFile(const fs::path& path, const std::vector<uint8_t>& content) {
  std::FILE* file = std::fopen(path.c_str(), "wb");
  if (file == nullptr) Fail("create " + path.string());
  if (std::fwrite(content.data(), 1, content.size(), file) != content.size()) {
    Fail("write " + path.string());
  }
  if (std::fclose(file) != 0) Fail("close " + path.string());
}

// Writes fingerprint.xml and, since the content is at hand while hashing it, the installed files.
// Returns the bytes written to disk.
uint64_t WriteFingerprint(const fs::path& out, const fs::path& disk, const std::vector<App>& apps) {
  uint64_t diskBytes = 0;
  XmlOut xml(out / "fingerprint.xml");
  xml << "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<trl_fingerprintdata>\n";
  std::vector<uint8_t> content;
  size_t versionId = 0;
  for (size_t i = 0; i < apps.size(); ++i) {
    const App& app = apps[i];
    const size_t number = i + 1;
    xml << "  <a";
    xml.Attr("a_id", number).Attr("a_name", app.name) << ">\n";
    for (int v = 1; v <= kVersions; ++v) {
      const bool install = Installed(number) && v == InstalledVersion(number);
      if (install) {
        for (const AppFile& file : app.files) {
          std::error_code ec;
          fs::create_directories(DiskFolder(disk, app, file.relpath), ec);
          if (ec) Fail("create " + DiskFolder(disk, app, file.relpath).string(), ec.message());
        }
      }
      xml << "    <v";
      xml.Attr("v_id", ++versionId).Attr("v_name", app.versions[v - 1]).Attr("v_seq", v) << ">\n";
      for (size_t f = 0; f < app.files.size(); ++f) {
        const AppFile& file = app.files[f];
        const uint32_t size = file.sizes[v - 1];
        std::string digest;
        if (install) {
          Content(number, v, f, size, content);
          WriteFile(DiskFolder(disk, app, file.relpath) / file.name, content);
          diskBytes += size;
          digest = Md5Hex(content);
        } else {
          digest = RandomDigest(number, v, f);
        }
        xml << "      <f";
        xml.Attr("f_id", f + 1)
            .Attr("f_name", file.name)
            .Attr("f_relpath", file.relpath)
            .Attr("f_weight", file.weightless ? "0" : "1");
        xml << ">\n        <p p_type=\"2\" p_weight=\"1\"";
        xml.Attr("p_value", size) << "/>\n        <p p_type=\"3\" p_weight=\"2\"";
        xml.Attr("p_value", digest) << "/>\n      </f>\n";
        xml.MaybeFlush();
      }
      xml << "    </v>\n";
    }
    xml << "  </a>\n";
  }
  xml << "</trl_fingerprintdata>\n";
  xml.Close();
  return diskBytes;
}

// A folder of local-files.xml, planned before any of its files are drawn so the folders can be
// written in path order with their files streamed.
struct LocalFolder {
  enum class Kind { kInstalled, kFitting, kFiller };

  std::string text;  // as d_text: starts and ends with a backslash
  std::string name;  // lower-cased text, the sort key
  Kind kind = Kind::kFiller;
  size_t app = 0;       // index into the applications, for kInstalled and kFitting
  std::string relpath;  // of the application's files placed here, for kInstalled and kFitting
  size_t files = 0;
  size_t fitting = 0;  // fingerprint names that fit this folder, for kFitting
  uint64_t start = 0;
};

// A product folder name of software that is not in the fingerprint, like "Render Host 3".
std::string OtherProduct(Rng& rng) {
  return Join({rng.Pick(kStemWords), " ", rng.Pick(kStemWords), " ", Number(rng, 40)});
}

// A filler folder path without the trailing backslash, looking like other software's.
std::string FillerFolder(Rng& rng) {
  const std::string product = OtherProduct(rng);
  const size_t roll = rng.Below(100);
  std::string text;
  if (roll < 40) {
    text = "\\Program Files\\" + product;
  } else if (roll < 55) {
    text = Join({"\\Program Files (x86)\\", rng.Pick(kStemWords), " Software\\", product});
  } else if (roll < 70) {
    static constexpr char kHex[] = "0123456789abcdef";
    std::string hash;
    for (int i = 0; i < 16; ++i) hash += kHex[rng.Below(16)];
    return Join({"\\Windows\\WinSxS\\", rng.Chance(70) ? "amd64" : "x86", "_",
                 Lower(rng.Pick(kStemWords)), "-", Lower(rng.Pick(kStemWords)), "_", hash});
  } else if (roll < 80) {
    return "\\ProgramData\\" + product + "\\" +
           std::string(rng.Chance(50) ? "Cache" : (rng.Chance(50) ? "Logs" : "Config"));
  } else if (roll < 90) {
    return "\\Users\\Public\\Documents\\" + product;
  } else {
    return std::string(rng.Pick(kSystemFolders));
  }
  if (rng.Chance(60)) text += "\\" + std::string(rng.Pick(kSubfolders));
  return text;
}

// True when a folder (lower-cased, ending in a backslash) could hold a file at one of `relpaths`
// (lower-cased) below an application folder.
bool Fits(std::string_view folderName, const std::vector<std::string>& relpaths) {
  return std::any_of(relpaths.begin(), relpaths.end(), [&](const std::string& relpath) {
    return relpath.empty() || folderName.ends_with("\\" + relpath + "\\");
  });
}

struct LocalTotals {
  size_t files = 0;
  size_t misplaced = 0;
  size_t fitting = 0;
};

class LocalFilesWriter {
 public:
  LocalFilesWriter(const std::vector<App>& apps, size_t localFiles)
      : apps_(apps), localFiles_(localFiles) {
    for (const App& app : apps_) {
      for (const AppFile& file : app.files) {
        relpathsByName_[Lower(file.name)].push_back(Lower(file.relpath));
      }
    }
    // A name that some application keeps in its own folder fits every folder, so it cannot be
    // misplaced.
    for (size_t i = 0; i < apps_.size(); ++i) {
      if (Installed(i + 1)) continue;
      for (size_t f = 0; f < apps_[i].files.size(); ++f) {
        const std::vector<std::string>& relpaths = relpathsByName_[Lower(apps_[i].files[f].name)];
        if (std::find(relpaths.begin(), relpaths.end(), "") == relpaths.end()) {
          misplaceable_.emplace_back(i, f);
        }
      }
    }
  }

  LocalTotals Write(const fs::path& out, const fs::path& disk) {
    PlanFolders();
    XmlOut xml(out / "local-files.xml");
    const std::string drive = disk.string();
    xml << "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<trl_applicationdata";
    xml.Attr("search_start", "2026-01-01 00:00:00").Attr("search_end", "2026-01-01 00:10:00");
    xml << ">\n  <c c_id=\"1\" c_text=\"localhost\" c_name=\"localhost\" c_local=\"1\">\n    <m";
    xml.Attr("m_id", 1).Attr("m_text", drive).Attr("m_name", trl::Schema().EncodeName(drive))
        << ">\n";
    for (size_t d = 0; d < folders_.size(); ++d) {
      const LocalFolder& folder = folders_[d];
      xml << "      <d";
      xml.Attr("d_id", d + 1).Attr("d_text", folder.text).Attr("d_name", folder.name) << ">\n";
      WriteFiles(folder, xml);
      xml << "      </d>\n";
    }
    xml << "    </m>\n  </c>\n</trl_applicationdata>\n";
    xml.Close();
    return totals_;
  }

 private:
  void PlanFolders() {
    std::unordered_set<std::string> taken;
    size_t installedFiles = 0;
    for (size_t i = 0; i < apps_.size(); ++i) {
      if (!Installed(i + 1)) continue;
      std::vector<std::string> relpaths;
      for (const AppFile& file : apps_[i].files) {
        if (std::find(relpaths.begin(), relpaths.end(), file.relpath) == relpaths.end()) {
          relpaths.push_back(file.relpath);
        }
      }
      for (const std::string& relpath : relpaths) {
        LocalFolder folder;
        folder.text = AppFolderText(apps_[i], relpath);
        folder.kind = LocalFolder::Kind::kInstalled;
        folder.app = i;
        folder.relpath = relpath;
        folder.files = static_cast<size_t>(
            std::count_if(apps_[i].files.begin(), apps_[i].files.end(),
                          [&](const AppFile& file) { return file.relpath == relpath; }));
        installedFiles += folder.files;
        Add(std::move(folder), taken);
      }
    }
    if (installedFiles > localFiles_) {
      std::fprintf(stderr,
                   "make_compare_data: LOCAL_FILES must be at least %zu, the installed files\n",
                   installedFiles);
      std::exit(2);
    }

    // Every 10th filler folder holds 1 to 3 fingerprint names that fit it; with about 20 files a
    // folder that makes about 1% of the filler.
    Rng rng(StartFor(2, 0));
    size_t left = localFiles_ - installedFiles;
    for (size_t n = 0; left > 0; ++n) {
      LocalFolder folder;
      folder.files = std::min(left, 10 + rng.Below(21));
      left -= folder.files;
      folder.start = rng.Next();
      std::string text;
      if (n % 10 == 9) {
        size_t app;
        do {
          app = rng.Below(apps_.size());
        } while (Installed(app + 1));
        folder.kind = LocalFolder::Kind::kFitting;
        folder.app = app;
        folder.relpath = apps_[app].files[rng.Below(kFilesPerVersion)].relpath;
        const auto available = static_cast<size_t>(
            std::count_if(apps_[app].files.begin(), apps_[app].files.end(),
                          [&](const AppFile& file) { return file.relpath == folder.relpath; }));
        folder.fitting = std::min({rng.Below(3) + 1, available, folder.files});
        // Named like other software, so the folder exists only in the listing.
        do {
          text = "\\Program Files\\" + OtherProduct(rng);
          if (!folder.relpath.empty()) text += "\\" + folder.relpath;
        } while (taken.contains(Lower(text)));
      } else {
        do {
          text = FillerFolder(rng);
        } while (taken.contains(Lower(text)));
      }
      folder.text = text + "\\";
      Add(std::move(folder), taken);
    }
    std::sort(folders_.begin(), folders_.end(),
              [](const LocalFolder& a, const LocalFolder& b) { return a.name < b.name; });
  }

  static std::string AppFolderText(const App& app, const std::string& relpath) {
    std::string text = "\\Program Files\\" + app.folder + "\\";
    if (!relpath.empty()) text += relpath + "\\";
    return text;
  }

  void Add(LocalFolder folder, std::unordered_set<std::string>& taken) {
    folder.name = Lower(folder.text);
    std::string key = folder.name;
    key.pop_back();  // the trailing backslash, so keys compare like the filler drafts
    taken.insert(std::move(key));
    folders_.push_back(std::move(folder));
  }

  void WriteFiles(const LocalFolder& folder, XmlOut& xml) {
    std::unordered_set<std::string> names;
    size_t written = 0;
    auto emit = [&](const std::string& text) {
      xml << "        <f";
      xml.Attr("f_id", ++totals_.files).Attr("f_text", text).Attr("f_name", Lower(text)) << "/>\n";
      xml.MaybeFlush();
      ++written;
    };

    const App& app = apps_[folder.app];
    if (folder.kind == LocalFolder::Kind::kInstalled) {
      for (const AppFile& file : app.files) {
        if (file.relpath == folder.relpath) emit(file.name);
      }
      return;
    }

    Rng rng(folder.start);
    if (folder.kind == LocalFolder::Kind::kFitting) {
      std::vector<size_t> candidates;
      for (size_t f = 0; f < app.files.size(); ++f) {
        if (app.files[f].relpath == folder.relpath) candidates.push_back(f);
      }
      for (size_t k = 0; k < folder.fitting; ++k) {
        std::swap(candidates[k], candidates[k + rng.Below(candidates.size() - k)]);
        const std::string& name = app.files[candidates[k]].name;
        names.insert(Lower(name));
        emit(name);
        ++totals_.fitting;
      }
    }

    while (written < folder.files) {
      if (rng.Chance(5) && !misplaceable_.empty()) {
        const auto [a, f] = misplaceable_[rng.Below(misplaceable_.size())];
        const AppFile& file = apps_[a].files[f];
        const std::string lower = Lower(file.name);
        // A draw that fits the folder for any application with the name, or repeats a name in the
        // folder, gives way to plain filler.
        if (!Fits(folder.name, relpathsByName_.at(lower)) && names.insert(lower).second) {
          emit(file.name);
          ++totals_.misplaced;
          continue;
        }
      }
      std::string name;
      do {
        name = FillerName(rng);
      } while (relpathsByName_.contains(Lower(name)) || !names.insert(Lower(name)).second);
      emit(name);
    }
  }

  const std::vector<App>& apps_;
  const size_t localFiles_;
  // The lower-cased relpaths of all fingerprint files, by lower-cased name.
  std::unordered_map<std::string, std::vector<std::string>> relpathsByName_;
  // (app, file) of the misplaceable files of the applications that are not installed.
  std::vector<std::pair<size_t, size_t>> misplaceable_;
  std::vector<LocalFolder> folders_;
  LocalTotals totals_;
};

[[noreturn]] void Usage() {
  std::fprintf(stderr, "usage: make_compare_data OUT_DIR APPS [LOCAL_FILES]\n");
  std::exit(2);
}

size_t ParseCount(const char* text) {
  char* end = nullptr;
  errno = 0;
  const unsigned long long value = std::strtoull(text, &end, 10);
  if (errno != 0 || end == text || *end != '\0' || text[0] == '-') Usage();
  return static_cast<size_t>(value);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3 || argc > 4) Usage();
  const size_t appCount = ParseCount(argv[2]);
  if (appCount == 0) Usage();
  const size_t localFiles = argc == 4 ? ParseCount(argv[3]) : appCount * 100;

  const auto started = std::chrono::steady_clock::now();
  std::error_code ec;
  const fs::path out = fs::absolute(argv[1], ec).lexically_normal();
  if (ec) Fail(std::string("resolve ") + argv[1], ec.message());
  // m_text is a drive prefix that folder texts are appended to, so it has no trailing separator.
  const fs::path disk = out / "disk";
  fs::remove_all(disk, ec);
  if (ec) Fail("remove " + disk.string(), ec.message());
  fs::create_directories(disk, ec);
  if (ec) Fail("create " + disk.string(), ec.message());

  const std::vector<App> apps = PlanApps(appCount);
  const uint64_t diskBytes = WriteFingerprint(out, disk, apps);
  const LocalTotals local = LocalFilesWriter(apps, localFiles).Write(out, disk);
  const double seconds =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();

  std::printf(
      "make_compare_data: %zu applications, %zu fingerprint files, %zu local files (%zu misplaced, "
      "%zu fitting but not on disk), %zu installed applications, %llu bytes on disk, %.1f s\n",
      apps.size(), apps.size() * kVersions * kFilesPerVersion, local.files, local.misplaced,
      local.fitting, apps.size() / kInstallEvery, static_cast<unsigned long long>(diskBytes),
      seconds);
  return 0;
}
