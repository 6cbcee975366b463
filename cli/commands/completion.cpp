#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <map>

#include "session.h"
#include "step.h"

namespace picturezor::cli {

namespace {

constexpr const char* Start =
    R"(# Completion of picturezor's command line for bash. picturezor completion bash prints it.
_picturezor() {
  local word=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD - 1]} key=picturezor at i
  # By the names of commands, and of steps behind run: names that may follow, options, and values of options.
  local -A names options values
)";

// Where no name fits, bash offers files.
constexpr const char* End = R"(
  for ((i = 1; i < COMP_CWORD; i++)); do
    at=${COMP_WORDS[i]}
    if [[ $at == : && $key == 'picturezor run'* ]]; then
      key='picturezor run:'
    elif [[ $at != -* && " ${names[$key]} " == *" $at "* ]]; then
      key="${key%:} $at"
    fi
  done
  if [[ -n ${values["$key $before"]} ]]; then
    COMPREPLY=($(compgen -W "${values["$key $before"]}" -- "$word"))
  elif [[ $word == -* ]]; then
    COMPREPLY=($(compgen -W "${options[$key]}" -- "$word"))
  else
    COMPREPLY=($(compgen -W "${names[$key]}" -- "$word"))
  fi
}
complete -o default -F _picturezor picturezor
)";

void Print(const char* table, const std::string& key, const std::string& words) {
  if (!words.empty()) std::printf("  %s['%s']='%s'\n", table, key.c_str(), words.c_str());
}

void Append(std::string& words, const std::string& word) { words += (words.empty() ? "" : " ") + word; }

/// The names that CLI::IsMember shows of an option's values: {a,b}.
std::string ValuesOf(const CLI::Option& option) {
  const std::string type = option.get_type_name();
  const std::size_t open = type.find('{'), close = type.find('}');
  if (open == type.npos || close == type.npos) return {};
  std::string words = type.substr(open + 1, close - open - 1);
  std::ranges::replace(words, ',', ' ');
  return words;
}

void PrintCommand(const CLI::App& command, const std::string& key) {
  std::string names, options;
  for (const CLI::App* one : command.get_subcommands({})) Append(names, one->get_name());
  for (const CLI::Option* option : command.get_options())
    for (const std::string& name : option->get_lnames()) {
      Append(options, "--" + name);
      Print("values", key + " --" + name, ValuesOf(*option));
    }
  Print("names", key, names);
  Print("options", key, options);
  for (const CLI::App* one : command.get_subcommands({})) PrintCommand(*one, key + " " + one->get_name());
}

/// Of steps: the values of their options, which are those of commands too, and what follows run.
void PrintSteps() {
  std::string names;
  std::map<std::string, std::string> grouped;
  for (const steps::Step* step : steps::Steps()) {
    const std::string name = step->Name;
    const std::size_t space = name.find(' ');
    if (space == name.npos)
      Append(names, name);
    else
      Append(grouped[name.substr(0, space)], name.substr(space + 1));
    std::string options;
    for (const steps::Option& option : step->Options) {
      if (option.ByPlace) continue;
      Append(options, option.Shown());
      std::string values;
      for (const std::string& choice : option.Choices) Append(values, choice);
      for (const char* before : {"picturezor ", "picturezor run "})
        Print("values", before + name + " " + option.Shown(), values);
    }
    Print("options", "picturezor run " + name, options);
  }
  for (const auto& [group, own] : grouped) {
    Append(names, group);
    Print("names", "picturezor run " + group, own);
  }
  Print("names", "picturezor run", names);
  Print("names", "picturezor run:", names);
}

}

void AddCompletion(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("completion", "Print a completion script for a shell");
  command->footer(
      "Example:\n  picturezor completion bash >~/.local/share/bash-completion/completions/picturezor");
  auto shell = std::make_shared<std::string>();
  command->add_option("SHELL", *shell, "bash")->required()->type_name("")->check(CLI::IsMember({"bash"}));
  command->callback([&app, &session, shell] {
    session.NeedsModule = false;
    session.Work = [&app] {
      std::fputs(Start, stdout);
      PrintCommand(app, "picturezor");
      PrintSteps();
      std::fputs(End, stdout);
      return Done;
    };
  });
}

}
