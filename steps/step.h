#pragma once
#include <functional>
#include <map>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "failure.h"
#include "operation.h"
#include "values.h"

namespace picturezor::steps {

/// A step isn't there for a picture, or can't be done to it. Who knows the picture's name says it.
class Unserved : public files::Failure {
 public:
  using Failure::Failure;
};

/// What steps need beside their options.
struct Surroundings {
  /// For the files that a step reads.
  files::StoreOptions Stores;
  /// What a person should know of such a file.
  std::function<void(const std::filesystem::path& file, const std::string& text)> Note;
};

/// What can be done to a picture. It is described here once: commands, rows of steps, Python's methods,
/// sliders and recipes are made from this.
struct Step {
  /// "crop", or with the name of a group before it: "filter blur".
  const char* Name;
  /// One line, and what else is to be said; examples as a person types them with the command, without its
  /// name.
  const char* Help;
  const char* More = "";
  std::vector<const char*> Examples{};
  std::vector<Option> Options{};
  /// The values are checked one by one. Throws files::Failure where they don't go together.
  std::unique_ptr<const flow::Operation> (*Make)(const Values& values, const Surroundings& around);
};

/// The steps whose names begin alike.
struct Group {
  const char *Name, *Help, *More;
  std::vector<const char*> Examples;
};

/// All steps, in the order of a help text.
std::span<const Step* const> Steps();
std::span<const Group> Groups();
/// By the whole name; nullptr where there is none.
const Step* FindStep(std::string_view name);

/// A step that is ready to work. Throws files::UsageFailure for an option that the step doesn't have, a value
/// that it doesn't take, options that are missing or don't go together; and files::Failure for a file that
/// can't be read.
std::unique_ptr<const flow::Operation> MakeOperation(const Step& step, std::map<std::string, Value> values,
                                                     const Surroundings& around);
/// The same with what a person wrote; a flag says "true".
std::unique_ptr<const flow::Operation> MakeOperation(const Step& step,
                                                     const std::map<std::string, std::string>& texts,
                                                     const Surroundings& around);

}
