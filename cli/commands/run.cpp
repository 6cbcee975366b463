#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <fstream>
#include <iostream>
#include <iterator>

#include "step_options.h"
#include "written_steps.h"

namespace picturezor::cli {

namespace {

struct RunOptions {
  std::filesystem::path In, Out;
  std::string File, Pairs;
};

/// Text beside a margin, line by line.
void PrintBeside(const std::string& left, const std::string& text) {
  for (std::size_t at = 0; at <= text.size();) {
    const std::size_t end = std::min(text.find('\n', at), text.size());
    std::printf("  %-26s %s\n", at == 0 ? left.c_str() : "", text.substr(at, end - at).c_str());
    at = end + 1;
  }
}

void List() {
  for (const steps::Step* step : steps::Steps()) {
    std::printf("%s%s: %s\n", step == steps::Steps().front() ? "" : "\n", step->Name, step->Help);
    for (const steps::Option& option : step->Options)
      PrintBeside(option.ByPlace ? option.Shown() : option.Shown() + " " + option.Stands(),
                  option.Explained());
  }
}

std::vector<steps::WrittenStep> StepsOf(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  const std::string text{std::istreambuf_iterator<char>(stream), {}};
  if (!stream) throw Failure(file, "it can't be read");
  const auto written = steps::ParseSteps(text, file);
  if (written.empty()) throw UsageFailure(file, "there are no steps in it");
  return written;
}

/// Does one image after another, with names from a stream. Each result is told at once, since another program
/// waits for it.
int RunPairs(Session& session, std::istream& names, const std::vector<steps::WrittenStep>& written) {
  const auto chain = [&] { return steps::MakeChain(written, SurroundingsOf(session)); };
  chain();
  for (std::string in, out; std::getline(names, in, '\0') && std::getline(names, out, '\0');) {
    std::string failed;
    Extent size;
    try {
      size = Carry(session, in, out, chain());
    } catch (const std::bad_alloc&) {
      failed = Failure(in, "not enough memory").what();
    } catch (const std::exception& failure) {
      failed = failure.what();
    }
    const std::string answer = failed.empty()
                                   ? "done " + std::to_string(size.Width) + " " + std::to_string(size.Height)
                                   : "failed " + failed;
    if (std::fwrite(answer.c_str(), 1, answer.size() + 1, stdout) == 0 || std::fflush(stdout) != 0) break;
  }
  return Done;
}

int RunPairs(Session& session, const RunOptions& options) {
  KeepMemory();
  const auto written = StepsOf(options.File);
  if (options.Pairs == "-") return RunPairs(session, std::cin, written);
  std::ifstream names(options.Pairs, std::ios::binary);
  if (!names) throw Failure(options.Pairs, "it can't be read");
  return RunPairs(session, names, written);
}

}

void AddRun(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("run", "Apply several steps to an image, without files in between");
  command->footer(Footer(
      "picturezor run IN -o OUT [OPTIONS] STEP [: STEP]...\n\n"
      "A step is the name of a command (scale, crop, convert, mirror, rotate, combine, filter NAME) with\n"
      "that command's own options; a colon separates two steps. In a file of steps, each line holds one\n"
      "step, or several with colons between them. Quote words there that contain blanks or begin with #;\n"
      "an unquoted word that begins with # starts a comment.",
      {"run photo.jpg -o out.jpg crop --rect 100,50,1600,1200 : scale --fit 1280x800 : filter unsharp",
       "run scan.tif -o page.png --steps page.steps"}));
  auto options = std::make_shared<RunOptions>();
  CLI::Option* const in = command->add_option("IN", options->In, "Image to read")->type_name("");
  CLI::Option* const file =
      command->add_option("--steps", options->File, "Text file that holds the steps")->type_name("FILE");
  command->add_flag_callback(
      "--list",
      [] {
        List();
        throw CLI::Success();
      },
      "List all steps with their options");
  AddCarryOptions(*command, session, options->Out);
  CLI::Option* const out = command->get_option("--output")->required(false);
  command
      ->add_option("--pairs", options->Pairs,
                   "Instead of IN and OUT, a file that lists both names in turn, each ended by a zero byte;\n"
                   "- is standard input. For each pair, standard output gets \"done WIDTH HEIGHT\", the\n"
                   "size of the input, or \"failed REASON\", ended by a zero byte")
      ->type_name("FILE")
      ->needs(file)
      ->excludes(in)
      ->excludes(out);
  command->prefix_command();
  command->callback([&session, options, command] {
    session.Work = [&session, options, words = command->remaining()] {
      if (!options->Pairs.empty()) return RunPairs(session, *options);
      if (options->In.empty() || options->Out.empty()) throw UsageFailure("IN and -o OUT are required");
      if (words.empty() == options->File.empty()) throw UsageFailure("give steps, or --steps with a file");
      const auto written = words.empty() ? StepsOf(options->File) : steps::ParseSteps(words);
      Carry(session, options->In, options->Out, steps::MakeChain(written, SurroundingsOf(session)));
      return int(Done);
    };
  });
}

}
