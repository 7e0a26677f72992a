#include "locate_command.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "atomic_file.h"
#include "bundled_example.h"
#include "command_error.h"
#include "detached_end.h"
#include "document_files.h"
#include "filter_names.h"
#include "findings_output.h"
#include "findings_table.h"
#include "frame/vocabulary.h"
#include "interrupt.h"
#include "live_progress.h"
#include "path_search_options.h"
#include "platform/event_loop.h"
#include "platform/fs/posix/output_open.h"
#include "save_lock.h"
#include "stage_command.h"
#include "trl/locate.h"

namespace trl::cli {
namespace {

struct LocateOptions {
  std::vector<std::string> paths, excluded;
  std::string searchOptions, applicationOptions, fingerprint, userData, log;
  std::string filter = "all";
  FindingsFormat shown;
  bool save = false;
  bool sync = false;
  StageOptions stage;
};

struct Documents {
  xml::DocumentPtr searchOptions, applicationOptions, fingerprint, userData;
};

// How a run ended, and the last results it delivered.
struct Outcome {
  bool complete = false;
  bool cancelled = false;
  int stage = 0;  // where a cancelled run stopped
  std::string results;
};

Documents LoadNamedDocuments(const LocateOptions& options, const std::string& userData);

Documents LoadDocuments(const LocateOptions& options) {
  if (!options.paths.empty() && !options.searchOptions.empty()) {
    throw CommandError("give the folders to search or --search-options, not both");
  }
  // The first save makes the user data: a file that is not there yet starts an empty inventory.
  std::string userData = options.userData;
  if (options.save && !std::filesystem::exists(userData)) userData.clear();
  Documents documents = LoadNamedDocuments(options, userData);
  if (!options.paths.empty()) {
    documents.searchOptions = SearchOptionsForPaths(options.paths);
    if (documents.userData) ListManagedApplications(*documents.searchOptions, *documents.userData);
  }
  if (!options.excluded.empty()) ExcludeFolders(*documents.searchOptions, options.excluded);
  return documents;
}

Documents LoadNamedDocuments(const LocateOptions& options, const std::string& userData) {
  auto example = [](const char* name, const DocumentRole& role) {
    std::string path = (BundledExampleFolder() / name).string();
    if (!std::filesystem::exists(path)) {
      throw CommandError(fmt::format(
          "the bundled example is not at '{}': name the documents with --search-options, "
          "--fingerprint and the other document options",
          path));
    }
    return LoadDocumentFile(path, role);
  };
  // A document not named comes from the bundled example: a second run with the user data the
  // first one saved searches as the first did. The example's application options go only with
  // its fingerprint, whose applications they select.
  Documents documents{LoadOptionalDocumentFile(options.searchOptions, kSearchOptionsRole),
                      LoadOptionalDocumentFile(options.applicationOptions, kApplicationOptionsRole),
                      LoadOptionalDocumentFile(options.fingerprint, kFingerprintRole),
                      LoadOptionalDocumentFile(userData, kUserDataRole)};
  if (!documents.searchOptions && options.paths.empty()) {
    documents.searchOptions = example("search-options.xml", kSearchOptionsRole);
  }
  if (!documents.fingerprint) {
    documents.fingerprint = example("fingerprint.xml", kFingerprintRole);
    if (!documents.applicationOptions) {
      documents.applicationOptions = example("application-options.xml", kApplicationOptionsRole);
    }
  }
  return documents;
}

int Attribute(const std::string& updateXml, std::string_view name) {
  xml::Document update;
  if (!update.LoadXml(updateXml)) return -1;
  auto value = update.DocumentElement().GetAttribute(name);
  return value ? std::atoi(value->c_str()) : -1;
}

Outcome RunSynchronously(Locate& locate, const Documents& documents, int16_t filter) {
  Outcome outcome;
  outcome.results = locate.Start(documents.searchOptions, documents.applicationOptions, filter,
                                 documents.fingerprint, documents.userData);
  outcome.complete = locate.Mode() == Locate::kFinished && locate.Status() == kStatusComplete;
  return outcome;
}

// Runs on this thread's event loop, with live progress and Ctrl-C turned into Cancel.
const char* StageName(int mode) {
  static const char* const names[] = {"start", "search", "compare", "filter", "merge", "final"};
  return mode >= 0 && mode <= Locate::kFinished ? names[mode] : "unknown";
}

std::string CancelNote(int stage, const std::string& wrote, bool save) {
  return fmt::format("cancelled during the {} stage; {}{}", StageName(stage), wrote,
                     save ? "; the user data was not saved" : "");
}

Outcome RunAsynchronously(Locate& locate, const Documents& documents, int16_t filter,
                          LiveProgress& progress, bool save, bool writesWhatItHas) {
  // The stage as the events tell it, for the note of a run that is not waited for.
  std::atomic<int> stage{0};
  InterruptGuard interrupt(
      [&] { return CancelNote(stage.load(), "nothing was written", save); },
      writesWhatItHas ? std::nullopt : std::optional(std::chrono::milliseconds(20)));
  Outcome outcome;
  bool ended = false;
  // A Cancel reaches a stage only while it runs, so the request is repeated at every report (the
  // first that finds a stage running stops it) and on a timer.
  auto cancelIfAsked = [&] {
    if (InterruptGuard::Requested() && !ended) locate.Cancel();
  };
  // The results are taken as a document: their text is made once, at the end, not at every report.
  locate.OnStatusDocument([&](const std::string& update, const xml::DocumentPtr& results, bool) {
    progress.Update(update);
    int mode = Attribute(update, vocab::e_mode);
    int status = Attribute(update, vocab::e_status);
    if (mode >= 0) stage = mode;
    if (status == kStatusCancelled || (mode == Locate::kFinished && status == kStatusComplete)) {
      // The guard's grace still runs: the stage gives back its documents before the loop ends,
      // which at scale takes longer than a person waits after Ctrl-C.
      ended = true;
      outcome.complete = status == kStatusComplete;
      outcome.cancelled = status == kStatusCancelled;
      outcome.stage = mode;
      if (results) outcome.results = results->Xml();
    }
    cancelIfAsked();
  });
  if (progress.Active()) {
    locate.OnProgressUpdate([&](const std::string& update) {
      progress.Update(update);
      cancelIfAsked();
    });
  }
  Timer watch([&] {
    progress.Tick();
    cancelIfAsked();
  });
  watch.Interval(10);  // Ctrl-C becomes a Cancel soon after it
  watch.Enabled(true);

  locate.Start(documents.searchOptions, documents.applicationOptions, filter, documents.fingerprint,
               documents.userData);
  EventLoop::Current().RunUntil([&] { return ended; });
  locate.OnStatusDocument(nullptr);
  locate.OnProgressUpdate(nullptr);
  if (InterruptGuard::Requested() && !outcome.cancelled) {
    outcome.cancelled = true;
    outcome.stage = locate.Mode();
  }
  return outcome;
}

int RunLocate(const LocateOptions& options) {
  if (options.save && options.userData.empty()) {
    throw CommandError("--save needs the user data to save: give --user-data FILE");
  }
  int16_t filter = ParseFilterOptions(options.filter);
  // Held from the reading of the user data to its replacing: a run saving meanwhile would be lost.
  std::optional<SaveLock> lock;
  if (options.save) lock.emplace(options.userData);
  Documents documents = LoadDocuments(options);
  if (!options.log.empty()) {
    // Found out now, rather than reported at every entry of the run.
    int fd = fs::OpenForWriting(options.log, O_CREAT | O_APPEND);
    if (fd < 0) {
      throw CommandError(fmt::format("cannot write the log '{}': {}", options.log,
                                     errno == ELOOP ? "it is a link, and a log is not written "
                                                      "through a link to a file"
                                                    : std::strerror(errno)));
    }
    ::close(fd);
  }
  std::unique_ptr<Inventory> before;
  if (options.shown.format != "xml") {
    xml::Document empty;
    before = std::make_unique<Inventory>(documents.userData ? *documents.userData : empty);
  }
  if (!documents.applicationOptions) {
    // Every application takes part, as without any; the run log can still show the options.
    documents.applicationOptions = std::make_shared<xml::Document>();
    documents.applicationOptions->SetDocumentElement(
        documents.applicationOptions->CreateElement("trl_applicationoptions"));
  }
  if (!documents.userData) {
    // Kept here rather than left to the run, so that the merged inventory can be read and saved.
    documents.userData = std::make_shared<xml::Document>();
    documents.userData->SetDocumentElement(documents.userData->CreateElement(vocab::results_root));
  }

  LiveProgress progress;
  ReportPrinter printer(options.stage, [&progress] { progress.Clear(); });
  CacheForRun cache(options.stage.cache, options.stage.quiet, options.stage.verbose);
  Locate locate(FileSystemWithShares(options.stage.shares),
                FileSystemWithShares(options.stage.shares));
  locate.Asynchronous(!options.sync);
  locate.LogFile(options.log);
  // What a cancelled stage had is written only as XML; a run that would write nothing is not
  // waited for long after Ctrl-C.
  bool writesWhatItHas = !options.stage.output.empty() || options.shown.format == "xml";
  Outcome outcome = options.sync ? RunSynchronously(locate, documents, filter)
                                 : RunAsynchronously(locate, documents, filter, progress,
                                                     options.save, writesWhatItHas);
  progress.Clear();

  if (outcome.cancelled) {
    std::string wrote = "nothing was written";
    if (!outcome.results.empty() && writesWhatItHas) {
      WriteTextOutput(outcome.results, options.stage.output);
      wrote = fmt::format(
          "what the {} stage had was written to {}", StageName(outcome.stage),
          options.stage.output.empty() ? "standard output" : "'" + options.stage.output + "'");
    }
    fmt::print(stderr, "trllocator: {}\n", CancelNote(outcome.stage, wrote, options.save));
    // Nothing is left to save: ending here spares the release of the run's documents, which at
    // scale takes longer than the cancel itself.
    QuickEnd(kExitInterrupted);
    return kExitInterrupted;
  }
  if (!outcome.complete || outcome.results.empty()) {
    throw CommandError("the locate run did not complete; the user data was not saved", kExitFailed);
  }

  if (options.save)
    ReplaceFileAtomically(options.userData, documents.userData->Xml(), {.keepBackup = true});
  int status = printer.Failures() > 0 ? kExitFailuresReported : kExitOk;
  try {
    if (options.shown.format != "xml") {
      xml::Document none;
      xml::Document& fingerprint = documents.fingerprint ? *documents.fingerprint : none;
      // Only JSON carries the run's events: the results are read again for nothing else.
      xml::Document results;
      bool events = options.shown.format == "json" && results.LoadXml(outcome.results);
      WriteTextOutput(
          RenderFindings(options.shown, before->Changes(*documents.userData, fingerprint),
                         events ? &results : nullptr),
          options.stage.output);
    } else {
      WriteTextOutput(outcome.results, options.stage.output);
    }
  } catch (const CommandError& error) {
    if (!options.save) throw;
    throw CommandError(
        fmt::format("{}; the user data was saved to '{}'", error.what(), options.userData),
        error.ExitCode());
  }
  return status;
}

}  // namespace

std::function<int()> AddLocateCommand(CLI::App& app) {
  auto options = std::make_shared<LocateOptions>();
  CLI::App* command = app.add_subcommand(
      "locate",
      "Find the known applications in the searched folders, identify their versions and merge "
      "the findings into the user data");
  AddFolderOptions(*command, options->paths, options->searchOptions, options->excluded,
                   "Search options document (computers, drives, folders to search)");
  command->add_option("--application-options", options->applicationOptions,
                      "Application options document (which applications take part)");
  command->add_option("--fingerprint", options->fingerprint, "Fingerprint database");
  command->add_option("--user-data", options->userData,
                      "User data of earlier runs, merged with this run's findings (default: a new, "
                      "empty inventory)");
  command
      ->add_option("--filter", options->filter, "Filter rules: " + std::string(kFilterOptionsForm))
      ->capture_default_str();
  command->add_option("--log", options->log, "Append the run log to FILE");
  AddShareOption(*command, options->stage);
  AddCacheOptions(*command, options->stage.cache);
  AddOutputOption(*command, options->stage);
  command->add_flag("--save", options->save,
                    "After a complete run, replace the --user-data file with the merged user data "
                    "(atomically; the previous one is kept as FILE.bak)");
  AddFindingsFormatOptions(*command, options->shown, "the merged results");
  command->add_flag("--sync", options->sync,
                    "Run each stage straight through (no live progress; Ctrl-C ends the process)");
  command->footer(
      "Without folders or document options, runs on the bundled example. Exit codes: 0 done; 1 "
      "the run did not complete or its output could not be written; 2 a bad command line or "
      "input document; 3 done, but failures were reported; 130 cancelled by Ctrl-C (a second "
      "Ctrl-C quits at once).");
  return [command, options] { return command->parsed() ? RunLocate(*options) : -1; };
}

}  // namespace trl::cli
