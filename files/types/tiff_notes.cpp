#include "tiff_notes.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "exif_block.h"
#include "failure.h"
#include "temporary_files.h"

namespace picturezor::files {

namespace {

constexpr std::uint32_t Texts[] = {Description, Make, Model, Software, Moment, Artist, Copyright};
constexpr std::size_t HeaderSize = 8;

/// Copies directories and what their entries point to from a file into a block that lies together.
class Gatherer {
 public:
  Gatherer(const Input& input, bool bigEndian)
      : From(input),
        Into(bigEndian ? Bytes{'M', 'M', 0, 42, 0, 0, 0, 0} : Bytes{'I', 'I', 42, 0, 0, 0, 0, 0}) {}

  Bytes Iptc;

  /// Empty where the first directory has nothing to tell.
  Bytes Gather(std::int64_t directory) {
    Into.Put(4, 4, Copy(directory, 0));
    return Into.Number(4, 4) ? std::move(Into.At) : Bytes();
  }

 private:
  /// Deeper than cameras go, and far more than they write.
  static constexpr int MostDepth = 3;
  static constexpr std::size_t MostBytes = 16 << 20;

  /// Gives the place in the block, or 0 where nothing of the directory is there.
  std::uint32_t Copy(std::int64_t directory, int depth) {
    // A directory in the file's order of bytes, read as a block of its own.
    Bytes start(4, Into.At[0]);
    if (depth > MostDepth || From.ReadAt(directory, std::span(start).subspan(2)) != 2) return 0;
    ExifBlock file(std::move(start));
    const std::size_t entries = file.Number(2, 2);
    file.At.resize(4 + entries * EntrySize);
    file.At.resize(4 + From.ReadAt(directory + 2, std::span(file.At).subspan(4)));
    std::vector<std::size_t> kept;
    file.ForEntries(2, [&](std::size_t entry, std::uint32_t tag) {
      if (depth == 0 && tag == IptcRecords) Iptc = Values(file, entry);
      if (depth > 0 || IsDirectory(tag) || std::ranges::find(Texts, tag) != std::end(Texts))
        kept.push_back(entry);
    });
    if (kept.empty()) return 0;
    const std::size_t at = Append({}, 2 + kept.size() * EntrySize + 4);
    Into.Put(at, 2, std::uint32_t(kept.size()));
    for (std::size_t i = 0; i < kept.size(); ++i) {
      const std::size_t entry = at + 2 + i * EntrySize;
      std::copy_n(file.At.begin() + std::ptrdiff_t(kept[i]), EntrySize,
                  Into.At.begin() + std::ptrdiff_t(entry));
      if (IsDirectory(file.Number(kept[i], 2)))
        Into.Put(entry + 8, 4, Copy(file.Number(kept[i] + 8, 4), depth + 1));
      else if (file.SizeOf(kept[i]) > 4)
        Into.Put(entry + 8, 4, std::uint32_t(Append(Values(file, kept[i]))));
    }
    return std::uint32_t(at);
  }

  Bytes Values(const ExifBlock& file, std::size_t entry) const {
    const std::uint64_t size = file.SizeOf(entry);
    if (size > MostBytes - std::min(MostBytes, Into.At.size())) return {};
    Bytes values(std::size_t(size), 0);
    if (size <= 4)
      std::copy_n(file.At.begin() + std::ptrdiff_t(entry) + 8, size, values.begin());
    else
      values.resize(From.ReadAt(file.Number(entry + 8, 4), values));
    return values;
  }

  /// Gives the place, an even one.
  std::size_t Append(const Bytes& bytes, std::size_t more = 0) {
    const std::size_t at = (Into.At.size() + 1) / 2 * 2;
    Into.At.resize(at);
    Into.At.insert(Into.At.end(), bytes.begin(), bytes.end());
    Into.At.resize(Into.At.size() + more);
    return at;
  }

  Input From;
  ExifBlock Into;
};

/// Makes the places in a directory count from further ahead.
void Shift(ExifBlock& block, std::size_t directory, std::uint32_t by, int depth = 0) {
  constexpr int mostDepth = 3;
  if (depth > mostDepth) return;
  const std::size_t end = block.ForEntries(directory, [&](std::size_t entry, std::uint32_t tag) {
    const std::uint32_t value = block.Number(entry + 8, 4);
    if (IsDirectory(tag)) Shift(block, value, by, depth + 1);
    if (IsDirectory(tag) || block.SizeOf(entry) > 4) block.Put(entry + 8, 4, value + by);
  });
  block.Put(end, 4, 0);
}

}

void ReadTIFFNotes(const Input& input, std::int64_t directory, bool bigEndian, ImageInfo& info) {
  Gatherer gatherer(input, bigEndian);
  info.Exif = gatherer.Gather(directory);
  info.Iptc = std::move(gatherer.Iptc);
}

void WriteTIFFNotes(TIFFHandle& file, int descriptor, const std::filesystem::path& target, Bytes exif) {
  ExifBlock block(std::move(exif));
  const std::size_t first = block.Number(4, 4);
  std::uint64_t camera = 0, place = 0;
  block.ForEntries(first, [&](std::size_t entry, std::uint32_t tag) {
    if (tag == CameraDirectory) camera = block.Number(entry + 8, 4);
    if (tag == PlaceDirectory) place = block.Number(entry + 8, 4);
    const std::uint64_t size = block.SizeOf(entry);
    const std::size_t at = size > 4 ? block.Number(entry + 8, 4) : entry + 8;
    if (std::ranges::find(Texts, tag) == std::end(Texts) || !block.Holds(at, std::size_t(size))) return;
    std::string text(block.At.begin() + std::ptrdiff_t(at), block.At.begin() + std::ptrdiff_t(at + size));
    text.erase(std::ranges::find(text, '\0'), text.end());
    if (!text.empty()) file.Set(tag, text.c_str());
  });
  if (!camera && !place) return;
  if (camera) file.Set(TIFFTAG_EXIFIFD, camera + HeaderSize);
  if (place) file.Set(TIFFTAG_GPSIFD, place + HeaderSize);
  Shift(block, first, HeaderSize);
  lseek(descriptor, HeaderSize, SEEK_SET);
  WriteAll(descriptor, block.At, target);
}

}
