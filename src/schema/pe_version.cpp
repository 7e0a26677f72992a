#include "schema/pe_version.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

namespace trl {
namespace {

using Bytes = std::vector<unsigned char>;

constexpr uint64_t kDosHeaderSize = 64;
constexpr uint64_t kLfanewOffset = 0x3C;
constexpr uint64_t kPeSignatureAndCoffSize = 24;
constexpr uint64_t kSectionHeaderSize = 40;
constexpr uint16_t kPe32Magic = 0x10B;
constexpr uint16_t kPe32PlusMagic = 0x20B;
constexpr uint64_t kPe32DirectoriesOffset = 96;
constexpr uint64_t kPe32PlusDirectoriesOffset = 112;
constexpr uint32_t kResourceDirectoryIndex = 2;
constexpr uint64_t kResourceDirectoryHeaderSize = 16;
constexpr uint64_t kResourceEntrySize = 8;
constexpr uint64_t kResourceDataEntrySize = 16;
constexpr uint32_t kVersionResourceType = 16;
constexpr uint32_t kHighBit = 0x80000000U;
constexpr uint32_t kFixedFileInfoSignature = 0xFEEF04BD;
constexpr uint64_t kFixedFileInfoSize = 52;
constexpr std::u16string_view kVersionKey{u"VS_VERSION_INFO", 16};  // with its terminating zero
// VS_VERSIONINFO: three words, the key, then the fixed file information at a 4-byte boundary.
constexpr uint64_t kVersionKeyOffset = 6;
constexpr uint64_t kFixedFileInfoOffset =
    (kVersionKeyOffset + kVersionKey.size() * 2 + 3) & ~uint64_t{3};
constexpr uint64_t kVersionBlockMinimum = kFixedFileInfoOffset + kFixedFileInfoSize;

uint16_t U16(const Bytes& bytes, uint64_t at) {
  return static_cast<uint16_t>(bytes[at] | (bytes[at + 1] << 8));
}

uint32_t U32(const Bytes& bytes, uint64_t at) {
  return static_cast<uint32_t>(U16(bytes, at)) | (static_cast<uint32_t>(U16(bytes, at + 2)) << 16);
}

struct Section {
  uint32_t virtualAddress;
  uint32_t rawSize;
  uint32_t rawPointer;
};

struct ResourceEntry {
  uint32_t name;  // an id, or a name offset with the high bit set
  uint32_t data;  // a data entry offset, or a subdirectory offset with the high bit set

  bool IsDirectory() const { return (data & kHighBit) != 0; }
  uint32_t Offset() const { return data & ~kHighBit; }
};

// The image as far as the file holds it: a read either yields every byte asked for or nothing.
class Image {
 public:
  explicit Image(fs::FileReader& reader) : reader_(reader), size_(reader.Size()) {}

  std::optional<Bytes> Read(uint64_t offset, uint64_t count) {
    if (offset > size_ || count > size_ - offset) return std::nullopt;
    Bytes bytes(count);
    uint64_t done = 0;
    while (done < count) {
      size_t got = reader_.ReadAt(offset + done, bytes.data() + done, count - done);
      if (got == 0) return std::nullopt;
      done += got;
    }
    return bytes;
  }

  // The file offset of `count` bytes at relative virtual address `rva`, when one section's raw
  // data holds all of them.
  std::optional<uint64_t> Map(uint64_t rva, uint64_t count) const {
    for (const Section& section : sections_) {
      if (rva < section.virtualAddress) continue;
      uint64_t into = rva - section.virtualAddress;
      if (into < section.rawSize && count <= section.rawSize - into) {
        return uint64_t{section.rawPointer} + into;
      }
    }
    return std::nullopt;
  }

  std::optional<Bytes> ReadVirtual(uint64_t rva, uint64_t count) {
    auto offset = Map(rva, count);
    if (!offset) return std::nullopt;
    return Read(*offset, count);
  }

  void AddSection(Section section) { sections_.push_back(section); }

