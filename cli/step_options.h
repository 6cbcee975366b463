#pragma once
#include <map>
#include <memory>
#include <string>

#include "session.h"
#include "step.h"

namespace picturezor::cli {

/// What a person says of a step.
using StepTexts = std::map<std::string, std::string>;

/// Gives a command the options of a step. What is said of them stands in the texts once the command line has
/// been read.
std::shared_ptr<const StepTexts> AddStepOptions(CLI::App& command, const steps::Step& step);
/// Text below the options: what else is to be said, and examples.
std::string Footer(const std::string& more, const std::vector<const char*>& examples);

/// -o, and the options of commands that carry an image through steps into a file.
void AddCarryOptions(CLI::App& command, Session& session, std::filesystem::path& out);
steps::Surroundings SurroundingsOf(Session& session);
/// Reads an image, does what is to be done to it, and writes what comes out. Gives the size of what was read.
Extent Carry(Session& session, const std::filesystem::path& in, const std::filesystem::path& out,
             flow::Chain chain);

}
