#include "pictures.h"

#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <numeric>

#include "failure.h"

namespace picturezor::files {

namespace {

std::int64_t FreeMemory() {
  std::ifstream file("/proc/meminfo");
  for (std::string name; file >> name;) {
    std::int64_t kilobytes = 0;
    if (name == "MemAvailable:" && file >> kilobytes) return kilobytes * 1024;
    file.ignore(256, '\n');
  }
  return std::int64_t{sysconf(_SC_PHYS_PAGES)} * sysconf(_SC_PAGESIZE) / 2;
}

std::string Megabytes(std::int64_t bytes) { return std::to_string((bytes + (1 << 20) - 1) >> 20) + " MB"; }

std::string SizeText(const PictureSize& size) {
  return std::to_string(size.Width) + " x " + std::to_string(size.Height) + " pixels";
}

/// Bytes in memory, whatever the size.
std::int64_t MemoryOf(const PictureSize& size) { return (size.RowBytes() + 63) / 64 * 64 * size.Height; }

/// Of fewer bytes nobody has to ask whether there is room.
constexpr std::int64_t FewBytes = 16 << 20;
/// The module keeps smaller pictures than this in memory of its own, and takes blocks of no more than that.
constexpr std::int64_t MostOfItsOwn = INT32_MAX, MostOfBlocks = sizeof(void*) > 4 ? UINT32_MAX : INT32_MAX;

Picture MakeMapped(const PictureSize& size, const std::filesystem::path& directory) {
  const std::int64_t page = std::max<std::int64_t>(sysconf(_SC_PAGESIZE), 4096);
  const std::int64_t row = (size.RowBytes() + page - 1) / page * page;
  const std::int64_t bytes = row * size.Height + page;
  RequireRoom(directory, bytes, size);
  const int nameless = NamelessFile(directory);
  // The module opens it once more, and takes all of its room.
  const Picture picture =
      Picture::Mapped("/proc/self/fd/" + std::to_string(nameless), size.Width, size.Height, size.Of);
  close(nameless);
  if (!picture.Valid())
    throw Failure(directory, "no temporary file of " + Megabytes(bytes) + " can be made there");
  return picture;
}

Picture MakeInMemory(const PictureSize& size) {
  const Picture picture = MemoryOf(size) > MostOfItsOwn ? Picture::InBlock(size.Width, size.Height, size.Of)
                                                        : Picture(size.Width, size.Height, size.Of);
  if (!picture.Valid()) throw Failure("not enough memory for " + SizeText(size));
  return picture;
}

/// A pixel as one value, so that copying it is one move where the size allows.
template <int N>
struct Pixel {
  std::uint8_t Samples[N];
};

/// Orientations that exchange rows and columns. A band of rows is read, then its columns go to the rows of
/// the picture, from the top down, so that a mapped picture's window moves through it once a band.
template <int N>
void ReadTurned(const Picture& picture, ImageReader& reader, Progress& progress) {
  constexpr std::int64_t bandBytes = 64 << 20, block = 16;
  const ImageInfo& info = reader.Info();
  const std::int64_t width = info.Width, height = info.Height;
  const bool fromBottom = info.Orientation == 7 || info.Orientation == 8;
  const bool fromRight = info.Orientation == 6 || info.Orientation == 7;
  const std::int64_t most = std::clamp<std::int64_t>(bandBytes / (width * N), 1, height);
  std::vector<Pixel<N>> band(std::size_t(most * width)), turned(std::size_t(block * most));
  for (std::int64_t first = 0; first < height; first += most) {
    const std::int64_t rows = std::min(most, height - first);
    for (std::int64_t y = 0; y < rows; ++y, progress.Step())
      reader.ReadRow(band[std::size_t(y * width)].Samples);
    const std::int64_t at = fromRight ? height - first - rows : first;
    for (std::int64_t top = 0; top < width; top += block) {
      const std::int64_t count = std::min(block, width - top);
      for (std::int64_t y = 0; y < rows; ++y) {
        const Pixel<N>* row = &band[std::size_t(y * width)];
        Pixel<N>* out = &turned[std::size_t(fromRight ? rows - 1 - y : y)];
        for (std::int64_t i = 0; i < count; ++i)
          out[i * most] = row[fromBottom ? width - 1 - top - i : top + i];
      }
      for (std::int64_t i = 0; i < count; ++i)
        std::memcpy(RowOf(picture, std::int32_t(top + i)) + at * N, &turned[std::size_t(i * most)],
                    std::size_t(rows) * N);
    }
  }
}

template <int N>
void ReadUpright(const Picture& picture, ImageReader& reader, Progress& progress) {
  const ImageInfo& info = reader.Info();
  const bool mirrored = info.Orientation == 2 || info.Orientation == 3;
  const bool fromBottom = info.Orientation == 3 || info.Orientation == 4;
  for (std::int32_t y = 0; y < info.Height; ++y, progress.Step()) {
    std::uint8_t* row = RowOf(picture, fromBottom ? info.Height - 1 - y : y);
    reader.ReadRow(row);
    auto* pixels = reinterpret_cast<Pixel<N>*>(row);
    if (mirrored) std::reverse(pixels, pixels + info.Width);
  }
}

}

void RequireRoom(const std::filesystem::path& directory, std::int64_t bytes, const PictureSize& size) {
  struct statvfs disk {};
  if (statvfs(directory.c_str(), &disk) != 0)
    throw Failure(directory, std::string("no temporary file can be made there: ") + std::strerror(errno));
  const auto free = std::int64_t(disk.f_bavail) * std::int64_t(disk.f_frsize);
  if (bytes > free)
    throw Failure(directory, SizeText(size) + " need a temporary file of " + Megabytes(bytes) +
                                 ", but only " + Megabytes(free) +
                                 " are free; --temp-dir names another place");
}

std::int64_t DefaultMemoryLimit() { return FreeMemory() / 2; }

std::int64_t ParseBytes(const std::string& text) {
  double number = 0;
  const char* end = text.data() + text.size();
  auto [rest, failed] = std::from_chars(text.data(), end, number);
  double unit = 1;
  if (failed == std::errc() && rest != end) {
    constexpr std::string_view letters = "KMGT";
    const auto power = letters.find(char(std::toupper(*rest)));
    unit = power == letters.npos ? 0 : std::pow(1024.0, double(power + 1));
    ++rest;
    if (rest != end && *rest == 'i') ++rest;
    if (rest != end && *rest == 'B') ++rest;
  }
  const double bytes = number * unit;
  if (failed != std::errc() || rest != end || !(bytes >= 1) || bytes > 1e18)
    throw UsageFailure(text + " isn't a size like 256M or 2G");
  return std::int64_t(bytes);
}

std::vector<Picture> MakePictures(const StoreOptions& options, const std::vector<PictureSize>& sizes) {
  // The module needs this many rows for a mapped picture.
  constexpr std::int32_t fewestMapped = 5;
  std::vector<std::size_t> order(sizes.size());
  std::iota(order.begin(), order.end(), 0);
  std::ranges::stable_sort(order, {}, [&](std::size_t i) { return MemoryOf(sizes[i]); });
  std::vector<Picture> pictures(sizes.size());
  std::int64_t used = 0;
  for (const std::size_t i : order) {
    const PictureSize& size = sizes[i];
    const std::int64_t bytes = MemoryOf(size);
    const bool fits = options.Kind != Store::Mapped && bytes <= MostOfBlocks &&
                      (options.Kind == Store::Memory || used + bytes <= options.MemoryLimit);
    if (fits || size.Height < fewestMapped) {
      used += bytes;
      if (used > FewBytes && used > FreeMemory())
        throw Failure(SizeText(size) + " need " + Megabytes(bytes) + " of memory, more than is free");
      pictures[i] = MakeInMemory(size);
    } else if (options.Kind == Store::Memory) {
      throw Failure(SizeText(size) + " are too many for --store memory, which ends at " +
                    Megabytes(MostOfBlocks) + " a picture");
    } else {
      pictures[i] = MakeMapped(size, options.TempDirectory);
    }
  }
  return pictures;
}

Picture MakeToFill(const StoreOptions& options, const PictureSize& size) {
  // What is larger is as quickly zeroed, and has to be asked for.
  if (options.Kind != Store::Mapped && MemoryOf(size) <= std::min(FewBytes, options.MemoryLimit))
    if (const Picture picture = Picture::ToBeFilled(size.Width, size.Height, size.Of); picture.Valid())
      return picture;
  return MakePictures(options, {size})[0];
}

std::uint8_t* RowOf(const Picture& picture, std::int32_t y) {
  const MemoryBlock row = picture.RawRow(y);
  if (!row) throw Failure("a row of a picture can't be reached");
  return row.Start();
}

ImageInfo Upright(const ImageInfo& info) {
  ImageInfo upright = info;
  upright.Orientation = 1;
  if (info.Orientation >= 5) {
    std::swap(upright.Width, upright.Height);
    if (upright.Density) std::swap(upright.Density->X, upright.Density->Y);
  }
  return upright;
}

Rect Stored(const Rect& upright, const ImageInfo& info) {
  Rect part = upright;
  if (info.Orientation >= 5) part = {part.Y, part.X, part.Height, part.Width};
  const int turned = info.Orientation;
  const bool mirrored = turned == 2 || turned == 3 || turned == 7 || turned == 8;
  const bool fromBottom = turned == 3 || turned == 4 || turned == 6 || turned == 7;
  if (mirrored) part.X = info.Width - part.X - part.Width;
  if (fromBottom) part.Y = info.Height - part.Y - part.Height;
  return part;
}

void ReadInto(const Picture& picture, ImageReader& reader, Progress& progress) {
  const ImageInfo& info = reader.Info();
  progress.Begin("reading", info.Height);
  const auto read = [&]<int N>() {
    if (info.Orientation >= 5)
      ReadTurned<N>(picture, reader, progress);
    else
      ReadUpright<N>(picture, reader, progress);
  };
  switch (ChannelsOf(info.Pixels)) {
    case 1: read.operator()<1>(); break;
    case 2: read.operator()<2>(); break;
    case 3: read.operator()<3>(); break;
    case 4: read.operator()<4>(); break;
    case 5: read.operator()<5>(); break;
  }
  reader.Finish();
}

bool HasColours(const Picture& picture) { return picture.IsGray() || picture.IsRGB() || picture.IsCMYK(); }

Format FileFormatOf(const Picture& picture) {
  if (!HasColours(picture)) throw Failure("the picture has no colours");
  const Format colours = picture.IsGray() ? Format::G : picture.IsRGB() ? Format::RGB : Format::CMYK;
  return picture.HasAlpha() ? WithAlpha(colours) : colours;
}

bool Convertible(Format from, Format to) {
  const Format a = WithoutAlpha(from), b = WithoutAlpha(to);
  return a == b || a == Format::G || b == Format::G;
}

void CopyInFileFormat(const Picture& from, std::int32_t first, const Picture& into) {
  if (!into.CopyPixels(from, {0, 0, into.Width(), into.Height()}, 0, first))
    throw Failure("a row of a picture can't be converted");
  if (into.HasAlpha() && !from.HasAlpha()) into.AlphaChannel().FillRect(255);
  // Black is no ink.
  if (into.IsCMYK() && from.IsGray()) into.BlackChannel().Invert();
  if (into.IsGray() && from.IsCMYK()) into.GrayChannel().Invert();
}

void WriteFrom(const Picture& picture, ImageWriter& writer, Format format, Progress& progress) {
  constexpr std::int32_t bandBytes = 1 << 18;
  const std::int32_t width = picture.Width(), height = picture.Height();
  progress.Begin("writing", height);
  const std::int32_t most = std::int32_t(
      std::clamp<std::int64_t>(bandBytes / (std::int64_t{width} * BytesPerPixel(format)), 1, height));
  Picture band;
  for (std::int32_t y = 0, count = 0; y < height; y += count, progress.Step(count)) {
    // The rows of a view are its parent's.
    if (format == picture.ImageFormat() && !picture.Parent()) {
      count = 1;
      writer.WriteRow(RowOf(picture, y));
      continue;
    }
    count = std::min(most, height - y);
    if (!band || band.Height() != count) band = MakeInMemory({width, count, format});
    CopyInFileFormat(picture, y, band);
    writer.WriteRows(RowOf(band, 0), band.RowSize(), count);
  }
}

}
