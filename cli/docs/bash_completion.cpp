#include "bash_completion.h"

#include <fmt/format.h>

#include <string_view>
#include <vector>

#include "filter_names.h"

namespace trl::cli {
namespace {

std::string Joined(const std::vector<std::string>& words) {
  std::string out;
  for (const auto& word : words) out += (out.empty() ? "" : " ") + word;
  return out;
}

std::vector<const CLI::App*> NamedSubcommands(const CLI::App& command) {
  return command.get_subcommands([](const CLI::App* sub) { return !sub->get_name().empty(); });
}

std::vector<std::string> OptionNames(const CLI::Option& option) {
  std::vector<std::string> names;
  for (const auto& name : option.get_snames()) names.push_back("-" + name);
  for (const auto& name : option.get_lnames()) names.push_back("--" + name);
  return names;
}

// The set a validator lists in the option's type ("TEXT:{xml,table}"), or nothing.
std::vector<std::string> Choices(const CLI::Option& option) {
  std::string type = option.get_type_name();
  size_t open = type.find('{');
  size_t close = type.find('}', open);
  std::vector<std::string> choices;
  if (open == std::string::npos || close == std::string::npos) return choices;
  std::string_view list = std::string_view(type).substr(open + 1, close - open - 1);
  for (size_t start = 0, end = 0; end != std::string_view::npos; start = end + 1) {
    end = list.find(',', start);
    choices.emplace_back(list.substr(start, end - start));
  }
  return choices;
}

// What the word after each option of one command completes to, as case branches on
// "<command> <option>".
struct ValueCases {
  std::vector<std::string> filters, files, nothing;
  std::string choices;  // whole branches
};

void AddCommand(const CLI::App& command, const std::string& path, std::string& commands,
                std::string& words, ValueCases& values) {
  std::vector<std::string> offered;
  bool takesFiles = false;
  for (const CLI::Option* option : command.get_options({})) {
    if (option->get_positional()) {
      takesFiles = true;
      continue;
    }
    std::vector<std::string> names = OptionNames(*option);
    offered.insert(offered.end(), names.begin(), names.end());
    if (option->get_expected_max() == 0) continue;  // a flag
    std::vector<std::string> choices = Choices(*option);
    for (const auto& name : names) {
      std::string key = "\"" + path + " " + name + "\"";
      if (name == "--filter") {
        values.filters.push_back(key);
      } else if (!choices.empty()) {
        values.choices +=
            fmt::format("    {}) COMPREPLY=($(compgen -W \"{}\" -- \"$cur\")); return ;;\n", key,
                        Joined(choices));
      } else if (option->get_type_name().rfind("TEXT", 0) == 0) {
        values.files.push_back(key);
      } else {
        values.nothing.push_back(key);
      }
    }
  }
  for (const CLI::App* sub : NamedSubcommands(command)) offered.push_back(sub->get_name());
  words += fmt::format("    \"{}\") words=\"{}\" files={} ;;\n", path, Joined(offered),
                       takesFiles ? 1 : 0);
  for (const CLI::App* sub : NamedSubcommands(command)) {
    std::string subPath = path + " " + sub->get_name();
    commands += (commands.empty() ? "\"" : " | \"") + subPath + "\"";
    AddCommand(*sub, subPath, commands, words, values);
  }
}

std::string Branch(const std::vector<std::string>& keys, std::string_view action) {
  if (keys.empty()) return "";
  std::string out = "    ";
  for (size_t i = 0; i < keys.size(); ++i) out += (i ? " | " : "") + keys[i];
  return out + ")\n      " + std::string(action) + "\n      ;;\n";
}

}  // namespace

std::string BashCompletion(const CLI::App& program) {
  std::string commands, words;
  ValueCases values;
  AddCommand(program, "", commands, words, values);
  std::vector<std::string> filterNames;
  for (std::string_view name : FilterNames()) filterNames.emplace_back(name);

  std::string name = program.get_name();
  std::string function = "_" + name;
  for (char& c : function) {
    if (c == '-') c = '_';
  }
  return fmt::format(
      R"(# bash completion for {name}, generated from its command line definitions.

# --filter takes a comma list of rule names: complete the last one.
{function}_filters() {{
  local given=${{cur%"${{cur##*,}}"}}
  COMPREPLY=($(compgen -P "$given" -W "{filters}" -- "${{cur##*,}}"))
  compopt -o nospace
}}

{function}() {{
  local cur=${{COMP_WORDS[COMP_CWORD]}} prev=${{COMP_WORDS[COMP_CWORD - 1]}}
  local command="" words files i
  # --option=value: the value completes as the word after --option does.
  if [[ $cur == = ]]; then
    cur=""
  elif [[ $prev == = ]]; then
    prev=${{COMP_WORDS[COMP_CWORD - 2]}}
  fi
  # The subcommand being completed: the words so far that name one, level after level.
  for ((i = 1; i < COMP_CWORD; i++)); do
    case "$command ${{COMP_WORDS[i]}}" in
      {commands}) command+=" ${{COMP_WORDS[i]}}" ;;
    esac
  done
  case "$command $prev" in
{filter_branch}{choices}{file_branch}{nothing_branch}  esac
  case "$command" in
{words}  esac
  if [[ $cur != -* ]] && ((files)); then
    COMPREPLY=($(compgen -f -- "$cur"))
    compopt -o filenames
  else
    COMPREPLY=($(compgen -W "$words" -- "$cur"))
  fi
}}

complete -F {function} {name}
)",
      fmt::arg("name", name), fmt::arg("function", function),
      fmt::arg("filters", Joined(filterNames)), fmt::arg("commands", commands),
      fmt::arg("filter_branch", Branch(values.filters, function + "_filters; return")),
      fmt::arg("choices", values.choices),
      fmt::arg("file_branch", Branch(values.files,
                                     "COMPREPLY=($(compgen -f -- \"$cur\")); compopt -o filenames; "
                                     "return")),
      fmt::arg("nothing_branch", Branch(values.nothing, "return")), fmt::arg("words", words));
}

}  // namespace trl::cli
