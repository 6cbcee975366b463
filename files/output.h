#pragma once
#include <filesystem>
#include <span>

#include "picturezor/object.h"

namespace picturezor::files {

/// Where an image is written to: a descriptor that is written from the beginning. Only what is committed
/// counts. Failures are thrown as Failure with the target's name.
class Output {
 public:
  explicit Output(const std::filesystem::path& target) : Name(target) {}
  Output(const Output&) = delete;
  virtual ~Output();

  int Descriptor() const { return File; }
  const std::filesystem::path& Target() const { return Name; }
  /// The image is complete.
  virtual void Commit() = 0;

 protected:
  std::filesystem::path Name;
  int File = -1;
};

/// An open descriptor, a pipe for instance, which stays the caller's. Where the image's type doesn't write in
/// order, a nameless file in `spool` takes it until it is complete.
class OutputDescriptor final : public Output {
 public:
  OutputDescriptor(int descriptor, const std::filesystem::path& target, bool inOrder,
                   const std::filesystem::path& spool);
  void Commit() override;

 private:
  const int Goal;
  const bool Direct;
};

/// Bytes in memory.
class OutputBytes final : public Output {
 public:
  explicit OutputBytes(const std::filesystem::path& name);
  void Commit() override;
  /// What was written, once it is complete.
  Bytes Result;
};

}
