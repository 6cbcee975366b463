#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <tiffio.h>
#include <unistd.h>
#include <zlib.h>

#include <array>
#include <cmath>
#include <cstdio>
#include <fstream>

#include "failure.h"
#include "image_file.h"
#include "output.h"
#include "temporary_files.h"

// Every type of files, read and written through memory and pipes, and looked at by other programs.

namespace picturezor::files {

namespace {

const ReadOptions Generous{.MemoryLimit = 64 << 20};

ImageInfo InfoOf(Format format) {
  ImageInfo info;
  info.Width = 37;
  info.Height = 23;
  info.Pixels = format;
  return info;
}

/// Slow waves, which lossy types keep well.
Bytes Waves(const ImageInfo& info) {
  const int channels = ChannelsOf(info.Pixels);
  Bytes samples;
  for (int y = 0; y < info.Height; ++y)
    for (int x = 0; x < info.Width; ++x)
      for (int c = 0; c < channels; ++c)
        samples.push_back(std::uint8_t(128 + 100 * std::sin((x + 2 * y) / 15.0 + c)));
  return samples;
}

Bytes Written(const FileType& type, const ImageInfo& info, const Bytes& samples,
              const WriteOptions& options) {
  OutputBytes output("made");
  const auto writer = type.Create(output.Descriptor(), "made", info, options);
  const std::size_t row = samples.size() / std::size_t(info.Height);
  for (std::size_t at = 0; at < samples.size(); at += row) writer->WriteRow(&samples[at]);
  writer->Finish();
  output.Commit();
  return output.Result;
}

Bytes Read(const Input& input, const Rect& part = {}) {
  auto reader = OpenImage(input, Generous);
  if (part.Width) reader = PartOf(std::move(reader), part);
  const std::size_t row = std::size_t(reader->Info().Width) * std::size_t(ChannelsOf(reader->Info().Pixels));
  Bytes samples(row * std::size_t(reader->Info().Height));
  for (std::size_t at = 0; at < samples.size(); at += row) reader->ReadRow(&samples[at]);
  reader->Finish();
  return samples;
}

double MeanDifference(const Bytes& a, const Bytes& b) {
  if (a.size() != b.size() || a.empty()) return 255;
  double sum = 0;
  for (std::size_t i = 0; i < a.size(); ++i) sum += std::abs(a[i] - b[i]);
  return sum / double(a.size());
}

Bytes ThroughPipe(const Bytes& bytes) {
  int ends[2];
  if (pipe(ends) != 0) throw Failure("no pipe");
  WriteAll(ends[1], bytes, "pipe");
  close(ends[1]);
  const Input input = Input::Descriptor(ends[0], "pipe");
  close(ends[0]);
  EXPECT_FALSE(input.Seekable());
  return Read(input);
}

// Catches samples lost or moved by a writer or a reader, and ways in that differ from each other.
TEST(Types, GiveBackWhatTheyTook) {
  for (const FileType* type : FileTypes()) {
    if (!type->Create) continue;
    const bool lossy = type->Name == std::string("JPEG");
    for (const Format format : type->Holds) {
      SCOPED_TRACE(std::string(type->Name) + ", " + Describe(format));
      const ImageInfo info = InfoOf(format);
      const Bytes samples = Waves(info);
      const Bytes file = Written(*type, info, samples, {.Quality = 100, .Lossless = !lossy});
      const Input input = Input::Memory(file, "made");
      EXPECT_STREQ(OpenImage(input, Generous)->Info().Type->Name, type->Name);
      const Bytes read = Read(input);
      EXPECT_LE(MeanDifference(read, samples), lossy ? 2 : 0);
      EXPECT_EQ(ThroughPipe(file), read);
      const int channels = ChannelsOf(format);
      Bytes part;
      for (int y = 5; y < 12; ++y)
        part.insert(part.end(), &read[std::size_t((y * 37 + 3) * channels)],
                    &read[std::size_t((y * 37 + 33) * channels)]);
      EXPECT_EQ(Read(input, {3, 5, 30, 7}), part);
      EXPECT_THROW(Read(Input::Memory(std::span(file).first(file.size() * 2 / 3), "cut")), Failure);
    }
  }
}

/// Netpbm's plain types, which need no library.
Bytes SamplesOf(const std::string& pnm) {
  int most = 0, width = 0, height = 0, at = 0;
  char kind = 0;
  if (std::sscanf(pnm.c_str(), "P%c %d %d %d%n", &kind, &width, &height, &most, &at) != 4) return {};
  const auto start = pnm.begin() + at + 1;
  return Bytes(start, pnm.end());
}

// Catches what a type's reader and writer get wrong alike.
TEST(Types, AreReadByOtherPrograms) {
  const PrivateDirectory directory("/tmp");
  const struct {
    const char *Ending, *Command;
    double Off;
  } cases[] = {
      {"png", "pngtopnm $F", 0},
      {"tif", "tifftopnm -quiet $F", 0},
      {"ppm", "pnmtopnm $F", 0},
      {"jpg", "djpeg -pnm $F", 2},
      {"webp", "dwebp -quiet -ppm $F -o -", 0},
      {"jxl", "djxl --quiet $F $F.ppm && cat $F.ppm", 0},
      {"jp2", "opj_decompress -quiet -i $F -o $F.ppm && pnmtopnm $F.ppm", 0},
      {"avif", "heif-convert $F $F.png > /dev/null && pngtopnm $F.png", 0},
      {"heic", "heif-convert $F $F.png > /dev/null && pngtopnm $F.png", 0},
  };
  for (const auto& [ending, command, off] : cases) {
    const FileType* type = nullptr;
    try {
      type = &TypeByName(ending);
    } catch (const Failure&) {
      continue;  // Not built.
    }
    SCOPED_TRACE(ending);
    const ImageInfo info = InfoOf(Format::RGB);
    const Bytes samples = Waves(info);
    const Bytes file = Written(*type, info, samples, {.Quality = 100, .Lossless = off == 0});
    const std::string path = (directory.Path() / "a.").string() + ending;
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(file.data()), std::streamsize(file.size()));
    std::FILE* pipe = popen(("F=" + path + "; " + command).c_str(), "r");
    std::string out;
    std::array<char, 4096> buffer;
    for (std::size_t got; (got = std::fread(buffer.data(), 1, buffer.size(), pipe)) > 0;)
      out.append(buffer.data(), got);
    pclose(pipe);
    EXPECT_LE(MeanDifference(SamplesOf(out), samples), off);
  }
  for (const auto& entry : std::filesystem::directory_iterator(directory.Path()))
    std::filesystem::remove(entry);
}

/// A TIFF of 64 x 48 with a copy of half its size behind it, a page of 8 x 5, and a mask.
Bytes PagesInTIFF() {
  const PrivateDirectory directory("/tmp");
  const std::string path = (directory.Path() / "a.tif").string();
  TIFF* file = TIFFOpen(path.c_str(), "w");
  const struct {
    std::uint32_t Width, Height, Kind;
    std::uint8_t Sample;
  } pages[] = {
      {64, 48, 0, 10}, {32, 24, FILETYPE_REDUCEDIMAGE, 20}, {8, 5, 0, 30}, {8, 5, FILETYPE_MASK, 40}};
  for (const auto& page : pages) {
    TIFFSetField(file, TIFFTAG_SUBFILETYPE, page.Kind);
    TIFFSetField(file, TIFFTAG_IMAGEWIDTH, page.Width);
    TIFFSetField(file, TIFFTAG_IMAGELENGTH, page.Height);
    TIFFSetField(file, TIFFTAG_BITSPERSAMPLE, 8);
    TIFFSetField(file, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_MINISBLACK);
    Bytes row(page.Width, page.Sample);
    for (std::uint32_t y = 0; y < page.Height; ++y) TIFFWriteScanline(file, row.data(), y);
    TIFFWriteDirectory(file);
  }
  TIFFClose(file);
  const Input input(path);
  Bytes bytes(std::size_t(input.Size()));
  input.ReadAt(0, bytes);
  std::filesystem::remove(path);
  return bytes;
}

// Catches pages that are counted wrong, and a copy that is taken for a page or for the picture.
TEST(Types, TIFFOfSeveralPages) {
  const Bytes file = PagesInTIFF();
  const Input input = Input::Memory(file, "made");
  const struct {
    int Page, LeastWidth;
    std::int32_t Width;
    std::uint8_t Sample;
  } cases[] = {{0, 0, 64, 10}, {0, 33, 64, 10}, {0, 32, 32, 20},
               {0, 5, 32, 20}, {1, 0, 8, 30},   {1, 2, 8, 30}};
  for (const auto& [page, least, width, sample] : cases) {
    SCOPED_TRACE(testing::Message() << page << ", " << least);
    const auto reader = OpenImage(input, {.MemoryLimit = 64 << 20, .Page = page});
    EXPECT_EQ(reader->Info().Pages, 2);
    EXPECT_EQ(reader->Info().Levels.size(), page == 0 ? 1 : 0);
    if (least) reader->Reduce(least, 1);
    ASSERT_EQ(reader->Info().Width, width);
    Bytes row(std::size_t(width), 0);
    for (int y = 0; y < reader->Info().Height; ++y) reader->ReadRow(row.data());
    EXPECT_EQ(row, Bytes(std::size_t(width), sample));
  }
  EXPECT_THROW(OpenImage(input, {.MemoryLimit = 64 << 20, .Page = 2}), Failure);
}

void AppendChunk(Bytes& file, const std::string& name, const Bytes& data) {
  const auto number = [&](std::uint32_t value) {
    for (int shift = 24; shift >= 0; shift -= 8) file.push_back(std::uint8_t(value >> shift));
  };
  number(std::uint32_t(data.size()));
  const std::size_t start = file.size();
  file.insert(file.end(), name.begin(), name.end());
  file.insert(file.end(), data.begin(), data.end());
  number(std::uint32_t(crc32(0, &file[start], uInt(file.size() - start))));
}

Bytes Deflated(const Bytes& data) {
  uLongf size = compressBound(uLong(data.size()));
  Bytes stream(size);
  compress(stream.data(), &size, data.data(), uLong(data.size()));
  stream.resize(size);
  return stream;
}

// Catches pixels that are lost between chunks or between threads, and damage that goes unnoticed.
TEST(Types, PNGWhoseChunksAreUnusual) {
  // The larger one is unpacked on another thread.
  for (const std::int32_t width : {37, 5000}) {
    constexpr std::int32_t height = 23;
    const std::size_t rowBytes = std::size_t(width) * 3;
    Bytes rows;
    for (std::uint32_t y = 0, random = 1; y < height; ++y) {
      rows.push_back(0);
      for (std::size_t i = 0; i < rowBytes; ++i)
        rows.push_back(std::uint8_t((random = random * 1664525 + 1013904223) >> 24));
    }
    const Bytes stream = Deflated(rows);
    Bytes wrongSum = stream, behind = stream, more = rows;
    wrongSum.back() ^= 1;
    behind.resize(behind.size() + 5000);
    more.resize(more.size() + 300000);
    const Bytes half(rows.begin(), rows.begin() + std::ptrdiff_t(rows.size() / 2));
    const struct {
      const char* Name;
      Bytes Stream;
      std::size_t Piece;
      bool Whole;
      std::string Between = "IDAT";
    } cases[] = {
        {"in one", stream, stream.size(), true},
        {"in small ones, and empty ones between", stream, 11, true},
        {"with data behind the stream", behind, 3000, true},
        {"with more rows", Deflated(more), 100000, true},
        {"with another sum", wrongSum, stream.size(), false},
        {"with half of the rows", Deflated(half), stream.size(), false},
        {"with others between", stream, stream.size() / 2, false, "teXt"},
    };
    for (const auto& one : cases) {
      SCOPED_TRACE(testing::Message() << one.Name << ", " << width);
      Bytes file{0x89, 'P', 'N', 'G', '\r', '\n', 0x1A, '\n'};
      AppendChunk(file, "IHDR",
                  {0, 0, std::uint8_t(width >> 8), std::uint8_t(width), 0, 0, 0, height, 8, 2, 0, 0, 0});
      for (std::size_t at = 0; at < one.Stream.size(); at += one.Piece) {
        const auto start = one.Stream.begin() + std::ptrdiff_t(at);
        AppendChunk(file, "IDAT",
                    {start, start + std::ptrdiff_t(std::min(one.Piece, one.Stream.size() - at))});
        AppendChunk(file, one.Between, {});
      }
      AppendChunk(file, "IEND", {});
      if (!one.Whole) {
        EXPECT_THROW(Read(Input::Memory(file, "odd")), Failure);
        continue;
      }
      Bytes expected;
      for (std::size_t at = 1; at < rows.size(); at += rowBytes + 1)
        expected.insert(expected.end(), &rows[at], &rows[at] + rowBytes);
      EXPECT_TRUE(Read(Input::Memory(file, "odd")) == expected);
      file[file.size() - 30] ^= 1;
      EXPECT_THROW(Read(Input::Memory(file, "odd")), Failure);
    }
  }
}

TEST(Types, PNMOfEveryKind) {
  const struct {
    std::string File;
    Format Of;
    Bytes Samples;
  } cases[] = {
      {"P1\n# bits\n3 2\n101\n0 1 0", Format::G, {0, 255, 0, 255, 0, 255}},
      {"P2 3 1 # most\n4\n0 1 4 ", Format::G, {0, 64, 255}},
      {"P3\n1 1\n255\n1 2 3\n", Format::RGB, {1, 2, 3}},
      {"P4\n9 1\n\xA0\x80", Format::G, {0, 255, 0, 255, 255, 255, 255, 255, 0}},
      {std::string("P5\n2 1\n65535\n\x80\x00\xFF\xFF", 18), Format::G, {128, 255}},
      {"P7\nWIDTH 1\nHEIGHT 1\n# four inks\nDEPTH 4\nMAXVAL 255\nTUPLTYPE CMYK\nENDHDR\nabcd",
       Format::CMYK,
       {'a', 'b', 'c', 'd'}},
  };
  for (const auto& [file, format, samples] : cases) {
    SCOPED_TRACE(file);
    const Bytes bytes(file.begin(), file.end());
    const Input input = Input::Memory(bytes, "made");
    EXPECT_EQ(OpenImage(input, Generous)->Info().Pixels, format);
    EXPECT_EQ(Read(input), samples);
  }
  for (const std::string bad : {"P6\n1 1\n255\n", "P5\n0 1\n255\n", "P5\n1 1\n70000\n12", "P2\n1 1\n9\nx",
                                "P7\nWIDTH 1\nDEPHT 1\n", "P6\n99999999999 1\n255\n"}) {
    SCOPED_TRACE(bad);
    const Bytes bytes(bad.begin(), bad.end());
    EXPECT_THROW(Read(Input::Memory(bytes, "bad")), Failure);
  }
}

}

}
