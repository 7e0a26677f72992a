#include "compare/local_file_index.h"

#include <cstring>

#include "platform/failure.h"
#include "platform/text.h"

namespace trl {

int32_t LocalFileRecord::FileID() const { return index_->records_[record_].fileId; }

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

const std::string& LocalFileRecord::Folder() const {
  return index_->folders_[index_->records_[record_].folder].folder;
}

const std::string& LocalFileRecord::EncodedFolder() const {
  return index_->folders_[index_->records_[record_].folder].encodedFolder;
}

std::string_view LocalFileRecord::Filename() const {
  const auto& record = index_->records_[record_];
  if (record.filename == LocalFileIndex::kNone) return *record.encodedFilename;
  return {index_->names_.data() + record.filename};
}

std::string_view LocalFileRecord::EncodedFilename() const {
  return *index_->records_[record_].encodedFilename;
}

std::string LocalFileRecord::FullPath() const {
  std::string path;
  if (!LocalMachine()) path = "\\\\" + Machine() + "\\";
  path += Drive();
  path += Folder();
  path += Filename();
  return path;
}

LocalFileIndex::Matches::Iterator& LocalFileIndex::Matches::Iterator::operator++() {
  record_ = index_->records_[record_].next;
  return *this;
}

size_t LocalFileIndex::Matches::size() const {
  size_t count = 0;
  for (uint32_t at = first_; at != kNone; at = index_->records_[at].next) ++count;
  return count;
}

void LocalFileIndex::AddDrive(std::string machine, std::string encodedMachine, bool localMachine,
                              std::string drive, std::string encodedDrive) {
  drives_.push_back({std::move(machine), std::move(encodedMachine), localMachine, std::move(drive),
                     std::move(encodedDrive)});
}

void LocalFileIndex::AddFolder(std::string folder, std::string encodedFolder) {
  if (drives_.empty()) AddDrive("", "", false, "", "");
  folders_.push_back(
      {std::move(folder), std::move(encodedFolder), static_cast<uint32_t>(drives_.size() - 1)});
}

void LocalFileIndex::AddFile(int32_t fileId, std::string_view filename,
                             std::string_view encodedFilename) {
  if (folders_.empty()) AddFolder("", "");
  // Record numbers and name offsets are 32-bit; kNone stays free as the end mark.
  if (records_.size() >= kNone - 1 || names_.size() + filename.size() >= kNone - 1) {
    Fail(kOutOfMemory);
  }
  // Room first, so that a failing allocation leaves no chain pointing past the records.
  if (records_.size() == records_.capacity()) records_.reserve(records_.size() * 2 + 64);
  auto record = static_cast<uint32_t>(records_.size());
  auto [entry, added] = byName_.try_emplace(LowerCase(encodedFilename), Chain{record, record});
  if (!added) records_[entry->second.last].next = record;
  entry->second.last = record;

  Record& stored = records_.emplace_back(
      Record{fileId, static_cast<uint32_t>(folders_.size() - 1), kNone, kNone, &entry->first});
  if (filename != entry->first) {
    stored.filename = static_cast<uint32_t>(names_.size());
    names_.append(filename);
    names_.push_back('\0');
  }
}

LocalFileIndex::Matches LocalFileIndex::Find(std::string_view key) const {
  auto found = byName_.find(LowerCase(key));
  return {this, found == byName_.end() ? kNone : found->second.first};
}

}  // namespace trl
