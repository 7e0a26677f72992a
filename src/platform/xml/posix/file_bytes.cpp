#include "platform/xml/file_bytes.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <iconv.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>

#include "platform/xml/file_text.h"

namespace trl::xml {

std::optional<ParseError> ReadFileBytes(const std::string& path, size_t limit, std::string& bytes) {
  int descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (descriptor < 0) return Unreadable(std::strerror(errno));
  std::unique_ptr<int, void (*)(int*)> closer(&descriptor, [](int* fd) { ::close(*fd); });
  struct stat status {};
  size_t expected = size_t{1} << 16;
  if (::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode)) {
    expected = static_cast<size_t>(status.st_size) + 1;  // the end is seen without another read
  }
  return ReadUpToLimit(expected, limit, bytes,
                       [&](char* into, size_t room, size_t& got) -> std::optional<ParseError> {
                         ssize_t read = 0;
                         do {
                           read = ::read(descriptor, into, room);
                         } while (read < 0 && errno == EINTR);
                         if (read < 0) return Unreadable(std::strerror(errno));
                         got = static_cast<size_t>(read);
                         return std::nullopt;
                       });
}

std::optional<std::string> ConvertToUtf8(std::string_view bytes, const std::string& encoding,
                                         std::string& text) {
  iconv_t converter = ::iconv_open("UTF-8", encoding.c_str());
  if (converter == reinterpret_cast<iconv_t>(-1)) {
    return fmt::format("the encoding \"{}\" is not supported", encoding);
  }
  std::unique_ptr<void, int (*)(iconv_t)> closer(converter, ::iconv_close);
  text.resize(bytes.size() * 2 + 16);
  char* in = const_cast<char*>(bytes.data());
  size_t inLeft = bytes.size();
  size_t used = 0;
  for (;;) {
    char* out = text.data() + used;
    size_t outLeft = text.size() - used;
    size_t result = ::iconv(converter, &in, &inLeft, &out, &outLeft);
    int error = errno;
    used = text.size() - outLeft;
    if (result != static_cast<size_t>(-1)) break;
    if (error != E2BIG) {
      text.resize(used);
      return fmt::format("the text is not valid {}", encoding);
    }
    text.resize(text.size() * 2);
  }
  text.resize(used);
  return std::nullopt;
}

}  // namespace trl::xml
