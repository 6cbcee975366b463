#pragma once
#include <filesystem>
#include <stdexcept>
#include <string>

namespace picturezor::files {

/// What keeps some work from being done, in one line for a person.
class Failure : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
  Failure(const std::filesystem::path& file, const std::string& reason)
      : std::runtime_error(file.string() + ": " + reason) {}
};

/// What was asked for is wrong by itself, whatever the image.
class UsageFailure : public Failure {
 public:
  using Failure::Failure;
};

}
