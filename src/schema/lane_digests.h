#pragma once

#include <array>
#include <exception>
#include <string>

#include "platform/fs/file_system.h"

namespace trl {

// Where DigestInLanes takes its files from, and what it tells of each.
class DigestFeed {
 public:
  virtual ~DigestFeed() = default;
  // The next file to hash, open, or nullptr when none waits now. The reader stays the feed's.
  virtual fs::FileReader* Next() = 0;
  // The lower-case hex MD5 digest of what `reader` gave up to the size it had when its hashing
  // began, or the failure reading it gave (digest empty).
  virtual void Done(fs::FileReader& reader, std::string digest, std::exception_ptr failure) = 0;
};

// Hashes the feed's files together, a lane each (see Md5Lanes), taking the next one whenever a
// lane is free, until no lane has a file and the feed has none. Each file ends in its own time:
// a small one is told while a large one beside it goes on. fs::ReadAbandoned passes out.
void DigestInLanes(DigestFeed& feed);

// The digest in lower-case hex.
std::string DigestHex(const std::array<unsigned char, 16>& digest);

}  // namespace trl
