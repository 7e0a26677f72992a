#include "compare/local_file_index.h"

#include <algorithm>
#include <functional>
#include <utility>

#include "platform/failure.h"
#include "platform/text.h"
#include "schema/schema.h"

namespace trl {
namespace {

// The key as the index holds it: lower-cased, without a copy when it is lower-case ASCII already.
std::string_view Key(std::string_view name, std::string& lowered) {
  bool plain = std::all_of(name.begin(), name.end(), [](char c) {
    return static_cast<unsigned char>(c) < 0x80 && !(c >= 'A' && c <= 'Z');
  });
  if (plain) return name;
  lowered = LowerCase(name);
  return lowered;
}

}  // namespace

const std::string& LocalFileRecord::Machine() const {
  const auto& record = index_->records_[record_];
  return index_->drives_[index_->folders_[record.folder].drive].machine;
}

const std::string& LocalFileRecord::EncodedMachine() const {
  const auto& record = index_->records_[record_];
  return index_->drives_[index_->folders_[record.folder].drive].encodedMachine;
}

bool LocalFileRecord::LocalMachine() const {
  const auto& record = index_->records_[record_];
  return index_->drives_[index_->folders_[record.folder].drive].localMachine;
}

const std::string& LocalFileRecord::Drive() const {
  const auto& record = index_->records_[record_];
  return index_->drives_[index_->folders_[record.folder].drive].drive;
}

const std::string& LocalFileRecord::EncodedDrive() const {
  const auto& record = index_->records_[record_];
  return index_->drives_[index_->folders_[record.folder].drive].encodedDrive;
}

uint32_t LocalFileRecord::DriveIndex() const {
  return index_->folders_[index_->records_[record_].folder].drive;
}

const std::string& LocalFileRecord::Folder() const {
  return index_->folders_[index_->records_[record_].folder].folder;
}

const std::string& LocalFileRecord::ExactFolder() const {
  return index_->folders_[index_->records_[record_].folder].exactFolder;
}

uint32_t LocalFileRecord::FolderIndex() const { return index_->records_[record_].folder; }

size_t LocalFileRecord::CaseExactFrom() const {
  return index_->folders_[index_->records_[record_].folder].caseExactFrom;
}

std::string_view LocalFileRecord::Filename() const {
  return index_->NameAt(index_->records_[record_].filename);
}

LocalFileIndex::Matches::Iterator& LocalFileIndex::Matches::Iterator::operator++() {
  record_ = index_->records_[record_].next;
  return *this;
}

void LocalFileIndex::KeepOnly(const std::vector<std::string>& keys) {
  // About 32 bits a key: one name in a few hundred that no fingerprint knows is kept.
  size_t bits = 1024;
  while (bits < 32 * keys.size()) bits *= 2;
  filter_.assign(bits / 64, 0);
  filterKeys_ = keys.size();
  std::string lowered;
  for (const std::string& key : keys) {
    uint64_t hash = Hash(IndexKey(key, lowered));
    for (uint64_t bit : {hash & (bits - 1), (hash >> 32) & (bits - 1)}) {
      filter_[bit / 64] |= uint64_t{1} << (bit % 64);
    }
  }
}

bool LocalFileIndex::FilterHolds(uint64_t hash) const {
  uint64_t mask = filter_.size() * 64 - 1;
  auto held = [&](uint64_t bit) { return (filter_[(bit & mask) / 64] >> (bit % 64) & 1) != 0; };
  return held(hash) && held(hash >> 32);
}

bool LocalFileIndex::Covers(std::string_view key) const {
  if (filter_.empty()) return true;
  std::string lowered;
  return FilterHolds(Hash(IndexKey(key, lowered)));
}

void LocalFileIndex::Reserve(size_t files) {
  if (!filter_.empty()) files = std::min(files, filterKeys_);
  records_.reserve(files);
  // Room for every file to have a name of its own: regrowing a table of millions of keys costs
  // more than the slots it would save.
  size_t slots = 64;
  while (slots < 2 * files) slots *= 2;
  if (slots > slots_.size()) Rehash(slots);
}

void LocalFileIndex::AddDrive(std::string machine, std::string encodedMachine, bool localMachine,
                              std::string drive, std::string encodedDrive) {
  drives_.push_back({std::move(machine),
                     std::move(encodedMachine),
                     localMachine,
                     std::move(drive),
                     std::move(encodedDrive),
                     {}});
}

void LocalFileIndex::AddLink(std::string link, std::string target) {
  if (drives_.empty()) AddDrive("", "", false, "", "");
  drives_.back().links.Add(std::move(link), std::move(target));
}

const std::vector<FolderAlias>& LocalFileIndex::AliasesOf(const LocalFileRecord& record) const {
  static const std::vector<FolderAlias> kNoAliases;
  const FolderEntry& folder = folders_[record.FolderIndex()];
  const FolderLinks& links = drives_[folder.drive].links;
  if (links.empty()) return kNoAliases;
  auto [at, added] = aliases_.try_emplace(record.FolderIndex());
  if (added) at->second = links.AliasesOf(folder.folder);
  return at->second;
}

void LocalFileIndex::AddFolder(std::string folder, std::string exactFolder, size_t caseExactFrom) {
  if (drives_.empty()) AddDrive("", "", false, "", "");
  AddFolder(std::move(folder), std::move(exactFolder), caseExactFrom,
            static_cast<uint32_t>(drives_.size() - 1));
}

void LocalFileIndex::AddFolder(std::string folder, std::string exactFolder, size_t caseExactFrom,
                               uint32_t drive) {
  // Listed only once a file in it is kept: most folders hold none when names are filtered.
  pendingFolder_ = FolderEntry{std::move(folder), std::move(exactFolder), drive, caseExactFrom};
}

void LocalFileIndex::AddFile(std::string_view filename, std::string_view encodedFilename) {
  std::string lowered;
  std::string_view key = IndexKey(encodedFilename, lowered);
  uint64_t hash64 = Hash(key);
  if (!filter_.empty() && !FilterHolds(hash64)) return;
  if (folders_.empty() && !pendingFolder_) AddFolder("", "");
  if (pendingFolder_) {
    folders_.push_back(std::move(*pendingFolder_));
    pendingFolder_.reset();
  }
  if (records_.size() >= kNone - 1) Fail(kOutOfMemory);
  if (2 * (keys_ + 1) > slots_.size()) Grow();
  // Room first, so that a failing allocation leaves no chain pointing past the records.
  if (records_.size() == records_.capacity()) records_.reserve(records_.size() * 2 + 64);
  auto record = static_cast<uint32_t>(records_.size());
  auto hash = static_cast<uint32_t>(hash64);
  Slot& slot = slots_[Probe(key, hash)];
  bool newKey = slot.first == kNone;
  // A key's text is kept once, with its slot; a name that equals it shares it.
  uint32_t keyAt = newKey ? AddName(key) : slot.key;
  uint32_t filenameAt = filename == key ? keyAt : AddName(filename);
  if (newKey) {
    slot = {hash, record, record, keyAt};
    ++keys_;
  } else {
    records_[slot.last].next = record;
    slot.last = record;
  }
  records_.push_back({static_cast<uint32_t>(folders_.size() - 1), kNone, filenameAt});
}

LocalFileIndex::Matches LocalFileIndex::Find(std::string_view key) const {
  if (slots_.empty()) return {};
  std::string lowered;
  std::string_view lookup = IndexKey(key, lowered);
  return {this, slots_[Probe(lookup, static_cast<uint32_t>(Hash(lookup)))].first};
}

std::string_view LocalFileIndex::IndexKey(std::string_view name, std::string& lowered) {
  return Schema::FoldedName(Key(name, lowered));
}

uint64_t LocalFileIndex::Hash(std::string_view key) { return std::hash<std::string_view>{}(key); }

std::string_view LocalFileIndex::NameAt(uint32_t offset) const { return {names_.data() + offset}; }

size_t LocalFileIndex::Probe(std::string_view key, uint32_t hash) const {
  size_t mask = slots_.size() - 1;
  for (size_t at = hash & mask;; at = (at + 1) & mask) {
    const Slot& slot = slots_[at];
    if (slot.first == kNone) return at;
    if (slot.hash == hash && TerminatedEquals(names_.data() + slot.key, key)) return at;
  }
}

void LocalFileIndex::Grow() { Rehash(std::max<size_t>(64, 2 * slots_.size())); }

void LocalFileIndex::Rehash(size_t size) {
  std::vector<Slot> old = std::exchange(slots_, std::vector<Slot>(size));
  size_t mask = slots_.size() - 1;
  for (const Slot& slot : old) {
    if (slot.first == kNone) continue;
    size_t at = slot.hash & mask;
    while (slots_[at].first != kNone) at = (at + 1) & mask;
    slots_[at] = slot;
  }
}

uint32_t LocalFileIndex::AddName(std::string_view name) {
  // Offsets are 32-bit.
  if (names_.size() + name.size() + 1 >= kNone) Fail(kOutOfMemory);
  auto at = static_cast<uint32_t>(names_.size());
  names_.append(name);
  names_.push_back('\0');
  return at;
}

}  // namespace trl
