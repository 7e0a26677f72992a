#pragma once

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

#include "platform/fs/posix/folder_listing.h"
#include "platform/fs/posix/folder_place.h"

namespace trl::fs::posix {

// Lists, on a thread of its own, the folders a depth-first walk is about to enter, in the order
// it will enter them: a folder's subfolders in listing order, each followed by its own subtree.
// The walk's thread then finds each listing ready, and the system calls of listing overlap with
// what the walk does with the entries. A walk that passes over a folder (a mask turned it away)
// or starts elsewhere drops what was read for the folders it left behind; the read-ahead then
// carries on from where the walk is. Only a bounded number of listings wait at any time.
// The walk takes over all listings that are ready at once and hands back files in batches: a lock
// (and a wake-up) per folder cost both threads more than listing a small folder does.
class ListingReadAhead {
 public:
  // At most `maxReadyFolders` listings, holding `maxReadyEntries` entries in all, wait at a time.
  // The defaults cover the walk's uneven pace and waste little when it passes a subtree by.
  explicit ListingReadAhead(size_t maxReadyFolders = 128, size_t maxReadyEntries = 1 << 15)
      : maxReadyFolders_(maxReadyFolders), maxReadyEntries_(maxReadyEntries) {}
  ~ListingReadAhead();
  ListingReadAhead(const ListingReadAhead&) = delete;
  ListingReadAhead& operator=(const ListingReadAhead&) = delete;

  // The listing of `folder`, read ahead or, when the walk came there unexpectedly, read now (on
  // the read-ahead thread, which goes on with its subfolders). Called by one thread only.
  FolderListing Take(const std::shared_ptr<FolderPlace>& folder);
  // Takes back files a listing made, to be freed on the read-ahead thread: freeing them costs the
  // walk's thread about as much as making them cost this one. Called by the thread that takes.
  void Recycle(Collection<File> files);

 private:
  struct Ready {
    std::shared_ptr<FolderPlace> folder;
    std::optional<FolderListing> listing;  // none when listing threw: the caller lists again
    size_t entries = 0;
  };

  // Whether the read-ahead thread runs, starting it if need be.
  bool StartReader();
  void Run();
  bool HasRoom() const;
  // Makes `folder` the next listing to read, dropping what was read or is being read before it.
  void ReadNext(const std::shared_ptr<FolderPlace>& folder);
  void DropReady(std::deque<Ready>::iterator end);
  // The listing of `folder` when the walk holds it, dropping those before it; none otherwise.
  std::optional<FolderListing> TakeHeld(const std::shared_ptr<FolderPlace>& folder);
  // Takes over every ready listing and hands over the files to free (under the lock).
  void TakeOverReady();

  const size_t maxReadyFolders_;
  const size_t maxReadyEntries_;
  std::mutex mutex_;
  std::condition_variable work_;    // the read-ahead thread waits for room or folders to read
  std::condition_variable listed_;  // the walk waits for the listing it needs
  std::deque<Ready> ready_;         // in walk order
  size_t readyEntries_ = 0;
  std::shared_ptr<FolderPlace> reading_;
  bool readingDropped_ = false;
  std::vector<std::shared_ptr<FolderPlace>> toRead_;  // a stack: the next folder to read is last
  std::vector<Collection<File>> toFree_;
  bool readerIdle_ = false;
  bool walkWaiting_ = false;
  bool stop_ = false;
  std::thread reader_;  // started by the first Take

  // The walk's own, touched without the lock.
  std::deque<Ready> held_;               // ready listings taken over, in walk order
  std::vector<Collection<File>> freed_;  // files to hand over for freeing
};

}  // namespace trl::fs::posix
