#pragma once
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>

#include "box_levels.h"
#include "temporary_files.h"

namespace picturezor::tiles {

// What a part of a pyramid keeps for the levels that are made when all parts are there: a line that says
// whose it is, and the sums of its rows as little-endian numbers.

/// Writes them. The file stands under its name when it is complete. Throws files::Failure.
class SumsWriter {
 public:
  SumsWriter(const std::filesystem::path& file, const std::string& task);
  /// Of the levels from `first` on, in the order of BoxLevels.
  void Add(const BoxLevels::Part& part, int first);
  void Commit() { File.Commit(); }

 private:
  files::OutputFile File;
  Bytes Buffer;
};

class SumsReader {
 public:
  /// Throws files::Failure where the file isn't there, or of another task.
  SumsReader(const std::filesystem::path& file, const std::string& task);
  /// The next of the parts that were added, the levels before `first` empty; none at the end. `samples` are
  /// those of a row of each level. Throws files::Failure for a damaged file.
  std::optional<BoxLevels::Part> Next(int first, std::span<const std::size_t> samples);

 private:
  std::size_t Number();
  void Read(Bytes& bytes, std::size_t count);
  std::vector<std::uint32_t> Sums(std::size_t samples);

  std::filesystem::path Name;
  std::ifstream Stream;
};

/// Whether a part is there and of that task.
bool HasSums(const std::filesystem::path& file, const std::string& task);

}
