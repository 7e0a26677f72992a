#include "chunk_writer.h"

#include <unistd.h>

#include <cerrno>
#include <system_error>

namespace trl::cli {

bool WriteAll(int fd, const char* data, size_t size) {
  while (size > 0) {
    ssize_t written = ::write(fd, data, size);
    if (written < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    data += written;
    size -= static_cast<size_t>(written);
  }
  return true;
}

ChunkWriter::ChunkWriter(int fd, size_t chunkSize) : fd_(fd), chunkSize_(chunkSize) {
  // Room for a chunk and a piece beyond it, in both buffers: they change places at each hand-over.
  gathering_.reserve(chunkSize_ + (chunkSize_ >> 2));
  writing_.reserve(gathering_.capacity());
  try {
    writer_ = std::thread([this] { Run(); });
  } catch (const std::system_error&) {
    // Written as it is gathered.
  }
}

ChunkWriter::~ChunkWriter() {
  if (writer_.joinable()) {
    {
      std::lock_guard lock(mutex_);
      stop_ = true;
    }
    changed_.notify_all();
    writer_.join();
  }
}

void ChunkWriter::Put(std::string_view piece) {
  gathering_ += piece;
  if (gathering_.size() >= chunkSize_) Hand();
}

bool ChunkWriter::Finish() {
  Hand();
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [this] { return !handed_; });
  errno = error_;
  return error_ == 0;
}

void ChunkWriter::Hand() {
  if (!writer_.joinable()) {
    Write(gathering_);
    gathering_.clear();
    return;
  }
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [this] { return !handed_; });
  writing_.swap(gathering_);
  gathering_.clear();
  handed_ = true;
  lock.unlock();
  changed_.notify_all();
}

void ChunkWriter::Run() {
  std::unique_lock lock(mutex_);
  for (;;) {
    changed_.wait(lock, [this] { return stop_ || handed_; });
    if (!handed_) return;
    lock.unlock();
    Write(writing_);
    lock.lock();
    handed_ = false;
    changed_.notify_all();
  }
}

void ChunkWriter::Write(const std::string& chunk) {
  if (error_ == 0 && !WriteAll(fd_, chunk.data(), chunk.size())) error_ = errno;
}

}  // namespace trl::cli