 private:
  fs::FileReader& reader_;
  uint64_t size_;
  std::vector<Section> sections_;
};

// Reads the headers and the section table; returns the resource directory's RVA (0 for none).
std::optional<uint32_t> ReadHeaders(Image& image) {
  auto dos = image.Read(0, kDosHeaderSize);
  if (!dos || (*dos)[0] != 'M' || (*dos)[1] != 'Z') return std::nullopt;
  uint64_t peOffset = U32(*dos, kLfanewOffset);

  auto coff = image.Read(peOffset, kPeSignatureAndCoffSize);
  if (!coff || U32(*coff, 0) != 0x00004550) return std::nullopt;  // "PE\0\0"
  uint16_t sectionCount = U16(*coff, 6);
  uint16_t optionalSize = U16(*coff, 20);

  auto optional = image.Read(peOffset + kPeSignatureAndCoffSize, optionalSize);
  if (!optional || optionalSize < 2) return std::nullopt;
  uint64_t directories = 0;
  switch (U16(*optional, 0)) {
    case kPe32Magic:
      directories = kPe32DirectoriesOffset;
      break;
    case kPe32PlusMagic:
      directories = kPe32PlusDirectoriesOffset;
      break;
    default:
      return std::nullopt;
  }
  uint64_t resourceEntry = directories + kResourceDirectoryIndex * 8;
  if (optionalSize < resourceEntry + 8) return std::nullopt;
  if (U32(*optional, directories - 4) <= kResourceDirectoryIndex) return std::nullopt;

  uint64_t tableOffset = peOffset + kPeSignatureAndCoffSize + optionalSize;
  auto table = image.Read(tableOffset, sectionCount * kSectionHeaderSize);
  if (!table) return std::nullopt;
  for (uint64_t i = 0; i < sectionCount; ++i) {
    uint64_t at = i * kSectionHeaderSize;
    image.AddSection({U32(*table, at + 12), U32(*table, at + 16), U32(*table, at + 20)});
  }
  return U32(*optional, resourceEntry);
}

// The entries of the resource directory `offset` bytes into the resource data at `base`.
std::optional<std::vector<ResourceEntry>> ReadDirectory(Image& image, uint64_t base,
                                                        uint64_t offset) {
  auto header = image.ReadVirtual(base + offset, kResourceDirectoryHeaderSize);
  if (!header) return std::nullopt;
  uint64_t count = uint64_t{U16(*header, 12)} + U16(*header, 14);
  auto raw =
      image.ReadVirtual(base + offset + kResourceDirectoryHeaderSize, count * kResourceEntrySize);
  if (!raw) return std::nullopt;
  std::vector<ResourceEntry> entries;
  entries.reserve(count);
  for (uint64_t i = 0; i < count; ++i) {
    entries.push_back({U32(*raw, i * 8), U32(*raw, i * 8 + 4)});
  }
  return entries;
}

// The RVA and size of the first version resource: type 16, its first name, its first language.
// The walk is exactly three levels deep, so a directory that points back at itself cannot loop.
std::optional<std::pair<uint32_t, uint32_t>> FindVersionResource(Image& image, uint32_t base) {
  auto types = ReadDirectory(image, base, 0);
  if (!types) return std::nullopt;
  auto type = std::find_if(types->begin(), types->end(), [](const ResourceEntry& entry) {
    return entry.name == kVersionResourceType && entry.IsDirectory();
  });
  if (type == types->end()) return std::nullopt;

  auto names = ReadDirectory(image, base, type->Offset());
  if (!names || names->empty() || !names->front().IsDirectory()) return std::nullopt;
  auto languages = ReadDirectory(image, base, names->front().Offset());
  if (!languages || languages->empty() || languages->front().IsDirectory()) return std::nullopt;

  auto data =
      image.ReadVirtual(uint64_t{base} + languages->front().Offset(), kResourceDataEntrySize);
  if (!data) return std::nullopt;
  return std::pair{U32(*data, 0), U32(*data, 4)};
}

// "a.b.c.d" from the start of a VS_VERSIONINFO block (kVersionBlockMinimum bytes).
std::string FormatFileVersion(const Bytes& block) {
  if (U16(block, 0) < kVersionBlockMinimum || U16(block, 2) < kFixedFileInfoSize) return "";
  for (size_t i = 0; i < kVersionKey.size(); ++i) {
    if (U16(block, kVersionKeyOffset + i * 2) != kVersionKey[i]) return "";
  }
  if (U32(block, kFixedFileInfoOffset) != kFixedFileInfoSignature) return "";
  uint32_t high = U32(block, kFixedFileInfoOffset + 8);
  uint32_t low = U32(block, kFixedFileInfoOffset + 12);
  return fmt::format("{}.{}.{}.{}", high >> 16, high & 0xFFFF, low >> 16, low & 0xFFFF);
}

}  // namespace

std::string ReadPeFileVersion(fs::FileReader& reader) {
  Image image(reader);
  auto resources = ReadHeaders(image);
  if (!resources || *resources == 0) return "";
  auto version = FindVersionResource(image, *resources);
  if (!version || version->second < kVersionBlockMinimum) return "";
  auto block = image.ReadVirtual(version->first, kVersionBlockMinimum);
  return block ? FormatFileVersion(*block) : "";
}

}  // namespace trl
