#include "manual_page.h"

#include <algorithm>
#include <cctype>
#include <memory>
#include <vector>

namespace trl::cli {
namespace {

// Text as roff prints it: backslashes and hyphens escaped, so that options read and copy as
// typed, and a line that would begin with a control character guarded.
std::string Roff(std::string_view text) {
  std::string out;
  bool lineStart = true;
  for (char c : text) {
    if (lineStart && (c == '.' || c == '\'')) out += "\\&";
    if (c == '\\') {
      out += "\\e";
    } else if (c == '-') {
      out += "\\-";
    } else {
      out += c;
    }
    lineStart = c == '\n';
  }
  return out;
}

std::string Trimmed(std::string text) {
  while (!text.empty() && std::isspace(static_cast<unsigned char>(text.back()))) text.pop_back();
  return text;
}

std::string Upper(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
  return text;
}

// "trllocator fingerprint add", as the usage line names the command.
std::string CommandPath(const CLI::App& command) {
  const CLI::App* parent = command.get_parent();
  return parent ? CommandPath(*parent) + " " + command.get_name() : command.get_name();
}

std::vector<const CLI::App*> NamedSubcommands(const CLI::App& command) {
  return command.get_subcommands([](const CLI::App* sub) { return !sub->get_name().empty(); });
}

// The formatter the command's --help uses.
std::shared_ptr<CLI::Formatter> FormatterOf(const CLI::App& command) {
  auto formatter = std::dynamic_pointer_cast<CLI::Formatter>(command.get_formatter());
  return formatter ? formatter : std::make_shared<CLI::Formatter>();
}

std::string OptionEntries(const CLI::Formatter& formatter,
                          const std::vector<const CLI::Option*>& options, bool positional) {
  std::string out;
  for (const CLI::Option* option : options) {
    out += ".TP\n\\fB" + Roff(formatter.make_option_name(option, positional)) + "\\fR" +
           Roff(formatter.make_option_opts(option)) + "\n" +
           Roff(Trimmed(formatter.make_option_desc(option))) + "\n";
  }
  return out;
}

std::string OptionSections(const CLI::App& command, const CLI::Formatter& formatter) {
  std::string out;
  auto positionals = command.get_options([](const CLI::Option* option) {
    return !option->get_group().empty() && option->get_positional();
  });
  if (!positionals.empty()) out += ".SH ARGUMENTS\n" + OptionEntries(formatter, positionals, true);
  for (const std::string& group : command.get_groups()) {
    auto options = command.get_options([&](const CLI::Option* option) {
      return option->get_group() == group && option->nonpositional();
    });
    if (group.empty() || options.empty()) continue;
    out += ".SH " + Roff(Upper(group)) + "\n" + OptionEntries(formatter, options, false);
  }
  return out;
}

std::string SubcommandSection(const CLI::App& command) {
  auto subcommands = NamedSubcommands(command);
  if (subcommands.empty()) return "";
  std::string out = ".SH SUBCOMMANDS\n";
  for (const CLI::App* sub : subcommands) {
    out += ".TP\n\\fB" + Roff(sub->get_name()) + "\\fR\n" + Roff(sub->get_description()) + "\n";
  }
  return out;
}

std::string SeeAlso(const CLI::App& command) {
  std::vector<std::string> pages;
  for (const CLI::App* up = command.get_parent(); up; up = up->get_parent()) {
    pages.insert(pages.begin(), ManualPageName(*up));
  }
  for (const CLI::App* sub : NamedSubcommands(command)) pages.push_back(ManualPageName(*sub));
  if (pages.empty()) return "";
  std::string out = ".SH SEE ALSO\n";
  for (size_t i = 0; i < pages.size(); ++i) {
    out += "\\fB" + Roff(pages[i]) + "\\fR(1)" + (i + 1 < pages.size() ? ",\n" : "\n");
  }
  return out;
}

}  // namespace

std::string ManualPageName(const CLI::App& command) {
  const CLI::App* parent = command.get_parent();
  return parent ? ManualPageName(*parent) + "-" + command.get_name() : command.get_name();
}

std::string ManualPage(const CLI::App& command, std::string_view version) {
  auto formatter = FormatterOf(command);
  std::string name = ManualPageName(command);
  std::string path = CommandPath(command);
  std::string description = Trimmed(formatter->make_description(&command));
  // The program's description begins with its own name, which the NAME line already gives.
  std::string summary = description;
  if (summary.rfind(name + ": ", 0) == 0) summary.erase(0, name.size() + 2);

  std::string usage = Trimmed(formatter->make_usage(&command, path));
  std::string label = formatter->get_label("Usage") + ": " + path;
  if (usage.rfind(label, 0) == 0) usage.erase(0, label.size());

  std::string page = ".TH " + Roff(Upper(name)) + " 1 \"\" \"trllocator " + Roff(version) +
                     "\" \"User Commands\"\n";
  page += ".SH NAME\n" + Roff(name) + " \\- " + Roff(summary) + "\n";
  page += ".SH SYNOPSIS\n\\fB" + Roff(path) + "\\fR" + Roff(usage) + "\n";
  page += ".SH DESCRIPTION\n" + Roff(description) + "\n";
  std::string footer = Trimmed(formatter->make_footer(&command));
  if (!footer.empty()) page += ".PP\n" + Roff(footer) + "\n";
  page += OptionSections(command, *formatter);
  page += SubcommandSection(command);
  page += SeeAlso(command);
  return page;
}

}  // namespace trl::cli
