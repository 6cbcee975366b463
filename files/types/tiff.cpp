#include <cerrno>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "file_types.h"
#include "tiff_handle.h"
#include "tiff_notes.h"
#include "tiff_pages.h"
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

/// How the samples of a file lie, and where rows come from.
struct Layout {
  std::int64_t Width = 0, Height = 0;
  std::uint16_t Bits = 1, Samples = 1, Photometric = 0, Compression = 0;
  bool Planar = false, Tiled = false, Associated = false;
  int Colours = 0;
  /// The sample that is alpha, or -1.
  int AlphaAt = -1;
  /// Samples that stand side by side.
  int Interleaved() const { return Planar ? 1 : Samples; }
  int Planes() const { return Planar ? Samples : 1; }
  std::size_t RowBytes(std::int64_t pixels) const {
    return std::size_t((pixels * Interleaved() * Bits + 7) / 8);
  }
};

/// Gives the decoded rows of one plane in order, packed as in the file, 16-bit samples in the machine's
/// order.
class PlaneSource {
 public:
  virtual ~PlaneSource() = default;
  virtual const std::uint8_t* Row(std::int64_t y) = 0;
};

/// Strips of any compression. libtiff holds one strip as it is compressed.
class DecodedStrips : public PlaneSource {
 public:
  DecodedStrips(const Input& input, int plane, std::int64_t memoryLimit)
      : File(TIFFHandle::Open(input, memoryLimit)), Plane(std::uint16_t(plane)) {
    if (File->Get<std::uint16_t>(TIFFTAG_COMPRESSION, 1) == COMPRESSION_JPEG)
      File->Set(TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
    File->ReadingPixels();
    // By the number of its samples a pixel, a row can be far larger than the picture made of it.
    const std::uint64_t rowBytes = TIFFScanlineSize64(*File);
    RequireWithinLimit(input.Name(), std::int64_t(rowBytes), memoryLimit, "a row of this TIFF");
    Line.resize(std::size_t(rowBytes));
    RowsPerStrip = std::max<std::uint32_t>(1, File->Get<std::uint32_t>(TIFFTAG_ROWSPERSTRIP, UINT32_MAX));
  }

  const std::uint8_t* Row(std::int64_t y) override {
    // The rows of a strip come one after the other.
    const std::int64_t strip = y - y % RowsPerStrip;
    for (std::int64_t row = Next >= strip && Next <= y ? Next : strip; row <= y; ++row)
      File->Check(TIFFReadScanline(*File, Line.data(), std::uint32_t(row), Plane) == 1);
    Next = y + 1;
    return Line.data();
  }

 private:
  std::unique_ptr<TIFFHandle> File;
  std::uint16_t Plane;
  std::int64_t RowsPerStrip, Next = 0;
  Bytes Line;
};

/// Strips without compression are read row by row, however large they are.
class PlainStrips : public PlaneSource {
 public:
  PlainStrips(const Input& input, const TIFFHandle& file, const Layout& layout, int plane)
      : From(input), Header(file), Of(layout) {
    RowsPerStrip =
        std::min<std::int64_t>(file.Get<std::uint32_t>(TIFFTAG_ROWSPERSTRIP, UINT32_MAX), layout.Height);
    FirstStrip = plane * ((layout.Height + RowsPerStrip - 1) / RowsPerStrip);
    Line.resize(layout.RowBytes(layout.Width));
    Reversed = file.Get<std::uint16_t>(TIFFTAG_FILLORDER, FILLORDER_MSB2LSB) == FILLORDER_LSB2MSB;
  }

  const std::uint8_t* Row(std::int64_t y) override {
    const auto strip = std::uint32_t(FirstStrip + y / RowsPerStrip);
    const std::uint64_t at = std::uint64_t(y % RowsPerStrip) * Line.size();
    const std::uint64_t start = TIFFGetStrileOffset(Header, strip);
    const std::uint64_t size = TIFFGetStrileByteCount(Header, strip);
    Header.Check();
    if (at + Line.size() > size || start > std::uint64_t(From.Size()))
      throw Failure(From.Name(), "corrupt TIFF: a strip is too short for its rows");
    if (From.ReadAt(std::int64_t(start + at), Line) < Line.size())
      throw Failure(From.Name(), "the TIFF file is cut off");
    if (Reversed) TIFFReverseBits(Line.data(), tmsize_t(Line.size()));
    if (Of.Bits == 16 && TIFFIsByteSwapped(Header))
      TIFFSwabArrayOfShort(reinterpret_cast<std::uint16_t*>(Line.data()), tmsize_t(Line.size() / 2));
    return Line.data();
  }

