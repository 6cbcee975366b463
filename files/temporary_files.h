#pragma once
#include <csignal>
#include <cstdint>
#include <filesystem>
#include <span>
#include <string_view>

#include "output.h"

namespace picturezor::files {

/// From now on a signal that ends the program takes its unfinished files along; the program then dies by that
/// signal. A full disk under a mapped file, which comes as a signal too, ends it with `exitCode`
/// and a line on stderr.
void CatchSignals(int exitCode);

/// No signal ends the program while there is one.
class SignalsHeldBack {
 public:
  SignalsHeldBack() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_BLOCK, &all, &Before);
  }
  SignalsHeldBack(const SignalsHeldBack&) = delete;
  ~SignalsHeldBack() { pthread_sigmask(SIG_SETMASK, &Before, nullptr); }

 private:
  sigset_t Before;
};

/// $TMPDIR, or /var/tmp, which lies on a disk where /tmp may lie in memory.
std::filesystem::path DefaultTempDirectory();

/// What the names of files begin with that are on their way to another name. A run that is killed at that
/// very moment leaves one.
inline constexpr const char* TemporaryPrefix = ".picturezor-";

/// A file that comes to stand under its target's name when it is complete, and not before. Until then it has
/// no name where the file system allows that, or one of its own beside the target, and goes away with this
/// object.
class OutputFile final : public Output {
 public:
  /// Throws Failure where the target can't be written.
  explicit OutputFile(const std::filesystem::path& target);
  ~OutputFile() override;
  void Commit() override;

 private:
  /// Calls make(a name beside the target), and gets its descriptor or 0, until there was no such file.
  template <class Make>
  int WithNewName(Make&& make);

  std::filesystem::path Real, Temporary;
};

/// A new file in a directory, without a name, to read and write. Throws Failure where there can't be one.
int NamelessFile(const std::filesystem::path& directory);
/// Throws Failure with the target's name.
void WriteAll(int descriptor, std::span<const std::uint8_t> bytes, const std::filesystem::path& target);
void WriteAll(int descriptor, std::string_view text, const std::filesystem::path& target);

/// A directory that only this process sees, gone with this object.
class PrivateDirectory {
 public:
  /// Throws Failure where there can't be one.
  explicit PrivateDirectory(const std::filesystem::path& parent);
  PrivateDirectory(const PrivateDirectory&) = delete;
  ~PrivateDirectory();
  const std::filesystem::path& Path() const { return At; }

 private:
  std::filesystem::path At;
};

}
