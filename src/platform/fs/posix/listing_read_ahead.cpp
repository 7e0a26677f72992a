#include "platform/fs/posix/listing_read_ahead.h"

#include <unistd.h>

#include <algorithm>
#include <system_error>

namespace trl::fs::posix {
namespace {

// The folders on the read-ahead's way down, kept open so that each subfolder is opened from its
// parent: one name for the system to look up instead of every name of its path.
class OpenFolders {
 public:
  OpenFolders() = default;
  ~OpenFolders() { CloseAbove(0); }
  OpenFolders(const OpenFolders&) = delete;
  OpenFolders& operator=(const OpenFolders&) = delete;

  // `folder`, opened from its parent when that is open. Folders opened after the parent are
  // closed: a depth-first walk has left them.
  FolderEntries Open(const FolderPlace& folder) {
    const auto& parent = folder.Parent();
    auto at = std::find_if(open_.rbegin(), open_.rend(),
                           [&](const Held& held) { return parent && held.place == parent; });
    CloseAbove(static_cast<size_t>(open_.rend() - at));
    if (open_.empty()) return FolderEntries(folder.Native());
    return FolderEntries(open_.back().descriptor, folder.NativeName());
  }
  // Keeps `folder` open for its subfolders.
  void Keep(std::shared_ptr<const FolderPlace> folder, FolderEntries& entries) {
    if (open_.size() < kMaxOpen) {
      int descriptor = entries.Release();
      if (descriptor >= 0) open_.push_back({std::move(folder), descriptor});
    }
  }

 private:
  // Deeper folders are opened by their paths: descriptors are a limited resource.
  static constexpr size_t kMaxOpen = 32;

  struct Held {
    std::shared_ptr<const FolderPlace> place;
    int descriptor;
  };

  void CloseAbove(size_t keep) {
    while (open_.size() > keep) {
      ::close(open_.back().descriptor);
      open_.pop_back();
    }
  }

  std::vector<Held> open_;
};

}  // namespace

ListingReadAhead::~ListingReadAhead() {
  {
    std::lock_guard lock(mutex_);
    stop_ = true;
  }
  work_.notify_one();
  if (reader_.joinable()) reader_.join();
}

FolderListing ListingReadAhead::Take(const std::shared_ptr<FolderPlace>& folder) {
  if (auto held = TakeHeld(folder)) return std::move(*held);
  std::unique_lock lock(mutex_);
  if (!StartReader()) {
    lock.unlock();
    return ListFolder(folder);
  }
  bool asked = false;
  for (;;) {
    TakeOverReady();
    auto found = std::find_if(held_.begin(), held_.end(),
                              [&](const Ready& ready) { return ready.folder == folder; });
    if (found != held_.end()) {
      lock.unlock();
      return *TakeHeld(folder);
    }
    if (!asked) {
      // Everything held comes before `folder` in walk order, or belongs to a walk left behind.
      held_.clear();
      ReadNext(folder);
      asked = true;
    }
    walkWaiting_ = true;
    listed_.wait(lock);
    walkWaiting_ = false;
  }
}

std::optional<FolderListing> ListingReadAhead::TakeHeld(
    const std::shared_ptr<FolderPlace>& folder) {
  auto found = std::find_if(held_.begin(), held_.end(),
                            [&](const Ready& ready) { return ready.folder == folder; });
  if (found == held_.end()) return std::nullopt;
  std::optional<FolderListing> listing = std::move(found->listing);
  held_.erase(held_.begin(), found + 1);
  return listing ? std::move(*listing) : ListFolder(folder);
}

void ListingReadAhead::TakeOverReady() {
  for (Ready& ready : ready_) held_.push_back(std::move(ready));
  DropReady(ready_.end());
  for (auto& files : freed_) toFree_.push_back(std::move(files));
  freed_.clear();
  if (readerIdle_) work_.notify_one();
}

void ListingReadAhead::Recycle(Collection<File> files) {
  freed_.push_back(std::move(files));
  // Handed over now and then even when the walk finds its listings held.
  if (freed_.size() >= maxReadyFolders_) {
    std::lock_guard lock(mutex_);
    if (!reader_.joinable()) {
      freed_.clear();
      return;
    }
    for (auto& batch : freed_) toFree_.push_back(std::move(batch));
    freed_.clear();
  }
}

void ListingReadAhead::ReadNext(const std::shared_ptr<FolderPlace>& folder) {
  // Everything ready comes before `folder` in walk order, or belongs to a walk left behind.
  DropReady(ready_.end());
  if (reading_ == folder && !readingDropped_) return;
  readingDropped_ = reading_ != nullptr;
  // Folders above `folder` on the stack come before it: the walk passed them by. A folder the
  // read-ahead never met starts a new subtree on top; what lies below it may still be visited.
  auto at = std::find(toRead_.rbegin(), toRead_.rend(), folder);
  if (at != toRead_.rend()) {
    toRead_.erase(std::prev(at.base()), toRead_.end());
  }
  toRead_.push_back(folder);
  work_.notify_one();
}

bool ListingReadAhead::StartReader() {
  if (reader_.joinable()) return true;
  try {
    reader_ = std::thread([this] { Run(); });
  } catch (const std::system_error&) {
    return false;  // the walk lists for itself
  }
  return true;
}

void ListingReadAhead::DropReady(std::deque<Ready>::iterator end) {
  for (auto it = ready_.begin(); it != end; ++it) readyEntries_ -= it->entries;
  ready_.erase(ready_.begin(), end);
}

bool ListingReadAhead::HasRoom() const {
  return ready_.size() < maxReadyFolders_ && readyEntries_ < maxReadyEntries_;
}

void ListingReadAhead::Run() {
  OpenFolders open;
  std::unique_lock lock(mutex_);
  for (;;) {
    readerIdle_ = true;
    work_.wait(lock, [this] { return stop_ || (!toRead_.empty() && HasRoom()); });
    readerIdle_ = false;
    if (stop_) return;
    std::shared_ptr<FolderPlace> folder = std::move(toRead_.back());
    toRead_.pop_back();
    reading_ = folder;
    readingDropped_ = false;
    // A few folders' files at a time, about as many as each listing makes: freed in step with
    // the making, their memory is taken again from the allocator's fastest caches.
    std::vector<Collection<File>> toFree;
    for (int i = 0; i < 2 && !toFree_.empty(); ++i) {
      toFree.push_back(std::move(toFree_.back()));
      toFree_.pop_back();
    }
    lock.unlock();
    toFree.clear();
    std::optional<FolderListing> listing;
    try {
      FolderEntries entries = open.Open(*folder);
      listing = ListFolder(folder, entries);
      if (!listing->subFolders.empty()) open.Keep(folder, entries);
    } catch (const std::exception&) {
      // Left to the walk's thread, which lists the folder itself and meets the failure there.
    }
    lock.lock();
    reading_.reset();
    if (!readingDropped_) {
      size_t entries = 0;
      if (listing) {
        const auto& subFolders = listing->subFolders;
        for (auto sub = subFolders.rbegin(); sub != subFolders.rend(); ++sub) {
          toRead_.push_back(sub->place);
        }
        entries = listing->files.size() + subFolders.size();
      }
      readyEntries_ += entries;
      ready_.push_back({std::move(folder), std::move(listing), entries});
    }
    if (walkWaiting_) listed_.notify_one();
  }
}

}  // namespace trl::fs::posix
