#include "step_options.h"

#include <CLI/CLI.hpp>

#include "begin.h"

namespace picturezor::cli {

std::shared_ptr<const StepTexts> AddStepOptions(CLI::App& command, const steps::Step& step) {
  auto texts = std::make_shared<StepTexts>();
  for (const steps::Option& option : step.Options) {
    const auto put = [texts, name = option.Name](const std::string& text) { (*texts)[name] = text; };
    CLI::Option* const added =
        option.Of == steps::Kind::Flag
            ? command.add_flag_callback(
                  option.Shown(), [=] { put("true"); }, option.Explained())
            : command.add_option_function<std::string>(option.Shown(), put, option.Explained())
                  ->type_name(option.ByPlace ? "" : option.Stands());
    added->required(option.Required);
  }
  for (const steps::Option& option : step.Options)
    for (const char* other : option.Excludes)
      command.get_option(option.Shown())->excludes(command.get_option(std::string("--") + other));
  return texts;
}

std::string Footer(const std::string& more, const std::vector<const char*>& examples) {
  std::string text = more;
  if (!examples.empty())
    text += (more.empty() ? "" : "\n\n") + std::string(examples.size() > 1 ? "Examples:" : "Example:");
  for (const char* example : examples) text += std::string("\n  picturezor ") + example;
  return text;
}

void AddCarryOptions(CLI::App& command, Session& session, std::filesystem::path& out) {
  command.add_option("-o,--output", out, "Image to write; the file extension sets its type")
      ->required()
      ->type_name("OUT");
  command
      .add_option("--threads", session.Threads,
                  "Number of threads; 0, the default, is one per processor. The result doesn't depend on it")
      ->type_name("N")
      ->check(CLI::Range(0, 32));
  AddWriteOptions(command, session);
  AddStoreOptions(command, session);
}

steps::Surroundings SurroundingsOf(Session& session) {
  return {session.Stores, [&session](const std::filesystem::path& file, const std::string& text) {
            session.Note(file, text);
          }};
}

namespace {

/// The pixels that come out of a chain. Tells what is lost on the way.
Format PixelsBehind(Session& session, const OpenedImage& source, const flow::Chain& chain) {
  flow::Shape shape = source.Shape();
  for (const auto& work : chain) {
    const flow::Shape result = work->Result(shape);
    if (WithoutAlpha(shape.Of) == Format::CMYK && WithoutAlpha(result.Of) == Format::G)
      session.Note(source.File, "gray is made from the black channel alone");
    shape = result;
  }
  return shape.Of;
}

}

Extent Carry(Session& session, const std::filesystem::path& in, const std::filesystem::path& out,
             flow::Chain chain) {
  Target target(session, out);
  OpenedImage source(session, in);
  try {
    const Format format = target.Storable(session, PixelsBehind(session, source, chain));
    target.Carry(session, source, std::move(chain), format, session.Threads, session.Bar);
  } catch (const steps::Unserved& failure) {
    throw Failure(in, failure.what());
  }
  target.Commit();
  return {source.Upright.Width, source.Upright.Height};
}

}
