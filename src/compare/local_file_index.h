#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "compare/folder_links.h"

namespace trl {

class LocalFileIndex;

// One local file of the index: where it is and what it is called. A light view into its index,
// valid while the index lives.
class LocalFileRecord {
 public:
  const std::string& Machine() const;
  const std::string& EncodedMachine() const;
  bool LocalMachine() const;
  const std::string& Drive() const;
  const std::string& EncodedDrive() const;
  // The listed drive the record is on: the same for every record of one drive entry.
  uint32_t DriveIndex() const;
  // The folder lower-cased, for fitting; the folder and the file name as the search wrote them,
  // for the path to the file itself.
  const std::string& Folder() const;
  const std::string& ExactFolder() const;
  std::string_view Filename() const;
  // The listed folder the record is in: the same for every record of one folder entry.
  uint32_t FolderIndex() const;
  // Where, in a folder the search told from a case sibling's, the case-kept part begins (see
  // Schema::EncodeExactName); npos for any other folder.
  size_t CaseExactFrom() const;

 private:
  friend class LocalFileIndex;
  LocalFileRecord(const LocalFileIndex* index, uint32_t record) : index_(index), record_(record) {}

  const LocalFileIndex* index_;
  uint32_t record_;
};

// The local files of a search flattened into records, in the order they were added, with an index
// from the encoded file name (regardless of case, and of the exact form a name with a case
// sibling has) to its records, also in the order added. The
// computer and drive of a record are shared with the other records of its drive and its folder
// with those of its folder, so that a record costs little more than its names.
class LocalFileIndex {
 public:
  // The records under one encoded name, in the order they were added.
  class Matches {
   public:
    class Iterator {
     public:
      LocalFileRecord operator*() const { return {index_, record_}; }
      Iterator& operator++();
      bool operator==(const Iterator& other) const { return record_ == other.record_; }

     private:
      friend class Matches;
      Iterator(const LocalFileIndex* index, uint32_t record) : index_(index), record_(record) {}
      const LocalFileIndex* index_;
      uint32_t record_;
    };

    Matches() = default;  // none

    Iterator begin() const { return {index_, first_}; }
    Iterator end() const { return {index_, kNone}; }
    bool empty() const { return first_ == kNone; }

   private:
    friend class LocalFileIndex;
    Matches(const LocalFileIndex* index, uint32_t first) : index_(index), first_(first) {}
    const LocalFileIndex* index_ = nullptr;
    uint32_t first_ = kNone;
  };

  // Keeps only the files whose encoded name may be one of `keys` (as Find is given them): a run
  // that asks for no other name needs no record of the rest, and most files on a disk have names
  // no fingerprint knows. Given before the first file.
  void KeepOnly(const std::vector<std::string>& keys);
  // Whether Find answers for `key` as it would without KeepOnly: whether a file of that encoded
  // name may be kept.
  bool Covers(std::string_view key) const;
  bool Filtered() const { return !filter_.empty(); }

  // Room for `files` records and as many names, made at once (with KeepOnly, for the names kept).
  void Reserve(size_t files);

  // The computer and drive of the records added next.
  void AddDrive(std::string machine, std::string encodedMachine, bool localMachine,
                std::string drive, std::string encodedDrive);
  // The folder of the records added next, on the last drive added (none yet: an empty one):
  // lower-cased and as written.
  void AddFolder(std::string folder, std::string exactFolder,
                 size_t caseExactFrom = std::string::npos);
  // The same on the drive added `drive`-th (from 0), rather than the last.
  void AddFolder(std::string folder, std::string exactFolder, size_t caseExactFrom, uint32_t drive);
  size_t Drives() const { return drives_.size(); }
  // A record in the last folder added (none yet: an empty one). The encoded name is kept
  // lower-cased and folded, the plain name as given.
  void AddFile(std::string_view filename, std::string_view encodedFilename);

  // A link to a folder on the last drive added (see FolderLinks).
  void AddLink(std::string link, std::string target);
  // Where the record's folder also stands through the links of its drive; worked out once per
  // folder.
  const std::vector<FolderAlias>& AliasesOf(const LocalFileRecord& record) const;

  // The records whose encoded file name equals `key`, letter case aside.
  Matches Find(std::string_view key) const;
  size_t Size() const { return records_.size(); }
  LocalFileRecord At(size_t record) const { return {this, static_cast<uint32_t>(record)}; }

 private:
  friend class LocalFileRecord;
  static constexpr uint32_t kNone = UINT32_MAX;

  struct DriveEntry {
    std::string machine, encodedMachine;
    bool localMachine;
    std::string drive, encodedDrive;
    FolderLinks links;
  };
  struct FolderEntry {
    std::string folder, exactFolder;
    uint32_t drive;
    size_t caseExactFrom;
  };
  // 12 bytes; the names are in `names_`, each followed by '\0'. The plain name shares its key's
  // text (kept once, with the key's slot) when they are equal, as they mostly are.
  struct Record {
    uint32_t folder;
    uint32_t next;  // the next record under the same key
    uint32_t filename;
  };
  // One key of the open-addressing table: the first and last records under it, and where its
  // text is, so a lookup touches no record. 16 bytes.
  struct Slot {
    uint32_t hash;
    uint32_t first = kNone;
    uint32_t last = kNone;
    uint32_t key;
  };

  // The name as the index keys it: lower-cased (into `lowered` when it must be), the exact form
  // of a name with a case sibling folded.
  static std::string_view IndexKey(std::string_view name, std::string& lowered);
  static uint64_t Hash(std::string_view key);
  // Two bits of the name filter per key, from its hash.
  bool FilterHolds(uint64_t hash) const;
  std::string_view NameAt(uint32_t offset) const;
  // The slot holding `key`, or the empty slot where it would go.
  size_t Probe(std::string_view key, uint32_t hash) const;
  void Grow();
  void Rehash(size_t size);  // a power of two
  uint32_t AddName(std::string_view name);

  std::vector<DriveEntry> drives_;
  std::vector<FolderEntry> folders_;
  std::vector<Record> records_;
  std::string names_;
  std::vector<Slot> slots_;  // a power of two in size, at most half full
  // The folder added last, until a file kept is in it.
  std::optional<FolderEntry> pendingFolder_;
  // Bits of the hashes of the keys kept (KeepOnly), a power of two of them; empty: every file.
  std::vector<uint64_t> filter_;
  size_t filterKeys_ = 0;
  mutable std::unordered_map<uint32_t, std::vector<FolderAlias>> aliases_;  // by folder
  size_t keys_ = 0;
};

}  // namespace trl
