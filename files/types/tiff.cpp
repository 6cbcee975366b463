#include <cerrno>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "file_types.h"
#include "tiff_notes.h"
#include "tiff_pages.h"
#include "tiff_planes.h"
#include "tiff_writer.h"

namespace picturezor::files {

namespace {

constexpr double CentimetresOfInch = 2.54;

/// The most pixels that a byte of the file can stand for. Fax codes have a bit for a whole row.
double MostPixelsPerByte(std::uint16_t compression, std::int64_t width, double bits) {
  switch (compression) {
    case COMPRESSION_NONE: return 8 / bits;
    case COMPRESSION_PACKBITS: return 64 * 8 / bits;
    case COMPRESSION_ADOBE_DEFLATE:
    case COMPRESSION_DEFLATE: return 1032 * 8 / bits;
    case COMPRESSION_LZW: return 4096 * 8 / bits;
    case COMPRESSION_JPEG: return 512;
    default: return std::max<double>(double(width) * 8, 65536);
  }
}

class TIFFReader : public ImageReader {
 public:
  TIFFReader(const Input& input, const ReadOptions& options)
      : From(input), Path(input.Name()), File(TIFFHandle::Open(input, options.MemoryLimit)) {
    RequireWholeDirectory();
    ReadLayout();
    RequirePlausible(Path, Of.Width, Of.Height, input.Size(),
                     MostPixelsPerByte(Of.Compression, Of.Width, double(Of.Bits) * Of.Samples));
    About.Width = std::int32_t(Of.Width);
    About.Height = std::int32_t(Of.Height);
    SetBits(Of.Bits);
    ReadExtras();
    for (int plane = 0; plane < Of.Planes(); ++plane) {
      // Samples that nobody asks for need no rows.
      const bool wanted = !Of.Planar || plane < Of.Colours || plane == Of.AlphaAt;
      Planes.push_back(wanted ? OpenPlane(input, *File, Of, plane, options) : nullptr);
    }
    Lines.resize(Planes.size());
  }

  bool Select(const Rect& part) override {
    About.Width = part.Width;
    About.Height = part.Height;
    Left = part.X;
    NextRow = part.Y;
    for (const auto& plane : Planes)
      if (plane) plane->Select(part);
    return true;
  }

  /// A strip that is compressed has to be read from its first row on.
  bool StartsAnywhere() const override {
    constexpr std::uint32_t few = 64;
    return Of.Tiled || Of.Compression == COMPRESSION_NONE ||
           File->Get<std::uint32_t>(TIFFTAG_ROWSPERSTRIP, UINT32_MAX) <= few;
  }

  void ReadRow(std::uint8_t* row) override { ReadRows(row, 0, 1); }

  void ReadRows(std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count) override {
    if (IsPacked()) {
      const auto pixel = std::size_t(Of.Samples);
      Planes[0]->ReadRows(NextRow, pixel * std::size_t(Left - Planes[0]->FirstColumn()),
                          pixel * std::size_t(About.Width), rows, stride, count);
      NextRow += count;
    } else {
      for (std::int32_t y = 0; y < count; ++y, ++NextRow) Convert(rows + y * stride);
    }
    for (std::int32_t y = 0; Of.Associated && y < count; ++y)
      TakeAlphaOut(rows + y * stride, About.Width, ChannelsOf(About.Pixels));
  }

  /// libtiff has read all that belongs to the picture.
  void Finish() override {}

 private:
  /// Whether pixels stand in the file as they are given.
  bool IsPacked() const {
    return Of.Bits == 8 && !Of.Planar && Of.Samples == ChannelsOf(About.Pixels) &&
           Of.Photometric != PHOTOMETRIC_PALETTE && Of.Photometric != PHOTOMETRIC_MINISWHITE;
  }

  /// The next row out of what stands in the file.
  void Convert(std::uint8_t* row) {
    for (std::size_t i = 0; i < Planes.size(); ++i)
      if (Planes[i]) Lines[i] = Planes[i]->Row(NextRow);
    Skipped = Left - Planes[0]->FirstColumn();
    const int channels = ChannelsOf(About.Pixels);
    if (Of.Photometric == PHOTOMETRIC_PALETTE) {
      for (std::int64_t x = 0; x < About.Width; ++x)
        std::memcpy(row + x * channels, Palette[Raw(x, 0) & 255].data(), 3);
    } else {
      for (int c = 0; c < Of.Colours; ++c) CopySamples(row + c, channels, c);
      if (Of.Photometric == PHOTOMETRIC_MINISWHITE)
        for (std::int64_t x = 0; x < About.Width; ++x)
          row[x * channels] = std::uint8_t(255 - row[x * channels]);
    }
    if (Of.AlphaAt >= 0) CopySamples(row + channels - 1, channels, Of.AlphaAt);
  }

