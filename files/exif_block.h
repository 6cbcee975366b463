#pragma once
#include <array>
#include <cstdint>

#include "picturezor/object.h"

namespace picturezor::files {

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
  Description = 0x10E,
  Make = 0x10F,
  Model = 0x110,
  Software = 0x131,
  Moment = 0x132,
  Artist = 0x13B,
  Copyright = 0x8298,
  IptcRecords = 0x83BB,
  CameraDirectory = 0x8769,
  PlaceDirectory = 0x8825,
  InteroperabilityDirectory = 0xA005,
  PixelsAcross = 0xA002,
  PixelsDown = 0xA003
};
enum FieldType : std::uint32_t { Short = 3, Long = 4, Ratio = 5 };

constexpr std::size_t EntrySize = 12;

/// Whether an entry's value is the place of another directory.
constexpr bool IsDirectory(std::uint32_t tag) {
  return tag == CameraDirectory || tag == PlaceDirectory || tag == InteroperabilityDirectory;
}

/// Numbers at places in a block; 0 beyond its end, where nothing is written either.
class ExifBlock {
 public:
  explicit ExifBlock(Bytes bytes)
      : At(std::move(bytes)), Little(At.size() > 1 && At[0] == 'I' && At[1] == 'I') {}

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
  /// The bytes of an entry's values; more than four of them stand elsewhere.
  std::uint64_t SizeOf(std::size_t entry) const {
    constexpr std::array sizes = {0, 1, 1, 2, 4, 8, 1, 1, 2, 4, 8, 4, 8, 4};
    const std::size_t type = Number(entry + 2, 2), known = sizes.size();
    return type < known ? std::uint64_t{Number(entry + 4, 4)} * std::uint64_t(sizes[type]) : 0;
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

}
