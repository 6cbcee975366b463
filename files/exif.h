#pragma once
#include <optional>
#include <span>

#include "image_file.h"

namespace picturezor::files {

/// What of a camera's notes matters here.
struct Exif {
  int Orientation = 1;
  std::optional<Resolution> Density;
};

/// Reads a block of EXIF, from its byte order mark on. What is damaged counts as not there.
Exif ReadExif(std::span<const std::uint8_t> block);

/// Keeps a block that a file holds, and takes the orientation and the resolution from it. "Exif" and two
/// zeros before it, which some files have, are left out.
void SetExif(ImageInfo& info, Bytes block);
/// The same with a box of HEIF or JPEG XL, which begins with the block's place behind that number. Decoders
/// of these turn pictures upright themselves.
void SetExifOfBox(ImageInfo& info, const Bytes& box);

/// The block of EXIF that belongs into a file of `info`: the notes it came with, with an upright orientation,
/// the size and resolution of `info` and without a thumbnail. Nothing else moves, so that notes of makers
/// which count from the block's beginning stay right. Empty where there is nothing to tell.
Bytes ExifToWrite(const ImageInfo& info);
/// The same for XMP, where its properties of that kind are made true.
Bytes XmpToWrite(const ImageInfo& info);

/// The records of IPTC in a marker of JPEG that begins with "Photoshop 3.0"; empty where it doesn't.
Bytes IptcOfResources(std::span<const std::uint8_t> marker);
/// The content of such a marker; empty where there are no records.
Bytes ResourcesWithIptc(const Bytes& iptc);

}
