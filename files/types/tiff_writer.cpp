#include "tiff_writer.h"

#include <cerrno>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "pictures.h"
#include "stream.h"
#include "tiff_notes.h"
#include "tiff_pieces.h"

namespace picturezor::files {

namespace {

constexpr std::int32_t UsualTile = 256;

/// What waits until the picture before it is complete.
class PackedPieces {
 public:
  void Add(const std::filesystem::path& target, const Bytes& piece) {
    if (!File) File = Stream(fdopen(NamelessFile(DefaultTempDirectory()), "w+"));
    Sizes.push_back(piece.size());
    if (std::fwrite(piece.data(), 1, piece.size(), File.get()) != piece.size())
      throw Failure(target, std::strerror(errno));
  }
  template <class Sink>
  void Give(const std::filesystem::path& target, Sink&& sink) {
    std::rewind(File.get());
    Bytes piece;
    for (const std::size_t size : Sizes) {
      piece.resize(size);
      if (std::fread(piece.data(), 1, size, File.get()) != size) throw Failure(target, std::strerror(errno));
      sink(piece);
    }
  }

 private:
  Stream File;
  std::vector<std::size_t> Sizes;
};

TIFFShape ShapeOf(const std::filesystem::path& target, const ImageInfo& info, const WriteOptions& options) {
  TIFFShape shape;
  shape.Width = info.Width;
  shape.Height = info.Height;
  shape.Pixels = info.Pixels;
  shape.Packing = options.Packing;
  if (shape.Packing == Compression::Usual)
    shape.Packing = options.Level ? Compression::Deflate : Compression::LZW;
  shape.Level = options.Level;
  shape.Quality = options.Quality;
  shape.Tile = options.Tile == 0 && options.Pyramid ? UsualTile : options.Tile;
  if (shape.Tile % 16 != 0 || shape.Tile < 0 || shape.Tile > 1 << 14)
    throw UsageFailure(target, "the edge of tiles is a multiple of 16, 16384 at most");
  // About 64 KB a strip; JPEG goes by blocks.
  const std::int64_t most = 65536 / (shape.Width * ChannelsOf(info.Pixels));
  const std::int64_t step = shape.Packing == Compression::JPEG ? 16 : 1;
  shape.RowsPerStrip = std::min(std::max(most / step * step, step), shape.Height);
  const bool lossy = shape.Packing == Compression::JPEG || shape.Packing == Compression::WebP;
  if (lossy && info.Pixels != Format::RGB &&
      (shape.Packing == Compression::JPEG ? HasAlpha(info.Pixels) : info.Pixels != Format::RGBA))
    throw Failure(target, std::string(shape.Packing == Compression::JPEG ? "JPEG" : "WebP") +
                              " in TIFF can't hold " + Describe(info.Pixels));
  const std::int64_t longest = std::max(shape.PieceWidth(), shape.PieceHeight());
  if (lossy && longest > (shape.Packing == Compression::JPEG ? 65500 : 16383))
    throw Failure(target, "a picture this wide needs --tile for such strips");
  return shape;
}

class TIFFWriter : public ImageWriter {
 public:
  TIFFWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
             const WriteOptions& options)
      : Path(target), Info(info) {
    TIFFShape shape = ShapeOf(target, info, options);
    // LZW makes noise longer by half at most, smaller copies add a third.
    const double worst =
        (options.Pyramid ? 2 : 1.5) * info.Width * double(info.Height) * ChannelsOf(info.Pixels);
    const bool big = options.Big || worst > 4e9;
    Bytes exif = info.Exif.empty() ? Bytes() : ExifToWrite(info);
    File = TIFFHandle::Create(descriptor, target, big, !exif.empty() && exif[0] == 'M' ? 'b' : 'l');
    SetShape(*File, shape);
    SetExtras(true);
    // Directories of BigTIFF are of another kind.
    if (!big && !exif.empty()) WriteTIFFNotes(*File, descriptor, target, std::move(exif));
    Levels.push_back(std::make_unique<TIFFPieces>(target, shape, options.Threads,
                                                  [this](const Bytes& piece, const Bytes& tables) {
                                                    if (!tables.empty() && Piece == 0) SetTables(tables);
                                                    WritePiece(piece);
                                                  }));
    if (!options.Pyramid) return;
    shape.Reduced = true;
    while (std::max(shape.Width, shape.Height) > shape.Tile && std::min(shape.Width, shape.Height) > 1) {
      shape.Width /= 2;
      shape.Height /= 2;
      const std::size_t level = Smaller.size();
      Smaller.emplace_back();
      Levels.push_back(std::make_unique<TIFFPieces>(target, shape, options.Threads,
                                                    [this, level](const Bytes& piece, const Bytes& tables) {
                                                      if (!tables.empty() && Smaller[level].Tables.empty())
                                                        Smaller[level].Tables = tables;
                                                      Smaller[level].Pieces.Add(Path, piece);
                                                    }));
    }
  }

