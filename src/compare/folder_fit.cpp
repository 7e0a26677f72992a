#include "compare/folder_fit.h"

#include "compare/compare_names.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/vocabulary.h"
#include "platform/text.h"

namespace trl {

namespace {

template <class Read>
std::exception_ptr Capture(Read read) {
  try {
    read();
  } catch (...) {
    return std::current_exception();
  }
  return nullptr;
}

}  // namespace

FolderFit::FolderFit(const xml::Node& f) {
  relFailure_ = Capture([&] { rel_ = LowerCase(TextOf(f, vocab::f_relpath)); });
  if (!rel_.empty() && !rel_.ends_with('\\')) rel_ += '\\';
  tail_ = rel_.starts_with('\\') ? rel_ : "\\" + rel_;
  fullPathFailure_ = Capture([&] { fullPath_ = f.GetAttribute(vocab::f_fullpath) == "True"; });
}

std::string FolderFit::AppFolder(std::string_view folder) const {
  OnError on{compare::kClass, compare::kFindCommonPathLabel};
  if (relFailure_) on([&] { std::rethrow_exception(relFailure_); });
  if (rel_.empty()) return std::string(folder);
  // Lengths in bytes decide as lengths in characters would: every later test compares whole texts.
  if (folder.size() < rel_.size()) return "";
  std::string withSlash;
  if (!folder.ends_with('\\')) {
    withSlash = std::string(folder) + '\\';
    folder = withSlash;
  }
  if (fullPathFailure_) on([&] { std::rethrow_exception(fullPathFailure_); });
  if (fullPath_) return folder == rel_ ? rel_ : "";
  if (!folder.ends_with(tail_)) return "";
  return std::string(folder.substr(0, folder.size() - (tail_.size() - 1)));
}

}  // namespace trl
