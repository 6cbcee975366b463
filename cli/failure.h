#pragma once
#include <filesystem>
#include <stdexcept>
#include <string>

namespace picturezor::cli {

/// What keeps the command from doing its work, in one line for a person.
class Failure : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
  Failure(const std::filesystem::path& file, const std::string& reason)
      : std::runtime_error(file.string() + ": " + reason) {}
};

/// The command line by itself is wrong.
class UsageFailure : public Failure {
 public:
  using Failure::Failure;
};

/// What a script reads off; after a signal the shell gives 128 and its number.
enum ExitCode : int { Done = 0, Different = 1, Failed = 2, WrongUsage = 3 };

}
