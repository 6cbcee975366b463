#include "exif.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>

namespace picturezor::files {

namespace {

enum Tag : std::uint32_t {
  ImageWidth = 0x100,
  ImageLength = 0x101,
  StripOffsets = 0x111,
  OrientationTag = 0x112,
  XResolution = 0x11A,
  StripSizes = 0x117,
  YResolution = 0x11B,
  ResolutionUnit = 0x128,
  ThumbnailAt = 0x201,
  ThumbnailSize = 0x202,
  CameraDirectory = 0x8769,
  PixelsAcross = 0xA002,
  PixelsDown = 0xA003
};
enum FieldType : std::uint32_t { Short = 3, Long = 4, Ratio = 5 };

constexpr std::size_t EntrySize = 12;

/// Numbers at places in a block; 0 beyond its end, where nothing is written either.
class Block {
 public:
  explicit Block(Bytes bytes) : At(std::move(bytes)), Little(At.size() > 1 && At[0] == 'I' && At[1] == 'I') {}

  bool Valid() const { return Number(2, 2) == 42; }
  bool Holds(std::size_t place, std::size_t size) const {
    return place <= At.size() && size <= At.size() - place;
  }

  std::uint32_t Number(std::size_t place, std::size_t size) const {
    if (!Holds(place, size)) return 0;
    std::uint32_t number = 0;
    for (std::size_t i = 0; i < size; ++i) number = number << 8 | At[place + (Little ? size - 1 - i : i)];
    return number;
  }
  void Put(std::size_t place, std::size_t size, std::uint32_t number) {
    if (!Holds(place, size)) return;
    for (std::size_t i = 0; i < size; ++i)
      At[place + (Little ? i : size - 1 - i)] = std::uint8_t(number >> 8 * i);
  }

  double RatioAt(std::size_t place) const {
    const std::uint32_t divisor = Number(place + 4, 4);
    return divisor ? double(Number(place, 4)) / divisor : 0;
  }

  /// Calls `look` with the place of each entry of a directory and its tag; gives the place behind them.
  template <class Look>
  std::size_t ForEntries(std::size_t directory, Look&& look) const {
    std::size_t entry = directory + 2;
    for (std::uint32_t left = Number(directory, 2); left > 0 && Holds(entry, EntrySize);
         --left, entry += EntrySize)
      look(entry, Number(entry, 2));
    return entry;
  }
  /// The number that an entry holds, or 0.
  std::uint32_t ValueAt(std::size_t entry) const {
    return Number(entry + 8, Number(entry + 2, 2) == Short ? 2 : 4);
  }
  void PutEntry(std::size_t entry, std::uint32_t tag, std::uint32_t type, std::uint32_t value) {
    Put(entry, 2, tag);
    Put(entry + 2, 2, type);
    Put(entry + 4, 4, 1);
    Put(entry + 8, 4, 0);
    Put(entry + 8, type == Short ? 2 : 4, value);
  }

  Bytes At;

