#pragma once

#include <condition_variable>
#include <cstddef>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>

namespace trl::cli {

// write(2) until all of `size` bytes are written; false with errno set when one fails.
bool WriteAll(int fd, const char* data, size_t size);

// Gathers a text into large chunks and writes each on a thread of its own while the next one is
// gathered, so that making a large text and writing it overlap. Without a thread, it writes as it
// goes. After a failed write the rest is passed over.
class ChunkWriter {
 public:
  explicit ChunkWriter(int fd, size_t chunkSize = size_t{256} << 10);
  ~ChunkWriter();
  ChunkWriter(const ChunkWriter&) = delete;
  ChunkWriter& operator=(const ChunkWriter&) = delete;

  void Put(std::string_view piece);
  // Writes what is gathered and waits for every write: false with errno set when one failed.
  bool Finish();

 private:
  void Run();
  // Hands the gathered chunk over (or writes it, without a thread).
  void Hand();
  void Write(const std::string& chunk);

  const int fd_;
  const size_t chunkSize_;
  std::string gathering_;
  std::mutex mutex_;
  std::condition_variable changed_;
  std::string writing_;  // the chunk handed over, empty once written
  bool handed_ = false;
  bool stop_ = false;
  int error_ = 0;  // of the first failed write
  std::thread writer_;
};

}  // namespace trl::cli