 private:
  Input From;
  const TIFFHandle& Header;
  Layout Of;
  std::int64_t RowsPerStrip, FirstStrip;
  Bytes Line;
  bool Reversed;
};

/// A row of tiles at a time.
class TileBand : public PlaneSource {
 public:
  TileBand(const Input& input, const Layout& layout, int plane, std::int64_t memoryLimit)
      : File(TIFFHandle::Open(input, memoryLimit)), Of(layout), Plane(std::uint16_t(plane)) {
    if (layout.Compression == COMPRESSION_JPEG) File->Set(TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
    File->ReadingPixels();
    TileWidth = File->Get<std::uint32_t>(TIFFTAG_TILEWIDTH, 0);
    TileHeight = File->Get<std::uint32_t>(TIFFTAG_TILELENGTH, 0);
    if (TileWidth < 1 || TileHeight < 1 || layout.Bits * layout.Interleaved() * TileWidth % 8 != 0)
      throw Failure(input.Name(), "corrupt TIFF: tiles of a size that can't be");
    TileRow = layout.RowBytes(TileWidth);
    Across = (layout.Width + TileWidth - 1) / TileWidth;
    // Short pictures don't fill their tiles.
    const std::int64_t rows = std::min(TileHeight, layout.Height);
    RequireWithinLimit(input.Name(), std::int64_t(TileRow) * (Across * rows + TileHeight), memoryLimit,
                       "a TIFF with tiles of this size");
    BandRow = TileRow * std::size_t(Across);
    Band.resize(BandRow * std::size_t(rows));
    Tile.resize(std::size_t(TIFFTileSize64(*File)));
    if (Tile.size() < TileRow * std::size_t(TileHeight))
      throw Failure(input.Name(), "corrupt TIFF: tiles of a size that can't be");
  }

  const std::uint8_t* Row(std::int64_t y) override {
    if (y < Top || y >= Top + TileHeight) Fill(y - y % TileHeight);
    return Band.data() + BandRow * std::size_t(y % TileHeight);
  }

 private:
  void Fill(std::int64_t y) {
    Top = y;
    const std::int64_t rows = std::min(TileHeight, Of.Height - y);
    for (std::int64_t across = 0; across < Across; ++across) {
      const std::uint32_t tile =
          TIFFComputeTile(*File, std::uint32_t(across * TileWidth), std::uint32_t(y), 0, Plane);
      const tmsize_t got = TIFFReadEncodedTile(*File, tile, Tile.data(), tmsize_t(Tile.size()));
      File->Check(got == tmsize_t(Tile.size()));
      for (std::int64_t row = 0; row < rows; ++row)
        std::memcpy(Band.data() + BandRow * std::size_t(row) + TileRow * std::size_t(across),
                    Tile.data() + TileRow * std::size_t(row), TileRow);
    }
  }

  std::unique_ptr<TIFFHandle> File;
  Layout Of;
  std::uint16_t Plane;
  std::int64_t TileWidth, TileHeight, Across = 0;
  /// The first row of the band; far away as long as there is none.
  std::int64_t Top = INT64_MIN / 2;
  std::size_t TileRow = 0, BandRow = 0;
  Bytes Band, Tile;
};

class TIFFReader : public ImageReader {
 public:
  TIFFReader(const Input& input, std::int64_t memoryLimit)
      : From(input), Path(input.Name()), File(TIFFHandle::Open(input, memoryLimit)) {
    RequireWholeDirectory();
    ReadLayout();
    RequirePlausible(Path, Of.Width, Of.Height, input.Size(),
                     MostPixelsPerByte(Of.Compression, Of.Width, double(Of.Bits) * Of.Samples));
    About.Width = std::int32_t(Of.Width);
    About.Height = std::int32_t(Of.Height);
    About.Bits = Of.Bits;
    if (Of.Bits == 16) About.Notes.push_back("16 bits a sample reduced to 8");
    ReadExtras();
    for (int plane = 0; plane < Of.Planes(); ++plane) {
      // Samples that nobody asks for need no rows.
      if (Of.Planar && plane >= Of.Colours && plane != Of.AlphaAt)
        Sources.emplace_back();
      else if (Of.Tiled)
        Sources.push_back(std::make_unique<TileBand>(input, Of, plane, memoryLimit));
      else if (Of.Compression == COMPRESSION_NONE)
        Sources.push_back(std::make_unique<PlainStrips>(input, *File, Of, plane));
      else
        Sources.push_back(std::make_unique<DecodedStrips>(input, plane, memoryLimit));
    }
    Lines.resize(Sources.size());
  }

