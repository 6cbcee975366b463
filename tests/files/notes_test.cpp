#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <fstream>
#include <string>

#include "exif.h"
#include "failure.h"
#include "image_file.h"
#include "output.h"
#include "temporary_files.h"

// Notes of cameras and programs, on their way through every type, as another program reads them.

namespace picturezor::files {

namespace {

using testing::HasSubstr;
using testing::Not;

Bytes BytesOf(std::string_view text) { return Bytes(text.begin(), text.end()); }

/// Made by a camera that stood on its side: 160 x 120 pixels, a thumbnail, a note of the maker's.
Bytes CameraExif() {
  Bytes block = BytesOf({"MM\0\x2A\0\0\0\x08", 8});
  const auto entry = [&](std::array<std::uint8_t, 12> bytes) {
    block.insert(block.end(), bytes.begin(), bytes.end());
  };
  block.insert(block.end(), {0, 3});
  entry({0x01, 0x0F, 0, 2, 0, 0, 0, 6, 0, 0, 0, 150});  // Make, at 150
  entry({0x01, 0x12, 0, 3, 0, 0, 0, 1, 0, 6, 0, 0});    // Orientation
  entry({0x87, 0x69, 0, 4, 0, 0, 0, 1, 0, 0, 0, 50});   // the camera's directory, at 50
  block.insert(block.end(), {0, 0, 0, 104});            // that of the thumbnail, at 104
  block.insert(block.end(), {0, 4});
  entry({0x90, 0x00, 0, 7, 0, 0, 0, 4, '0', '2', '3', '0'});  // ExifVersion
  entry({0x92, 0x7C, 0, 7, 0, 0, 0, 8, 0, 0, 0, 156});        // MakerNote, at 156
  entry({0xA0, 0x02, 0, 3, 0, 0, 0, 1, 0, 160, 0, 0});        // PixelXDimension
  entry({0xA0, 0x03, 0, 3, 0, 0, 0, 1, 0, 120, 0, 0});        // PixelYDimension
  block.insert(block.end(), {0, 0, 0, 0});
  block.insert(block.end(), {0, 3});
  entry({0x01, 0x03, 0, 3, 0, 0, 0, 1, 0, 6, 0, 0});    // Compression
  entry({0x02, 0x01, 0, 4, 0, 0, 0, 1, 0, 0, 0, 164});  // JPEGInterchangeFormat, at 164
  entry({0x02, 0x02, 0, 4, 0, 0, 0, 1, 0, 0, 0, 10});   // its length
  block.insert(block.end(), {0, 0, 0, 0, 0, 0, 0, 0});
  block.resize(150);
  const Bytes rest = BytesOf({"Maker\0theirown\xFF\xD8thumb\0\xFF\xD9", 25});
  block.insert(block.end(), rest.begin(), rest.end());
  block.resize(174);
  return block;
}

ImageInfo CameraInfo() {
  ImageInfo info;
  info.Width = 31;
  info.Height = 17;
  info.Pixels = Format::RGB;
  info.Density = Resolution{254, 127};
  info.Exif = CameraExif();
  info.Xmp = BytesOf(
      "<x:xmpmeta xmlns:x='adobe:ns:meta/'><rdf:RDF xmlns:rdf='http://www.w3.org/1999/02/22-rdf-syntax-ns#'>"
      "<rdf:Description xmlns:tiff='http://ns.adobe.com/tiff/1.0/' "
      "xmlns:exif='http://ns.adobe.com/exif/1.0/' "
      "tiff:Orientation='6' tiff:Artist='Somebody'><exif:PixelXDimension>160</exif:PixelXDimension>"
      "</rdf:Description></rdf:RDF></x:xmpmeta>");
  info.Iptc =
      BytesOf({"\x1C\x02\x19\0\x04lake\x1C\x02\x05\0\x04"
               "Dusk",
               18});
  return info;
}

std::string Said(const std::string& command) {
  std::FILE* pipe = popen(command.c_str(), "r");
  std::string out;
  std::array<char, 4096> buffer;
  for (std::size_t got; (got = std::fread(buffer.data(), 1, buffer.size(), pipe)) > 0;)
    out.append(buffer.data(), got);
  pclose(pipe);
  return out;
}

// Catches notes that a type loses, and what isn't true any more of the picture they come with.
TEST(Notes, GoThroughEveryType) {
  const PrivateDirectory directory("/tmp");
  ImageInfo info = CameraInfo();
  const Bytes row(std::size_t(info.Width) * 3, 100);
  bool records = true;
  for (const char* name : {"jpg", "tif", "png", "webp", "jxl", "avif", "heic", "jp2", "jpg", "tif"}) {
    SCOPED_TRACE(name);
    const FileType* type = nullptr;
    try {
      type = &TypeByName(name);
    } catch (const Failure&) {
      continue;  // Not built.
    }
    OutputBytes output("made");
    const auto writer = type->Create(output.Descriptor(), "made", info, {});
    for (int y = 0; y < info.Height; ++y) writer->WriteRow(row.data());
    writer->Finish();
    output.Commit();
    const std::string path = (directory.Path() / "a.").string() + name;
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(output.Result.data()), std::streamsize(output.Result.size()));
    const std::string said = Said("exiftool -G1 -n -s -a -u -U " + path);
    std::filesystem::remove(path);
    const auto line = [](std::string group, std::string tag, const std::string& value) {
      group = "[" + group + "]";
      group.resize(std::max<std::size_t>(group.size(), 16), ' ');
      tag.resize(std::max<std::size_t>(tag.size(), 32), ' ');
      return group + tag + ": " + value + "\n";
    };
    for (const std::string& expected :
         {line("IFD0", "Make", "Maker"), line("IFD0", "Orientation", "1"), line("IFD0", "XResolution", "254"),
          line("IFD0", "YResolution", "127"), line("ExifIFD", "ExifImageWidth", "31"),
          line("ExifIFD", "ExifImageHeight", "17"), line("XMP-tiff", "Orientation", "1"),
          line("XMP-tiff", "Artist", "Somebody"), line("XMP-exif", "ExifImageWidth", "31")})
      EXPECT_NE(said.find(expected), said.npos) << expected;
    for (const std::string wrong : {"Thumbnail", "Error"}) EXPECT_EQ(said.find(wrong), said.npos) << wrong;
    // Only JPEG and TIFF have a place for those.
    records &= type->Name == std::string("JPEG") || type->Name == std::string("TIFF");
    EXPECT_EQ(said.find(line("IPTC", "Keywords", "lake")) != said.npos, records);

    const auto reader = OpenImage(Input::Memory(output.Result, "made"), {.MemoryLimit = 64 << 20});
    info = reader->Info();
    EXPECT_EQ(info.Orientation, 1);
    ASSERT_TRUE(info.Density);
    EXPECT_NEAR(info.Density->X, 254, 0.01);
    EXPECT_NEAR(info.Density->Y, 127, 0.01);
    const std::string kept(info.Exif.begin(), info.Exif.end());
    EXPECT_THAT(kept, HasSubstr("theirown"));
    EXPECT_THAT(kept, Not(HasSubstr("thumb")));
  }
}

// Catches a block that leads out of itself, or round in circles.
TEST(Notes, SurviveDamage) {
  const Bytes whole = CameraExif();
  for (std::size_t at = 2; at < whole.size(); ++at)
    for (const std::uint8_t value : {0x00, 0x01, 0x7F, 0xFF}) {
      ImageInfo info = CameraInfo();
      info.Exif[at] = value;
      const Bytes written = ExifToWrite(info);
      EXPECT_EQ(ReadExif(written).Orientation, 1);
      info.Exif.resize(at);
      ExifToWrite(info);
    }
}

}

}
