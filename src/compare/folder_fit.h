#pragma once

#include <exception>
#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl {

// Where a fingerprint file expects to lie (its f_relpath, and f_fullpath "True" when that is a
// whole folder), read once, and the test of local folders against it: a file with a common name
// has many candidates. A value that could not be read is reported again at each test, as a fresh
// read would be, and the test goes on as it would without it.
class FolderFit {
 public:
  explicit FolderFit(const xml::Node& f);

  // The folder in which the application would be installed if a local file in `folder` (lower
  // case) were this file, or "" when the folder does not fit.
  std::string AppFolder(std::string_view folder) const;

 private:
  std::string rel_;   // lower case, ending with "\"; empty: the application folder itself
  std::string tail_;  // rel_ beginning with "\": what a relative path's folder ends with
  bool fullPath_ = false;
  std::exception_ptr relFailure_, fullPathFailure_;
};

}  // namespace trl