  const FileType& Type() const override { return TIFFType; }

  bool Select(const Rect& part) override {
    About.Width = part.Width;
    About.Height = part.Height;
    Left = part.X;
    NextRow = part.Y;
    return true;
  }

  /// A strip that is compressed has to be read from its first row on.
  bool StartsAnywhere() const override {
    constexpr std::uint32_t few = 64;
    return Of.Tiled || Of.Compression == COMPRESSION_NONE ||
           File->Get<std::uint32_t>(TIFFTAG_ROWSPERSTRIP, UINT32_MAX) <= few;
  }

  void ReadRow(std::uint8_t* row) override {
    for (std::size_t i = 0; i < Sources.size(); ++i)
      if (Sources[i]) Lines[i] = Sources[i]->Row(NextRow);
    ++NextRow;
    const int channels = ChannelsOf(About.Pixels);
    if (AsStored()) {
      std::memcpy(row, Lines[0] + Left * channels, std::size_t(About.Width) * std::size_t(channels));
    } else if (Of.Photometric == PHOTOMETRIC_PALETTE) {
      for (std::int64_t x = 0; x < About.Width; ++x)
        std::memcpy(row + x * channels, Palette[Raw(x, 0) & 255].data(), 3);
    } else {
      for (int c = 0; c < Of.Colours; ++c) CopySamples(row + c, channels, c);
      if (Of.Photometric == PHOTOMETRIC_MINISWHITE)
        for (std::int64_t x = 0; x < About.Width; ++x)
          row[x * channels] = std::uint8_t(255 - row[x * channels]);
    }
    if (Of.AlphaAt >= 0 && !AsStored()) CopySamples(row + channels - 1, channels, Of.AlphaAt);
    if (Of.Associated) TakeAlphaOut(row, About.Width, channels);
  }

  /// libtiff has read all that belongs to the picture.
  void Finish() override {}

 private:
  /// Whether a row of the file is one of the picture.
  bool AsStored() const {
    return Of.Bits == 8 && !Of.Planar && Of.Samples == ChannelsOf(About.Pixels) &&
           Of.Photometric != PHOTOMETRIC_PALETTE && Of.Photometric != PHOTOMETRIC_MINISWHITE;
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
    if (Of.Samples < Of.Colours) throw Failure(Path, "corrupt TIFF: too few samples a pixel");
    std::uint16_t count = 0, *kinds = nullptr;
    if (TIFFGetFieldDefaulted(*File, TIFFTAG_EXTRASAMPLES, &count, &kinds) && count > 0 &&
        Of.Samples > Of.Colours && Of.Photometric != PHOTOMETRIC_PALETTE &&
        (kinds[0] == EXTRASAMPLE_ASSOCALPHA || kinds[0] == EXTRASAMPLE_UNASSALPHA)) {
      Of.AlphaAt = Of.Colours;
      Of.Associated = kinds[0] == EXTRASAMPLE_ASSOCALPHA;
      About.Pixels = WithAlpha(About.Pixels);
    }
    const int left = Of.Samples - Of.Colours - (Of.AlphaAt >= 0);
    if (left > 0) About.Notes.push_back(std::to_string(left) + " extra samples a pixel left out");
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
    const std::int64_t at = Of.Planar ? Left + x : (Left + x) * Of.Samples + sample;
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
  Layout Of;
  std::vector<std::array<std::uint8_t, 3>> Palette;
  std::vector<std::unique_ptr<PlaneSource>> Sources;
  std::vector<const std::uint8_t*> Lines;
  std::int64_t NextRow = 0, Left = 0;
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
      return OpenTIFFPage(input, options, [limit = options.MemoryLimit](const Input& page) {
        return std::make_unique<TIFFReader>(page, limit);
      });
    },
    .Create = [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
                 const WriteOptions& options) -> std::unique_ptr<ImageWriter> {
      return WriteTIFF(descriptor, target, info, options);
    },
};

}
