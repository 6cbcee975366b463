#pragma once
#include <filesystem>
#include <string>

namespace picturezor::files {

/// From now on a signal that ends the program takes along the files named to RemoveOnDeath; the program then
/// dies by that signal. A full disk under a mapped file, which comes as a signal too, ends it with `exitCode`
/// and a line on stderr.
void CatchSignals(int exitCode);
void RemoveOnDeath(const std::filesystem::path& file, bool directory = false);
void KeepOnDeath(const std::filesystem::path& file);

/// A file that comes to stand under its target's name when it is complete, and not before. Until then it is
/// beside it under a name of its own, and goes away with this object.
class OutputFile {
 public:
  /// Throws Failure where the target can't be written.
  explicit OutputFile(const std::filesystem::path& target);
  OutputFile(const OutputFile&) = delete;
  ~OutputFile();

  int Descriptor() const { return File; }
  const std::filesystem::path& Target() const { return Name; }
  void Commit();

 private:
  std::filesystem::path Name, Real, Temporary;
  int File = -1;
};

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
