#pragma once
#include "image_file.h"
#include "tiff_handle.h"

namespace picturezor::files {

/// Gathers what the directory at a place of a TIFF file tells of the camera and the picture into a block of
/// EXIF, and the records of IPTC. For files with offsets of 32 bits. What is damaged counts as not there.
void ReadTIFFNotes(const Input& input, std::int64_t directory, bool bigEndian, ImageInfo& info);

/// Puts a block of EXIF behind the header of a file that has only just been started, in the byte order of the
/// block, and sets the tags that tell of it.
void WriteTIFFNotes(TIFFHandle& file, int descriptor, const std::filesystem::path& target, Bytes exif);

}
