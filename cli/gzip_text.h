#pragma once

#include <zlib.h>

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace trl::cli {

// Whether the file at `path` begins as a gzip stream does (false when it cannot be read).
bool IsGzipFile(const std::string& path);

// The text the gzip file at `path` holds, stopping once more than `limit` bytes would come out
// (`over` is then set and the text is incomplete). Empty with a reason in `error` when the file
// cannot be read or is not a whole gzip stream.
std::string InflateFile(const std::string& path, size_t limit, bool& over, std::string& error);

// At most the first `size` bytes of the file at `path`, inflated when it is gzip; nothing when it
// cannot be read.
std::optional<std::string> ReadFileHead(const std::string& path, size_t size);

// Compresses a text given piece by piece into one gzip stream, handing the bytes to `out`.
class GzipWriter {
 public:
  explicit GzipWriter(std::function<void(std::string_view)> out);
  ~GzipWriter();
  GzipWriter(const GzipWriter&) = delete;
  GzipWriter& operator=(const GzipWriter&) = delete;

  void Put(std::string_view piece);
  void Finish();

 private:
  void Deflate(std::string_view piece, int flush);

  std::function<void(std::string_view)> out_;
  z_stream stream_{};
};

}  // namespace trl::cli
