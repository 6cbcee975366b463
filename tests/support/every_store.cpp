#include "support/every_store.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>

#include "image/file_regions.h"
#include "image/picture_data.h"
#include "object_model.h"

namespace picturezor {
namespace {

/// Bytes before the first pixel of a row of the picture, in the stored row.
std::size_t RowStart(const Picture& picture) {
  const auto planes = PlanesOf(picture);
  return planes.empty() ? 0 : std::size_t(planes[0].Offset / picture.PixelSize() * picture.PixelSize());
}

std::size_t RowBytes(const Picture& picture) {
  return std::size_t(picture.Width()) * std::size_t(picture.PixelSize());
}

}

std::vector<PlacedPlane> PlanesOf(const Picture& picture) {
  std::vector<PlacedPlane> planes;
  if (picture.IsGray()) planes = {{Plane::Gray, picture.GrayOffset()}};
  if (picture.IsRGB())
    planes = {{Plane::Red, picture.RedOffset()},
              {Plane::Green, picture.GreenOffset()},
              {Plane::Blue, picture.BlueOffset()}};
  if (picture.IsCMYK())
    planes = {{Plane::Cyan, picture.CyanOffset()},
              {Plane::Magenta, picture.MagentaOffset()},
              {Plane::Yellow, picture.YellowOffset()},
              {Plane::Black, picture.BlackOffset()}};
  if (!planes.empty() && picture.HasAlpha()) planes.push_back({Plane::Alpha, picture.AlphaOffset()});
  return planes;
}

std::string LettersOf(const Picture& picture) {
  std::string letters(std::size_t(picture.PixelSize()), '-');
  for (const auto& [plane, offset] : PlanesOf(picture))
    letters[std::size_t(offset % picture.PixelSize())] = "gRGBCMYKA"[int(plane)];
  return letters;
}

const std::string& LettersOf(Format format) {
  static const auto known = [] {
    std::array<std::string, 41> all;
    for (const Format of : EveryFormat()) all[std::size_t(of)] = LettersOf(Picture(1, 1, of));
    return all;
  }();
  return known[std::size_t(format)];
}

std::string RaisedBy(const std::function<void()>& call) {
  try {
    call();
  } catch (const HostException& exception) {
    return exception.ClassName() + ": " + exception.what();
  }
  return "";
}

zor::PictureData& DataOf(const Picture& picture) {
  return *reinterpret_cast<zor::PictureData*>(model::InstanceOf(picture.Address()));
}

void MakeWindowSmall(const Picture& picture) {
  auto& data = DataOf(picture);
  for (zor::FileRegion* region : {&data.Regions->Window, &data.Regions->Other}) {
    if (region->Start) munmap(region->Start, std::size_t(region->End - region->First));
    *region = {};
  }
  data.RowsPerBlock = 5;
  data.MappingBlockSize = 5 * data.RowSize;
  data.PixelBase = nullptr;
  data.WindowMapped = false;
  data.WindowFirstRow = data.WindowLastRow = -1;
  data.RowGetter(&data, 0);
}

TemporaryFile::TemporaryFile() {
  static std::atomic<int> count = 0;
  At = std::filesystem::temp_directory_path() /
       ("picturezor-test-" + std::to_string(getpid()) + "-" + std::to_string(count++));
}

TemporaryFile::~TemporaryFile() {
  std::error_code error;
  std::filesystem::remove(At, error);
}

std::vector<Samples> StoredRows(const Picture& picture) {
  std::vector<Samples> rows;
  for (int y = 0; y < picture.Height(); ++y) rows.push_back(picture.Row(y));
  return rows;
}

void SetStoredRows(const Picture& picture, const std::vector<Samples>& rows) {
  for (int y = 0; y < picture.Height(); ++y) picture.SetRow(y, rows[std::size_t(y)]);
}

void FillWithNoise(const Picture& picture, unsigned seed) {
  Noise noise(seed);
  for (int y = 0; y < picture.Height(); ++y) picture.SetRow(y, noise.Many(std::size_t(picture.RowSize())));
}

Picture NoisePicture(int width, int height, Format format, unsigned seed) {
  const Picture picture(width, height, format);
  FillWithNoise(picture, seed);
  return picture;
}

Samples Packed(const Picture& picture) {
  Samples pixels;
  for (int y = 0; y < picture.Height(); ++y) {
    const Samples row = picture.Row(y);
    const auto first = row.begin() + std::ptrdiff_t(RowStart(picture));
    pixels.insert(pixels.end(), first, first + std::ptrdiff_t(RowBytes(picture)));
  }
  return pixels;
}

void SetPacked(const Picture& picture, const Samples& pixels) {
  const std::size_t bytes = RowBytes(picture);
  for (int y = 0; y < picture.Height(); ++y) {
    Samples row = picture.Row(y);
    std::copy_n(pixels.begin() + y * std::ptrdiff_t(bytes), bytes,
                row.begin() + std::ptrdiff_t(RowStart(picture)));
    picture.SetRow(y, row);
  }
}

const char* StoredPicture::NameOf(Kind kind) {
  constexpr const char* names[] = {"own memory", "caller's block", "mapped file",
                                   "clip view",  "mirrored view",  "clip of a mapped file"};
  return names[kind];
}

StoredPicture::StoredPicture(Kind kind, int width, int height, Format format) {
  constexpr int Around = 3;
  const int pixel = BytesPerPixel(format);
  switch (kind) {
    case Memory:
    case Mirrored: Whole = Picture(width, height, format); break;
    case Block: {
      const int rowSize = width * pixel + 37;
      Whole =
          Picture(MemoryBlock(std::size_t(rowSize) * std::size_t(height)), width, height, format, rowSize);
      break;
    }
    case Mapped: Whole = Picture::Mapped(File.Path(), width, height, format, 1); break;
    case Clip:
    case MappedClip:
      // Raw pixels have no offsets that could hold a left edge.
      Left = pixel && Picture(1, 1, format).ChannelCount() > 0 ? Around : 0;
      Top = Around;
      Whole = kind == Clip ? Picture(width + 2 * Left, height + 2 * Top, format)
                           : Picture::Mapped(File.Path(), width + 2 * Left, height + 2 * Top, format, 1);
      break;
  }
  if (Whole.IsMapping()) MakeWindowSmall(Whole);
  FillWithNoise(Whole, 4711);
  Shown = kind == Mirrored                     ? Whole.MirroredView()
          : kind == Clip || kind == MappedClip ? Whole.ClipImage({Left, Top, width, height})
                                               : Whole;
  if (!Shown.Valid()) throw std::runtime_error("the picture couldn't be made");
  for (int y = 0; y < height; ++y) {
    Samples row = Shown.Row(y);
    std::fill_n(row.begin() + std::ptrdiff_t(RowStart(Shown)), RowBytes(Shown), 0);
    Shown.SetRow(y, row);
  }
  Before = Surroundings();
}

bool StoredPicture::SurroundingsIntact() const { return Surroundings() == Before; }

std::vector<Samples> StoredPicture::Surroundings() const {
  std::vector<Samples> rows = StoredRows(Whole);
  for (int y = Top; y < Top + Shown.Height(); ++y)
    std::fill_n(rows[std::size_t(y)].begin() + std::ptrdiff_t(Left) * Whole.PixelSize(), RowBytes(Shown), 0);
  return rows;
}

}
