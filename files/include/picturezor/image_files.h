#pragma once
#include <filesystem>
#include <span>
#include <string>

#include "picturezor/picture.h"

namespace picturezor {

// Image files for programs that embed the library; docs/files.md lists their types. What can't be done throws
// std::runtime_error with one line that names the file and the reason.

/// Reads an image file upright, as gray, RGB or CMYK, with alpha where the file has it. The picture lives in
/// memory, or in a nameless temporary file where it would take more than half of what is free.
Picture LoadImage(const std::filesystem::path& file);
/// The same of a file whose bytes are in memory. `name` stands for it in failures.
Picture DecodeImage(std::span<const std::uint8_t> bytes, const std::string& name = "image");
/// As a picture of the host, with a mask where the file has alpha. Throws for one beyond 32767 pixels on a
/// side.
HostPicture LoadHostPicture(const std::filesystem::path& file);

/// Writes a picture of any format with colours; the name's ending says the type of the file. Alpha is left
/// out where a type has none, as JPEG. The file stands under its name when it is complete, and not before.
/// Throws for a picture that isn't `Valid`, pixels without colours, an ending that no type has, and a size
/// that its type can't hold.
void SaveImage(const std::filesystem::path& file, const Picture& picture);
/// The bytes of such a file, of a type named by the ending of its files: "png", "jpg", "tif".
Bytes EncodeImage(const std::string& type, const Picture& picture);
/// The red of a mask becomes alpha: white is opaque.
void SaveImage(const std::filesystem::path& file, const HostPicture& picture);

}