  void WriteRow(const std::uint8_t* row) override {
    Levels[0]->Add(row);
    if (!Smaller.empty()) AddBelow(0, row);
  }

  void Finish() override {
    for (std::size_t level = 0; level < Smaller.size(); ++level) {
      errno = 0;
      File->Check(TIFFWriteDirectory(*File) == 1);
      Piece = 0;
      const TIFFShape& shape = Levels[level + 1]->Shape();
      SetShape(*File, shape);
      SetExtras(false);
      if (!Smaller[level].Tables.empty()) SetTables(Smaller[level].Tables);
      Smaller[level].Pieces.Give(Path, [this](Bytes& piece) { WritePiece(piece); });
    }
    errno = 0;
    File->Check(TIFFFlush(*File) == 1);
    File->Close();
    File->Check();
  }

 private:
  struct SmallerCopy {
    PackedPieces Pieces;
    Bytes Tables;
    /// Two rows of the level above, and what they become.
    Picture Pair, Row;
    int Rows = 0;
  };

  /// Two rows of a level make one of the next.
  void AddBelow(std::size_t level, const std::uint8_t* row) {
    if (level == Smaller.size()) return;
    SmallerCopy& below = Smaller[level];
    const TIFFShape &above = Levels[level]->Shape(), &shape = Levels[level + 1]->Shape();
    // What is left of an odd size has no partner.
    const auto width = std::int32_t(shape.Width * 2);
    if (!below.Pair.Valid()) {
      below.Pair = Picture(width, 2, shape.Pixels);
      below.Row = Picture(std::int32_t(shape.Width), 1, shape.Pixels);
    }
    const auto bytes = std::size_t(width) * std::size_t(ChannelsOf(above.Pixels));
    below.Pair.SetRowInFormat(below.Rows, shape.Pixels, {row, bytes});
    if (++below.Rows < 2) return;
    below.Rows = 0;
    if (!below.Row.Scale(below.Pair, {}, Kernel::Box, std::int32_t(shape.Width), 1))
      throw Failure(Path, "not enough memory for smaller copies");
    const Bytes half = below.Row.Row(0);
    Levels[level + 1]->Add(half.data());
    AddBelow(level + 1, half.data());
  }

  void SetExtras(bool first) {
    if (Info.Density) {
      File->Set(TIFFTAG_XRESOLUTION, Info.Density->X);
      File->Set(TIFFTAG_YRESOLUTION, Info.Density->Y);
      File->Set(TIFFTAG_RESOLUTIONUNIT, RESUNIT_INCH);
    }
    if (!first) return;
    if (!Info.Profile.empty())
      File->Set(TIFFTAG_ICCPROFILE, std::uint32_t(Info.Profile.size()), Info.Profile.data());
    if (const Bytes xmp = XmpToWrite(Info); !xmp.empty())
      File->Set(TIFFTAG_XMLPACKET, std::uint32_t(xmp.size()), xmp.data());
    if (Info.Iptc.empty()) return;
    // Some versions of libtiff take them as numbers of 32 bits, in the order of the machine.
    Bytes records = Info.Iptc;
    std::size_t count = records.size();
    if (TIFFFieldDataType(TIFFFieldWithTag(*File, TIFFTAG_RICHTIFFIPTC)) == TIFF_LONG) {
      count = (count + 3) / 4;
      records.resize(count * 4);
      if (TIFFIsByteSwapped(*File))
        TIFFSwabArrayOfLong(reinterpret_cast<std::uint32_t*>(records.data()), tmsize_t(count));
    }
    File->Set(TIFFTAG_RICHTIFFIPTC, std::uint32_t(count), records.data());
  }

  void SetTables(const Bytes& tables) {
    File->Set(TIFFTAG_JPEGTABLES, std::uint32_t(tables.size()), tables.data());
  }

  void WritePiece(const Bytes& piece) {
    errno = 0;
    const auto write = Levels[0]->Shape().Tile ? TIFFWriteRawTile : TIFFWriteRawStrip;
    const auto size = tmsize_t(piece.size());
    File->Check(write(*File, Piece++, const_cast<std::uint8_t*>(piece.data()), size) == size);
  }

  std::filesystem::path Path;
  ImageInfo Info;
  std::unique_ptr<TIFFHandle> File;
  std::uint32_t Piece = 0;
  std::vector<SmallerCopy> Smaller;
  std::vector<std::unique_ptr<TIFFPieces>> Levels;
};

}

std::unique_ptr<ImageWriter> WriteTIFF(int descriptor, const std::filesystem::path& target,
                                       const ImageInfo& info, const WriteOptions& options) {
  return std::make_unique<TIFFWriter>(descriptor, target, info, options);
}

}