  /// libtiff overlooks a cut in the last bytes of a directory.
  void RequireWholeDirectory() const {
    const std::uint64_t at = TIFFCurrentDirOffset(*File);
    const bool big = TIFFIsBigTIFF(*File), bigEnd = TIFFIsBigEndian(*File);
    std::uint8_t count[8] = {};
    const std::size_t size = big ? 8 : 2;
    if (From.ReadAt(std::int64_t(at), std::span(count).first(size)) != size)
      throw Failure(Path, "the TIFF file is cut off");
    std::uint64_t entries = 0;
    for (std::size_t i = 0; i < size; ++i) entries = entries << 8 | count[bigEnd ? i : size - 1 - i];
    if (at + size + entries * (big ? 20 : 12) + (big ? 8 : 4) > std::uint64_t(From.Size()))
      throw Failure(Path, "the TIFF file is cut off");
  }

  void ReadLayout() {
    Of.Width = File->Get<std::uint32_t>(TIFFTAG_IMAGEWIDTH, 0);
    Of.Height = File->Get<std::uint32_t>(TIFFTAG_IMAGELENGTH, 0);
    Of.Bits = File->Get<std::uint16_t>(TIFFTAG_BITSPERSAMPLE, 1);
    Of.Samples = File->Get<std::uint16_t>(TIFFTAG_SAMPLESPERPIXEL, 1);
    Of.Compression = File->Get<std::uint16_t>(TIFFTAG_COMPRESSION, COMPRESSION_NONE);
    Of.Planar = Of.Samples > 1 &&
                File->Get<std::uint16_t>(TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG) == PLANARCONFIG_SEPARATE;
    Of.Tiled = TIFFIsTiled(*File);
    if (!TIFFGetField(*File, TIFFTAG_PHOTOMETRIC, &Of.Photometric))
      Of.Photometric = Of.Samples >= 3 ? PHOTOMETRIC_RGB : PHOTOMETRIC_MINISBLACK;
    const auto refuse = [&](const std::string& what) { throw Failure(Path, what + " aren't supported"); };
    if (!TIFFIsCODECConfigured(Of.Compression))
      refuse("TIFF files with compression " + std::to_string(Of.Compression));
    const auto kind = File->Get<std::uint16_t>(TIFFTAG_SAMPLEFORMAT, SAMPLEFORMAT_UINT);
    if (kind != SAMPLEFORMAT_UINT && kind != SAMPLEFORMAT_VOID)
      refuse("TIFF samples that are signed or floating-point");
    if (Of.Bits != 1 && Of.Bits != 2 && Of.Bits != 4 && Of.Bits != 8 && Of.Bits != 16)
      refuse("TIFF samples of " + std::to_string(Of.Bits) + " bits");
    switch (Of.Photometric) {
      case PHOTOMETRIC_MINISWHITE:
      case PHOTOMETRIC_MINISBLACK:
        About.Pixels = Format::G;
        Of.Colours = 1;
        break;
      case PHOTOMETRIC_PALETTE:
        About.Pixels = Format::RGB;
        Of.Colours = 1;
        ReadPalette();
        break;
      case PHOTOMETRIC_YCBCR:
        if (Of.Compression != COMPRESSION_JPEG) refuse("TIFF files in YCbCr without JPEG compression");
        [[fallthrough]];
      case PHOTOMETRIC_RGB:
        About.Pixels = Format::RGB;
        Of.Colours = 3;
        break;
      case PHOTOMETRIC_SEPARATED:
        if (File->Get<std::uint16_t>(TIFFTAG_INKSET, INKSET_CMYK) != INKSET_CMYK)
          refuse("TIFF files with other inks than CMYK");
        About.Pixels = Format::CMYK;
        Of.Colours = 4;
        break;
      default: refuse("TIFF files with colours of kind " + std::to_string(Of.Photometric));
    }
    if (Of.Samples < Of.Colours) throw Failure(Path, "corrupt TIFF: too few samples per pixel");
    std::uint16_t count = 0, *kinds = nullptr;
    if (TIFFGetFieldDefaulted(*File, TIFFTAG_EXTRASAMPLES, &count, &kinds) && count > 0 &&
        Of.Samples > Of.Colours && Of.Photometric != PHOTOMETRIC_PALETTE &&
        (kinds[0] == EXTRASAMPLE_ASSOCALPHA || kinds[0] == EXTRASAMPLE_UNASSALPHA)) {
      Of.AlphaAt = Of.Colours;
      Of.Associated = kinds[0] == EXTRASAMPLE_ASSOCALPHA;
      About.Pixels = WithAlpha(About.Pixels);
    }
    const int left = Of.Samples - Of.Colours - (Of.AlphaAt >= 0);
    if (left > 0) About.Notes.push_back(std::to_string(left) + " extra samples per pixel left out");
    File->Check();
  }

