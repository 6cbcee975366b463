#pragma once
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "run.h"
#include "step.h"

namespace picturezor::steps {

/// A step with what a person wrote of it.
struct WrittenStep {
  const Step* Of;
  /// Names it in messages: "step 2 (crop)", with the file and the line before it where there are such.
  std::string Name;
  /// By the options' names; a flag says "true".
  std::map<std::string, std::string> Texts{};
};

/// Steps as they stand on a command line: "crop", "--rect", "0,0,90,60", ":", "filter", "blur". Options are
/// written --name VALUE or --name=VALUE. Throws files::UsageFailure naming the step for one that isn't there
/// and for options that it doesn't have, that lack their value or come twice.
std::vector<WrittenStep> ParseSteps(std::span<const std::string> words);
/// The same as a text: a line holds a step, or several with a colon between them. A word may stand in single
/// or double quotes, which a backslash keeps as they are within the latter; a word that begins with # begins
/// a comment. `file` names the text in messages.
std::vector<WrittenStep> ParseSteps(std::string_view text, const std::string& file);

/// Steps that are ready to work, one after the other. As MakeOperation; what is thrown here, and later by the
/// operations, names the step.
flow::Chain MakeChain(std::span<const WrittenStep> steps, const Surroundings& around);

}
