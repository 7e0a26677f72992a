#include "gzip_text.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>

namespace trl::cli {
namespace {

constexpr size_t kBuffer = size_t{256} << 10;
constexpr int kGzipWindow = 15 + 16;  // zlib's way of asking for a gzip header and trailer

class InputFile {
 public:
  explicit InputFile(const std::string& path) : fd_(::open(path.c_str(), O_RDONLY | O_CLOEXEC)) {}
  ~InputFile() {
    if (fd_ >= 0) ::close(fd_);
  }
  InputFile(const InputFile&) = delete;
  InputFile& operator=(const InputFile&) = delete;
  bool Open() const { return fd_ >= 0; }
  // Bytes read into `buffer`: 0 at the end, -1 with errno set on failure.
  ssize_t Read(char* buffer, size_t size) {
    for (;;) {
      ssize_t got = ::read(fd_, buffer, size);
      if (got >= 0 || errno != EINTR) return got;
    }
  }

 private:
  int fd_;
};

// Inflates the file into `text` until it ends or `enough` says so; answers "" or why it failed.
template <class Enough>
std::string Inflate(const std::string& path, std::string& text, Enough enough) {
  InputFile file(path);
  if (!file.Open()) return std::strerror(errno);
  z_stream stream{};
  if (inflateInit2(&stream, kGzipWindow) != Z_OK) return "out of memory";
  std::string input(kBuffer, '\0');
  std::string output(kBuffer, '\0');
  std::string failure;
  int status = Z_OK;
  while (status != Z_STREAM_END && failure.empty() && !enough(text)) {
    ssize_t got = file.Read(input.data(), input.size());
    if (got <= 0) {
      failure = got < 0 ? std::strerror(errno) : "the compressed text ends early";
      break;
    }
    stream.next_in = reinterpret_cast<Bytef*>(input.data());
    stream.avail_in = static_cast<uInt>(got);
    // Each block read may give more than one buffer of text.
    do {
      stream.next_out = reinterpret_cast<Bytef*>(output.data());
      stream.avail_out = static_cast<uInt>(output.size());
      status = inflate(&stream, Z_NO_FLUSH);
      if (status == Z_BUF_ERROR) break;  // wants more input
      if (status != Z_OK && status != Z_STREAM_END) {
        failure = stream.msg != nullptr ? stream.msg : "it is not gzip-compressed text";
        break;
      }
      text.append(output.data(), output.size() - stream.avail_out);
    } while (stream.avail_out == 0 && status != Z_STREAM_END && !enough(text));
  }
  inflateEnd(&stream);
  return failure;
}

}  // namespace

bool IsGzipFile(const std::string& path) {
  InputFile file(path);
  unsigned char magic[2] = {0, 0};
  return file.Open() && file.Read(reinterpret_cast<char*>(magic), 2) == 2 && magic[0] == 0x1f &&
         magic[1] == 0x8b;
}

std::string InflateFile(const std::string& path, size_t limit, bool& over, std::string& error) {
  std::string text;
  over = false;
  error = Inflate(path, text, [&](const std::string& got) { return over = got.size() > limit; });
  if (!error.empty()) text.clear();
  return text;
}

std::optional<std::string> ReadFileHead(const std::string& path, size_t size) {
  std::string text;
  if (IsGzipFile(path)) {
    std::string error =
        Inflate(path, text, [&](const std::string& got) { return got.size() >= size; });
    if (!error.empty() && text.empty()) return std::nullopt;
  } else {
    InputFile file(path);
    if (!file.Open()) return std::nullopt;
    text.resize(size);
    ssize_t got = file.Read(text.data(), size);
    if (got < 0) return std::nullopt;
    text.resize(static_cast<size_t>(got));
  }
  text.resize(std::min(text.size(), size));
  return text;
}

GzipWriter::GzipWriter(std::function<void(std::string_view)> out) : out_(std::move(out)) {
  if (deflateInit2(&stream_, Z_DEFAULT_COMPRESSION, Z_DEFLATED, kGzipWindow, 8,
                   Z_DEFAULT_STRATEGY) != Z_OK) {
    throw std::bad_alloc();
  }
}

GzipWriter::~GzipWriter() { deflateEnd(&stream_); }

void GzipWriter::Put(std::string_view piece) {
  // zlib counts in 32 bits.
  constexpr size_t kSlice = size_t{1} << 30;
  for (size_t at = 0; at < piece.size(); at += kSlice)
    Deflate(piece.substr(at, kSlice), Z_NO_FLUSH);
}

void GzipWriter::Finish() { Deflate({}, Z_FINISH); }

void GzipWriter::Deflate(std::string_view piece, int flush) {
  char buffer[1 << 16];
  stream_.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(piece.data()));
  stream_.avail_in = static_cast<uInt>(piece.size());
  do {
    stream_.next_out = reinterpret_cast<Bytef*>(buffer);
    stream_.avail_out = sizeof buffer;
    deflate(&stream_, flush);
    out_(std::string_view(buffer, sizeof buffer - stream_.avail_out));
  } while (stream_.avail_out == 0);
}

}  // namespace trl::cli