 private:
  bool Little;
};

/// What a directory tells of a thumbnail is overwritten, or cut off where it ends the block.
void DropThumbnail(Block& block, std::size_t directory) {
  std::size_t at = 0, size = 0;
  block.ForEntries(directory, [&](std::size_t entry, std::uint32_t tag) {
    if (tag == ThumbnailAt || tag == StripOffsets) at = block.ValueAt(entry);
    if (tag == ThumbnailSize || tag == StripSizes) size = block.ValueAt(entry);
  });
  if (at < 8 || !block.Holds(at, size)) return;
  if (at + size == block.At.size())
    block.At.resize(at);
  else
    std::memset(block.At.data() + at, 0, size);
}

void PutSize(Block& block, std::size_t directory, const ImageInfo& info) {
  block.ForEntries(directory, [&](std::size_t entry, std::uint32_t tag) {
    if (tag == PixelsAcross) block.PutEntry(entry, tag, Long, std::uint32_t(info.Width));
    if (tag == PixelsDown) block.PutEntry(entry, tag, Long, std::uint32_t(info.Height));
  });
}

}

Exif ReadExif(std::span<const std::uint8_t> bytes) {
  Exif exif;
  const Block block(Bytes(bytes.begin(), bytes.end()));
  if (!block.Valid()) return exif;
  Resolution density;
  double inches = 1;
  block.ForEntries(block.Number(4, 4), [&](std::size_t entry, std::uint32_t tag) {
    const std::uint32_t value = block.Number(entry + 8, 2);
    switch (tag) {
      case OrientationTag:
        if (value >= 1 && value <= 8) exif.Orientation = int(value);
        break;
      case XResolution: density.X = block.RatioAt(block.Number(entry + 8, 4)); break;
      case YResolution: density.Y = block.RatioAt(block.Number(entry + 8, 4)); break;
      case ResolutionUnit: inches = value == 3 ? 2.54 : 1; break;
    }
  });
  if (density.X > 0 && density.Y > 0) exif.Density = {density.X * inches, density.Y * inches};
  return exif;
}

void SetExif(ImageInfo& info, Bytes block) {
  constexpr std::string_view start("Exif\0\0", 6);
  if (StartsWith(block, start)) block.erase(block.begin(), block.begin() + std::ptrdiff_t(start.size()));
  const Exif read = ReadExif(block);
  info.Orientation = read.Orientation;
  if (read.Density) info.Density = read.Density;
  info.Exif = std::move(block);
}

Bytes ExifToWrite(const ImageInfo& info) {
  Block block(info.Exif);
  if (!block.Valid()) {
    if (!info.Density) return {};
    block = Block({'M', 'M', 0, 42, 0, 0, 0, 0});
  }
  using Entry = std::array<std::uint8_t, EntrySize>;
  std::vector<Entry> entries;
  const auto keep = [&](std::size_t entry) {
    std::copy_n(block.At.begin() + std::ptrdiff_t(entry), EntrySize, entries.emplace_back().begin());
  };
  const std::size_t first = block.Number(4, 4);
  const std::size_t end = block.ForEntries(first, [&](std::size_t entry, std::uint32_t tag) {
    switch (tag) {
      case OrientationTag:
      case XResolution:
      case YResolution:
      case ResolutionUnit:
      case ThumbnailAt:
      case ThumbnailSize: return;
      case CameraDirectory: PutSize(block, block.ValueAt(entry), info); break;
      case ImageWidth: block.PutEntry(entry, tag, Long, std::uint32_t(info.Width)); break;
      case ImageLength: block.PutEntry(entry, tag, Long, std::uint32_t(info.Height)); break;
    }
    keep(entry);
  });
  if (first) DropThumbnail(block, block.Number(end, 4));

  // The first directory is written anew, behind all else and what is to go into it.
  std::size_t at = block.At.size() + block.At.size() % 2;
  const auto add = [&](std::uint32_t tag, std::uint32_t type, std::uint32_t value) {
    block.At.resize(at + EntrySize);
    block.PutEntry(at, tag, type, value);
    keep(at);
  };
  const auto addRatio = [&](std::uint32_t tag, double value) {
    add(tag, Ratio, std::uint32_t(at));
    block.Put(at, 4, std::uint32_t(std::lround(std::clamp(value, 0.01, 4e7) * 100)));
    block.Put(at + 4, 4, 100);
    at += 8;
  };
  if (info.Density) {
    addRatio(XResolution, info.Density->X);
    addRatio(YResolution, info.Density->Y);
    add(ResolutionUnit, Short, 2);
  }
  add(OrientationTag, Short, 1);
  const bool little = block.At[0] == 'I';
  std::ranges::stable_sort(entries, {}, [&](const Entry& entry) {
    return little ? entry[0] | entry[1] << 8 : entry[0] << 8 | entry[1];
  });
  block.At.resize(at + 2 + entries.size() * EntrySize + 4);
  std::memcpy(&block.At[at + 2], entries.data(), entries.size() * EntrySize);
  block.Put(4, 4, std::uint32_t(at));
  block.Put(at, 2, std::uint32_t(entries.size()));
  block.Put(block.At.size() - 4, 4, 0);
  return std::move(block.At);
}

namespace {

/// Overwrites the value of a property, which stands as an attribute or as an element.
void SetProperty(std::string& text, const std::string& name, std::int64_t value) {
  for (std::size_t at = 0; (at = text.find(name, at)) != text.npos;) {
    at += name.size();
    std::size_t first = at, end = text.npos;
    if (text.compare(at, 2, "=\"") == 0 || text.compare(at, 2, "='") == 0) {
      first = at + 2;
      end = text.find(text[at + 1], first);
    } else if (text.compare(at, 1, ">") == 0) {
      first = at + 1;
      end = text.find('<', first);
    }
    // An end of an element follows nothing that is a number.
    if (end == text.npos || end == first || text.find_first_not_of("0123456789", first) != end) continue;
    text.replace(first, end - first, std::to_string(value));
  }
}

void DropElement(std::string& text, const std::string& name) {
  const std::string close = "</" + name + ">";
  for (std::size_t at; (at = text.find("<" + name)) != text.npos;) {
    const std::size_t end = text.find(close, at);
    if (end == text.npos) return;
    text.erase(at, end + close.size() - at);
  }
}

}

Bytes XmpToWrite(const ImageInfo& info) {
  std::string text(info.Xmp.begin(), info.Xmp.end());
  SetProperty(text, "tiff:Orientation", 1);
  SetProperty(text, "tiff:ImageWidth", info.Width);
  SetProperty(text, "tiff:ImageLength", info.Height);
  SetProperty(text, "exif:PixelXDimension", info.Width);
  SetProperty(text, "exif:PixelYDimension", info.Height);
  DropElement(text, "xmp:Thumbnails");
  DropElement(text, "xap:Thumbnails");
  return Bytes(text.begin(), text.end());
}

}