  void ReadPalette() {
    std::uint16_t* maps[3] = {};
    if (Of.Bits > 8 || !TIFFGetField(*File, TIFFTAG_COLORMAP, &maps[0], &maps[1], &maps[2]))
      throw Failure(Path, "corrupt TIFF: no palette");
    // Some programs fill the map with 8-bit numbers.
    bool wide = false;
    const int colours = 1 << Of.Bits;
    for (const auto* map : maps)
      for (int i = 0; i < colours; ++i) wide |= map[i] > 255;
    Palette.resize(256);
    for (int i = 0; i < colours; ++i)
      for (int c = 0; c < 3; ++c) Palette[i][c] = std::uint8_t(wide ? maps[c][i] >> 8 : maps[c][i]);
  }

  void ReadExtras() {
    About.Orientation = File->Get<std::uint16_t>(TIFFTAG_ORIENTATION, ORIENTATION_TOPLEFT);
    if (About.Orientation < 1 || About.Orientation > 8) About.Orientation = 1;
    float x = 0, y = 0;
    const auto unit = File->Get<std::uint16_t>(TIFFTAG_RESOLUTIONUNIT, RESUNIT_INCH);
    if (unit != RESUNIT_NONE && TIFFGetField(*File, TIFFTAG_XRESOLUTION, &x) &&
        TIFFGetField(*File, TIFFTAG_YRESOLUTION, &y) && x > 0 && y > 0) {
      const double inches = unit == RESUNIT_CENTIMETER ? CentimetresOfInch : 1;
      About.Density = {x * inches, y * inches};
    }
    std::uint32_t size = 0;
    const std::uint8_t* profile = nullptr;
    if (TIFFGetField(*File, TIFFTAG_ICCPROFILE, &size, &profile))
      About.Profile.assign(profile, profile + size);
    if (TIFFGetField(*File, TIFFTAG_XMLPACKET, &size, &profile)) About.Xmp.assign(profile, profile + size);
    if (!TIFFIsBigTIFF(*File))
      ReadTIFFNotes(From, std::int64_t(TIFFCurrentDirOffset(*File)), TIFFIsBigEndian(*File), About);
    File->Check();
  }

  /// A sample as it stands in the file; `sample` counts within what is interleaved.
  int Raw(std::int64_t x, int sample) const {
    const std::uint8_t* line = Lines[Of.Planar ? std::size_t(sample) : 0];
    const std::int64_t column = Skipped + x;
    const std::int64_t at = Of.Planar ? column : column * Of.Samples + sample;
    if (Of.Bits == 8) return line[at];
    if (Of.Bits == 16) {
      std::uint16_t value;
      std::memcpy(&value, line + 2 * at, 2);
      return value;
    }
    const std::int64_t bit = at * Of.Bits;
    return line[bit / 8] >> (8 - Of.Bits - bit % 8) & ((1 << Of.Bits) - 1);
  }

  void CopySamples(std::uint8_t* out, int step, int sample) const {
    const int most = (1 << Of.Bits) - 1;
    if (Of.Bits == 8)
      for (std::int64_t x = 0; x < About.Width; ++x) out[x * step] = std::uint8_t(Raw(x, sample));
    else if (Of.Bits == 16)
      for (std::int64_t x = 0; x < About.Width; ++x)
        out[x * step] = std::uint8_t((Raw(x, sample) * 255u + 32895u) >> 16);
    else
      for (std::int64_t x = 0; x < About.Width; ++x)
        out[x * step] = std::uint8_t(Raw(x, sample) * 255 / most);
  }

  Input From;
  std::filesystem::path Path;
  std::unique_ptr<TIFFHandle> File;
  TIFFLayout Of;
  std::vector<std::array<std::uint8_t, 3>> Palette;
  std::vector<std::unique_ptr<TIFFPlane>> Planes;
  std::vector<const std::uint8_t*> Lines;
  std::int64_t NextRow = 0, Left = 0;
  /// Columns of the lines in front of the part.
  std::int64_t Skipped = 0;
};

}

const FileType TIFFType{
    .Name = "TIFF",
    .Extensions = {".tif", ".tiff"},
    .Holds = {Format::G, Format::GA, Format::RGB, Format::RGBA, Format::CMYK, Format::CMYKA},
    .MostEdge = INT32_MAX,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          using namespace std::string_view_literals;
          for (const auto magic : {"II*\0"sv, "MM\0*"sv, "II+\0"sv, "MM\0+"sv})
            if (StartsWith(start, magic)) return true;
          return false;
        },
    .InOrder = false,
    .Several = true,
    .Parts = true,
    .Open = [](const Input& input, const ReadOptions& options) -> std::unique_ptr<ImageReader> {
      return OpenTIFFPage(input, options, [options](const Input& page) {
        return std::make_unique<TIFFReader>(page, options);
      });
    },
    .Create = WriteTIFF,
};

}
