#include <CLI/CLI.hpp>
#include <fstream>
#include <iterator>

#include "step_options.h"
#include "written_steps.h"

namespace picturezor::cli {

namespace {

struct RunOptions {
  std::filesystem::path In, Out;
  std::string File;
};

std::vector<steps::WrittenStep> StepsOf(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  const std::string text{std::istreambuf_iterator<char>(stream), {}};
  if (!stream) throw Failure(file, "it can't be read");
  const auto written = steps::ParseSteps(text, file);
  if (written.empty()) throw UsageFailure(file, "there are no steps in it");
  return written;
}

}

void AddRun(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("run", "Do several steps to an image, without files in between");
  command->footer(Footer(
      "picturezor run IN -o OUT [OPTIONS] STEP [: STEP]...\n\n"
      "A step is the name of a command that does one thing to an image (scale, crop, convert, mirror,\n"
      "rotate, combine, filter NAME) with that command's own options; a colon stands between two. In a file\n"
      "of steps each line holds one, or several with colons. Words with blanks in them or # in front stand\n"
      "in quotes there, and what follows another # is a comment.",
      {"run photo.jpg -o out.jpg crop --rect 100,50,1600,1200 : scale --fit 1280x800 : filter unsharp",
       "run scan.tif -o page.png --steps page.steps"}));
  auto options = std::make_shared<RunOptions>();
  command->add_option("IN", options->In, "Image to read")->required()->type_name("");
  command->add_option("--steps", options->File, "A text file with the steps")->type_name("FILE");
  AddCarryOptions(*command, session, options->Out);
  command->prefix_command();
  command->callback([&session, options, command] {
    session.Work = [&session, options, words = command->remaining()] {
      if (words.empty() == options->File.empty())
        throw UsageFailure("give steps, or --steps and a file of them");
      const auto written = words.empty() ? StepsOf(options->File) : steps::ParseSteps(words);
      return Carry(session, options->In, options->Out, steps::MakeChain(written, SurroundingsOf(session)));
    };
  });
}

}
