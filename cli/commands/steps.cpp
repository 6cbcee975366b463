#include <CLI/CLI.hpp>
#include <cstdio>

#include "step_options.h"

// The commands that do one thing to an image, as the steps describe them.

namespace picturezor::cli {

namespace {

/// The name of a step within its group.
std::string NameIn(const steps::Group& group, const steps::Step& step) {
  const std::string name = step.Name, before = std::string(group.Name) + " ";
  return name.starts_with(before) ? name.substr(before.size()) : std::string();
}

void AddStep(CLI::App& parent, Session& session, const steps::Step& step, const std::string& name) {
  struct Files {
    std::filesystem::path In, Out;
  };
  CLI::App* command = parent.add_subcommand(name, step.Help);
  command->footer(Footer(step.More, step.Examples));
  auto files = std::make_shared<Files>();
  command->add_option("IN", files->In, "Image to read")->required()->type_name("");
  const auto texts = AddStepOptions(*command, step);
  AddCarryOptions(*command, session, files->Out);
  command->callback([&session, &step, files, texts] {
    session.Work = [&session, &step, files, texts] {
      flow::Chain chain;
      chain.push_back(steps::MakeOperation(step, *texts, SurroundingsOf(session)));
      Carry(session, files->In, files->Out, std::move(chain));
      return Done;
    };
  });
}

int List(const steps::Group& group) {
  for (const steps::Step* step : steps::Steps())
    if (const std::string name = NameIn(group, *step); !name.empty())
      std::printf("%-11s %s\n", name.c_str(), step->Help);
  return Done;
}

void AddGroup(CLI::App& app, Session& session, const steps::Group& group) {
  const std::string name = group.Name;
  CLI::App* command = app.add_subcommand(name, group.Help);
  command->footer(
      Footer("picturezor " + name + " NAME --help lists the options of a " + name + ". " + group.More,
             group.Examples));
  command->require_subcommand(0, 1);
  auto list = std::make_shared<bool>(false);
  command->add_flag("--list", *list, "List all " + name + "s");
  for (const steps::Step* step : steps::Steps())
    if (const std::string own = NameIn(group, *step); !own.empty()) AddStep(*command, session, *step, own);
  command->allow_extras();
  command->callback([&session, &group, name, command, list] {
    if (command->get_subcommands().empty() && command->remaining_size() > 0)
      throw CLI::ValidationError(command->remaining().front(),
                                 "there is no such " + name + "; --list shows them all");
    if (*list) {
      session.NeedsModule = false;
      session.Work = [&group] { return List(group); };
    } else if (command->get_subcommands().empty()) {
      throw CLI::RequiredError("the name of a " + name);
    }
  });
}

}

void AddSteps(CLI::App& app, Session& session) {
  for (const steps::Step* step : steps::Steps())
    if (std::string_view(step->Name).find(' ') == std::string_view::npos)
      AddStep(app, session, *step, step->Name);
  for (const steps::Group& group : steps::Groups()) AddGroup(app, session, group);
}

}
