#include "platform/fs/posix/posix_file.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "platform/failure.h"
#include "platform/text.h"

namespace trl::fs::posix {
namespace {

class PosixFileReader final : public FileReader {
 public:
  explicit PosixFileReader(int descriptor) : descriptor_(descriptor) {}
  ~PosixFileReader() override { ::close(descriptor_); }
  PosixFileReader(const PosixFileReader&) = delete;
  PosixFileReader& operator=(const PosixFileReader&) = delete;

  uint64_t Size() override {
    struct stat status {};
    if (::fstat(descriptor_, &status) != 0) Fail(ReadFailure(errno));
    return static_cast<uint64_t>(status.st_size);
  }

  size_t ReadAt(uint64_t offset, void* buffer, size_t size) override {
    ssize_t count = 0;
    do {
      count = ::pread(descriptor_, buffer, size, static_cast<off_t>(offset));
    } while (count < 0 && errno == EINTR);
    if (count < 0) Fail(ReadFailure(errno));
    return static_cast<size_t>(count);
  }

  std::optional<FileIdentity> Identity() override {
    struct stat status {};
    if (::fstat(descriptor_, &status) != 0) return std::nullopt;
    auto nanoseconds = [](const timespec& time) {
      return int64_t{time.tv_sec} * 1'000'000'000 + time.tv_nsec;
    };
    return FileIdentity{static_cast<uint64_t>(status.st_dev), static_cast<uint64_t>(status.st_ino),
                        static_cast<uint64_t>(status.st_size), nanoseconds(status.st_mtim),
                        nanoseconds(status.st_ctim)};
  }

 private:
  static int32_t ReadFailure(int error) {
    return error == EIO ? kDeviceIoError : kPathFileAccessError;
  }

  int descriptor_;
};

}  // namespace

std::string PosixFile::Name() const { return NameFromNative(nativeName_); }

std::string PosixFile::Path() const { return folder_->PathChild(nativeName_); }

uint16_t PosixFile::Attributes(uint16_t wanted) const {
  return ItemAttributes(
      *folder_, [this] { return Native(); }, nativeName_, wanted, [this] { return IsSystem(); },
      [this] { return Status().mode; });
}

uint64_t PosixFile::Size() const { return Status().size; }

DateTime PosixFile::DateLastModified() const { return FromTimeT(Status().modified); }

std::unique_ptr<FileReader> PosixFile::Open() const {
  // O_NONBLOCK keeps opening a fifo from waiting for a writer; it changes nothing for files.
  int descriptor = OpenFile(Native(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (descriptor < 0) Fail(LookupFailure(errno, kFileNotFound));
  auto reader = std::make_unique<PosixFileReader>(descriptor);
  // Only a regular file has an end to read to: a device (a link to /dev/zero) would be read
  // forever.
  struct stat status {};
  if (::fstat(descriptor, &status) != 0 || !S_ISREG(status.st_mode)) Fail(kPathFileAccessError);
  return reader;
}

const ItemStatus& PosixFile::Status() const {
  if (!status_) {
    struct stat status {};
    if (int error = Stat(Native(), status)) Fail(LookupFailure(error, kFileNotFound));
    status_ = ToItemStatus(status);
  }
  return *status_;
}

bool PosixFile::IsLink() const {
  IsSystem();  // learns the type
  return type_ == DT_LNK;
}

// A system file is anything but a regular file, a folder or a link, as lstat tells them apart.
bool PosixFile::IsSystem() const {
  if (type_ == DT_UNKNOWN) {
    struct stat status {};
    if (int error = LStat(Native(), status)) Fail(LookupFailure(error, kFileNotFound));
    type_ = static_cast<unsigned char>(IFTODT(status.st_mode));
  }
  return type_ != DT_REG && type_ != DT_DIR && type_ != DT_LNK;
}

}  // namespace trl::fs::posix
