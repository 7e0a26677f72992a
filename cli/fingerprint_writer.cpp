#include "fingerprint_writer.h"

#include <filesystem>
#include <memory>

#include "document_files.h"
#include "frame/vocabulary.h"

namespace trl::cli {
namespace {

void AppendProperty(xml::Node f, int type, int weight, std::string_view value) {
  f.AppendElement(vocab::p, {{vocab::p_type, std::to_string(type)},
                             {vocab::p_weight, std::to_string(weight)},
                             {vocab::p_value, value}});
}

}  // namespace

xml::Node AppendFileElement(xml::Node v, int id, std::string_view name, std::string_view relpath,
                            int weight) {
  return v.AppendElement(vocab::f, {{vocab::f_id, std::to_string(id)},
                                    {vocab::f_name, name},
                                    {vocab::f_relpath, relpath},
                                    {vocab::f_weight, std::to_string(weight)}});
}

void AppendSizeProperty(xml::Node f, std::string_view size) {
  AppendProperty(f, 2, kSizeWeight, size);
}

void AppendDigestProperty(xml::Node f, std::string_view digest) {
  AppendProperty(f, 3, kDigestWeight, digest);
}

xml::DocumentPtr LoadOrCreateDatabase(const std::string& path) {
  std::error_code error;
  if (!std::filesystem::exists(std::filesystem::symlink_status(path, error))) {
    return std::make_shared<xml::Document>();
  }
  return LoadDocumentFile(path, kFingerprintRole);
}

xml::Node DatabaseRoot(xml::Document& database) {
  xml::Node root = database.DocumentElement();
  if (!root) root = database.SetDocumentElement(database.CreateElement(vocab::fingerprint_root));
  return root;
}

}  // namespace trl::cli
