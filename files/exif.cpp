#include "exif.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>

#include "exif_block.h"

namespace picturezor::files {

namespace {

/// What a directory tells of a thumbnail is overwritten, or cut off where it ends the block.
void DropThumbnail(ExifBlock& block, std::size_t directory) {
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

void PutSize(ExifBlock& block, std::size_t directory, const ImageInfo& info) {
  block.ForEntries(directory, [&](std::size_t entry, std::uint32_t tag) {
    if (tag == PixelsAcross) block.PutEntry(entry, tag, Long, std::uint32_t(info.Width));
    if (tag == PixelsDown) block.PutEntry(entry, tag, Long, std::uint32_t(info.Height));
  });
}

}

Exif ReadExif(std::span<const std::uint8_t> bytes) {
  Exif exif;
  const ExifBlock block(Bytes(bytes.begin(), bytes.end()));
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

void SetExifOfBox(ImageInfo& info, const Bytes& box) {
  if (box.size() < 4) return;
  const std::uint32_t at = std::uint32_t(box[0]) << 24 | box[1] << 16 | box[2] << 8 | box[3];
  if (at < box.size() - 4) SetExif(info, Bytes(box.begin() + 4 + std::ptrdiff_t(at), box.end()));
  info.Orientation = 1;
}

Bytes ExifToWrite(const ImageInfo& info) {
  ExifBlock block(info.Exif);
  if (!block.Valid()) {
    if (!info.Density) return {};
    block = ExifBlock({'M', 'M', 0, 42, 0, 0, 0, 0});
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

namespace {

constexpr std::string_view ResourcesStart("Photoshop 3.0\0", 14), ResourceStart("8BIM");
constexpr std::uint32_t IptcResource = 0x0404;

}

Bytes IptcOfResources(std::span<const std::uint8_t> marker) {
  if (!StartsWith(marker, ResourcesStart)) return {};
  // Four letters, a number, a name that tells its length, the size; name and content fill pairs of bytes.
  const ExifBlock block(Bytes(marker.begin(), marker.end()));
  for (std::size_t at = ResourcesStart.size(); block.Holds(at, 12);) {
    if (!StartsWith(marker.subspan(at), ResourceStart)) return {};
    const std::size_t name = (1 + block.Number(at + 6, 1) + 1) / 2 * 2;
    const std::size_t size = block.Number(at + 6 + name, 4), content = at + 10 + name;
    if (!block.Holds(content, size)) return {};
    const auto first = marker.begin() + std::ptrdiff_t(content);
    if (block.Number(at + 4, 2) == IptcResource) return Bytes(first, first + std::ptrdiff_t(size));
    at = content + (size + 1) / 2 * 2;
  }
  return {};
}

Bytes ResourcesWithIptc(const Bytes& iptc) {
  if (iptc.empty()) return {};
  std::string start(ResourcesStart);
  start += ResourceStart;
  start += {char(IptcResource >> 8), char(IptcResource & 255), 0, 0};
  for (int shift = 24; shift >= 0; shift -= 8) start += char(iptc.size() >> shift);
  Bytes marker(start.begin(), start.end());
  marker.insert(marker.end(), iptc.begin(), iptc.end());
  marker.resize((marker.size() + 1) / 2 * 2);
  return marker;
}

}
