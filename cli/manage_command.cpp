#include "manage_command.h"

#include <fmt/format.h>

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "atomic_file.h"
#include "command_error.h"
#include "document_files.h"
#include "frame/vocabulary.h"
#include "native_path.h"
#include "platform/text.h"
#include "save_lock.h"

namespace trl::cli {
namespace {

struct ManageOptions {
  std::string userData;
  std::vector<std::string> targets;
  bool off = false;
};

// Whether `a` is named by `target`: its application name (any case), or a folder of this
// computer that holds it.
bool Names(const xml::Node& a, const std::string& target) {
  if (LowerCase(a.GetAttribute(vocab::a_name).value_or("")) == LowerCase(target)) return true;
  xml::Node d = a.ParentNode();
  xml::Node m = d.ParentNode();
  if (m.ParentNode().GetAttribute(vocab::c_local) != "1") return false;
  std::error_code error;
  auto folder = std::filesystem::absolute(target, error).lexically_normal().string();
  if (error) return false;
  if (!folder.ends_with('/')) folder += '/';
  return NativePath(m.GetAttribute(vocab::m_text).value_or("") +
                    d.GetAttribute(vocab::d_text).value_or(""))
      .starts_with(folder);
}

int Manage(const ManageOptions& options) {
  SaveLock lock(options.userData);
  auto userData = LoadDocumentFile(options.userData, kUserDataRole);
  std::vector<xml::Node> applications = userData->AsNode().SelectNodes("/*/c/m/d/a");
  std::vector<xml::Node> chosen;
  for (const std::string& target : options.targets) {
    size_t before = chosen.size();
    for (const xml::Node& a : applications) {
      if (Names(a, target)) chosen.push_back(a);
    }
    if (chosen.size() == before) {
      throw CommandError(fmt::format(
          "no application of '{}' is named '{}' or lies in that folder; nothing was changed",
          options.userData, target));
    }
  }
  for (xml::Node& a : chosen) a.SetAttribute(vocab::a_manage, options.off ? "0" : "1");
  ReplaceFileAtomically(options.userData, userData->Xml(), {.keepBackup = true});
  fmt::print("{} application{} {} watched for going missing\n", chosen.size(),
             chosen.size() == 1 ? "" : "s", options.off ? "no longer" : "now");
  return kExitOk;
}

}  // namespace

std::function<int()> AddManageCommand(CLI::App& app) {
  auto options = std::make_shared<ManageOptions>();
  CLI::App* command = app.add_subcommand(
      "manage", "Watch saved applications for going missing (or, with --off, stop watching them)");
  command->add_option("--user-data", options->userData, "User data saved by locate --save")
      ->required();
  command->add_flag("--off", options->off, "Stop watching them");
  command->add_option("applications", options->targets, "Application names or folders")->required();
  return [command, options] { return command->parsed() ? Manage(*options) : -1; };
}

}  // namespace trl::cli
