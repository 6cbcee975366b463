#include "kept_sums.h"

#include "failure.h"

namespace picturezor::tiles {

namespace {

using files::Failure;

/// Rows of a level that a part holds, at most; to know a damaged file before memory is taken for it.
constexpr std::size_t MostRows = 64;
constexpr const char* Damaged = "the file is damaged; remove it, and make that part again";

void Append(Bytes& bytes, std::uint32_t number) {
  for (int shift = 0; shift < 32; shift += 8) bytes.push_back(std::uint8_t(number >> shift));
}

std::uint32_t NumberAt(const std::uint8_t* bytes) {
  return bytes[0] | std::uint32_t{bytes[1]} << 8 | std::uint32_t{bytes[2]} << 16 |
         std::uint32_t{bytes[3]} << 24;
}

}

SumsWriter::SumsWriter(const std::filesystem::path& file, const std::string& task) : File(file) {
  files::WriteAll(File.Descriptor(), task + "\n", File.Target());
}

void SumsWriter::Add(const BoxLevels::Part& part, int first) {
  Buffer.clear();
  for (std::size_t k = std::size_t(first); k < part.size(); ++k) {
    const BoxLevels::LevelPart& level = part[k];
    Append(Buffer, std::uint32_t(level.HeadEnds));
    Append(Buffer, std::uint32_t(level.Whole.size()));
    Buffer.insert(Buffer.end(), level.Whole.begin(), level.Whole.end());
    for (const auto& sums : {level.Head, level.Tail}) {
      Append(Buffer, std::uint32_t(sums.size()));
      for (const std::uint32_t sum : sums) Append(Buffer, sum);
    }
  }
  files::WriteAll(File.Descriptor(), Buffer, File.Target());
}

SumsReader::SumsReader(const std::filesystem::path& file, const std::string& task)
    : Name(file), Stream(file, std::ios::binary) {
  std::string whose;
  if (!std::getline(Stream, whose)) throw Failure(file, "this part isn't made yet");
  if (whose != task) throw Failure(file, "a part of something else");
}

void SumsReader::Read(Bytes& bytes, std::size_t count) {
  bytes.resize(count);
  if (!Stream.read(reinterpret_cast<char*>(bytes.data()), std::streamsize(count)))
    throw Failure(Name, Damaged);
}

std::size_t SumsReader::Number() {
  Bytes bytes;
  Read(bytes, sizeof(std::uint32_t));
  return NumberAt(bytes.data());
}

std::vector<std::uint32_t> SumsReader::Sums(std::size_t samples) {
  const std::size_t count = Number();
  if (count != 0 && count != samples) throw Failure(Name, Damaged);
  Bytes bytes;
  Read(bytes, count * sizeof(std::uint32_t));
  std::vector<std::uint32_t> sums(count);
  for (std::size_t i = 0; i < count; ++i) sums[i] = NumberAt(&bytes[i * sizeof(std::uint32_t)]);
  return sums;
}

std::optional<BoxLevels::Part> SumsReader::Next(int first, std::span<const std::size_t> samples) {
  if (Stream.peek() == std::ifstream::traits_type::eof()) return std::nullopt;
  BoxLevels::Part part(samples.size());
  for (std::size_t k = std::size_t(first); k < samples.size(); ++k) {
    BoxLevels::LevelPart& level = part[k];
    level.HeadEnds = Number() != 0;
    const std::size_t bytes = Number();
    if (bytes % samples[k] != 0 || bytes / samples[k] > MostRows) throw Failure(Name, Damaged);
    Read(level.Whole, bytes);
    level.Head = Sums(samples[k]);
    level.Tail = Sums(samples[k]);
  }
  return part;
}

bool HasSums(const std::filesystem::path& file, const std::string& task) {
  std::ifstream stream(file, std::ios::binary);
  std::string whose;
  return std::getline(stream, whose) && whose == task;
}

}
