#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>

#include "exif.h"
#include "file_types.h"
#include "jpeg_bands.h"
#include "jpeg_errors.h"
#include "stream.h"

namespace picturezor::files {

namespace {

constexpr int NotesMarker = JPEG_APP0 + 1, ProfileMarker = JPEG_APP0 + 2, RecordsMarker = JPEG_APP0 + 13;
constexpr std::string_view ExifStart("Exif\0\0", 6), XmpStart("http://ns.adobe.com/xap/1.0/\0", 29);
constexpr std::size_t MostMarkerBytes = 65533;
constexpr double CentimetresOfInch = 2.54;
/// A block of 64 samples takes at least a bit.
constexpr double MostPixelsPerByte = 512;

class JPEGReader : public ImageReader {
 public:
  JPEGReader(const Input& input, const ReadOptions& options)
      : Path(input.Name()), FileSize(input.Size()), File(input.Open()) {
    Jpeg.err = &Errors.Manager;
    try {
      Try([&] { jpeg_create_decompress(&Jpeg); });
      Start(options.MemoryLimit);
    } catch (...) {
      jpeg_destroy_decompress(&Jpeg);
      throw;
    }
  }
  ~JPEGReader() override { jpeg_destroy_decompress(&Jpeg); }

  /// The transform gives a half, a quarter or an eighth for less work.
  void Reduce(std::int32_t leastWidth, std::int32_t leastHeight) override {
    const JDIMENSION width = Jpeg.image_width, height = Jpeg.image_height;
    for (const unsigned by : {8u, 4u, 2u}) {
      if ((width + by - 1) / by < JDIMENSION(leastWidth) || (height + by - 1) / by < JDIMENSION(leastHeight))
        continue;
      Jpeg.scale_num = 1;
      Jpeg.scale_denom = by;
      Try([&] { jpeg_calc_output_dimensions(&Jpeg); });
      About.Width = std::int32_t(Jpeg.output_width);
      About.Height = std::int32_t(Jpeg.output_height);
      return;
    }
  }

  /// Rows above the part are unpacked, but not transformed.
  bool Select(const Rect& part) override {
    if (Started) return false;
    Line.resize(std::size_t(About.Width) * std::size_t(ChannelsOf(About.Pixels)));
    Part = part;
    About.Width = part.Width;
    About.Height = part.Height;
    return true;
  }

  void ReadRow(std::uint8_t* row) override {
    if (!Started) Begin();
    JSAMPROW whole = Line.empty() ? row : Line.data();
    Try([&] { jpeg_read_scanlines(&Jpeg, &whole, 1); });
    const auto channels = std::size_t(ChannelsOf(About.Pixels)), bytes = std::size_t(About.Width) * channels;
    if (!Line.empty()) std::memcpy(row, &Line[std::size_t(Part.X) * channels], bytes);
    if (Inverted)
      for (std::size_t i = 0; i < bytes; ++i) row[i] = std::uint8_t(255 - row[i]);
  }

  void Finish() override {
    // Behind a part nothing is looked at.
    if (Line.empty()) Try([&] { jpeg_finish_decompress(&Jpeg); });
  }

 private:
  template <class Call>
  void Try(Call call) {
    Errors.Try(Path, call);
  }

  void Begin() {
    Try([&] { jpeg_start_decompress(&Jpeg); });
    if (Part.Y > 0) Try([&] { jpeg_skip_scanlines(&Jpeg, JDIMENSION(Part.Y)); });
    Started = true;
  }

  void Start(std::int64_t memoryLimit) {
    Try([&] {
      jpeg_stdio_src(&Jpeg, File.get());
      jpeg_save_markers(&Jpeg, NotesMarker, 0xFFFF);
      jpeg_save_markers(&Jpeg, RecordsMarker, 0xFFFF);
      jpeg_save_markers(&Jpeg, ProfileMarker, 0xFFFF);
      jpeg_read_header(&Jpeg, TRUE);
    });
    RequirePlausible(Path, Jpeg.image_width, Jpeg.image_height, FileSize,
                     Jpeg.arith_code ? 64 * MostPixelsPerByte : MostPixelsPerByte);
    About.Width = std::int32_t(Jpeg.image_width);
    About.Height = std::int32_t(Jpeg.image_height);
    ReadExtras();
    switch (Jpeg.jpeg_color_space) {
      case JCS_GRAYSCALE:
        Jpeg.out_color_space = JCS_GRAYSCALE;
        About.Pixels = Format::G;
        break;
      case JCS_CMYK:
      case JCS_YCCK:
        // Where the Adobe marker stands, 255 is no ink.
        Inverted = Jpeg.saw_Adobe_marker;
        Jpeg.out_color_space = JCS_CMYK;
        About.Pixels = Format::CMYK;
        break;
      case JCS_RGB:
      case JCS_YCbCr:
        Jpeg.out_color_space = JCS_RGB;
        About.Pixels = Format::RGB;
        break;
      default: throw Failure(Path, "a JPEG with unknown colours");
    }
    Jpeg.mem->max_memory_to_use = long(memoryLimit);
  }

  void ReadExtras() {
    for (auto marker = Jpeg.marker_list; marker; marker = marker->next) {
      const std::span<const std::uint8_t> data(marker->data, marker->data_length);
      const auto rest = [&](std::string_view start) {
        return Bytes(data.begin() + std::ptrdiff_t(start.size()), data.end());
      };
      if (marker->marker == NotesMarker && StartsWith(data, ExifStart) && About.Exif.empty())
        SetExif(About, rest(ExifStart));
      if (marker->marker == NotesMarker && StartsWith(data, XmpStart)) About.Xmp = rest(XmpStart);
      if (marker->marker == RecordsMarker && About.Iptc.empty()) About.Iptc = IptcOfResources(data);
    }
    if (Jpeg.saw_JFIF_marker && Jpeg.density_unit != 0 && Jpeg.X_density && Jpeg.Y_density) {
      const double inches = Jpeg.density_unit == 2 ? CentimetresOfInch : 1;
      About.Density = {Jpeg.X_density * inches, Jpeg.Y_density * inches};
    }
    JOCTET* profile = nullptr;
    unsigned size = 0;
    Try([&] { jpeg_read_icc_profile(&Jpeg, &profile, &size); });
    if (profile) About.Profile.assign(profile, profile + size);
    std::free(profile);
  }

  std::filesystem::path Path;
  std::int64_t FileSize;
  Stream File;
  JPEGErrors Errors;
  jpeg_decompress_struct Jpeg{};
  bool Inverted = false, Started = false;
  Rect Part;
  /// A row of which the part is taken.
  Bytes Line;
};

class JPEGWriter : public ImageWriter {
 public:
  JPEGWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
             const WriteOptions& options)
      : Path(target),
        File(StreamOn(descriptor, target)),
        Bands(target, info, HeadOf(target, info, options), options.Quality, options.Threads,
              [this](std::span<const std::uint8_t> piece) { Write(piece); }) {}

  void WriteRow(const std::uint8_t* row) override { Bands.Add(row); }
  void Finish() override { Flush(File, Path); }

 private:
  static JPEGMarkers HeadOf(const std::filesystem::path& target, const ImageInfo& info,
                            const WriteOptions& options) {
    if (options.Lossless) throw UsageFailure(target, "JPEG has no --lossless; JPEG XL, WebP and PNG have");
    JPEGMarkers head;
    const auto add = [&](int marker, std::string_view start, const Bytes& data) {
      // One that would be too long is left out.
      if (data.empty() || start.size() + data.size() > MostMarkerBytes) return;
      head.push_back({marker, Bytes(start.begin(), start.end())});
      head.back().Data.insert(head.back().Data.end(), data.begin(), data.end());
    };
    // CMYK has no JFIF header, so its density needs a block of EXIF.
    if (!info.Exif.empty() || info.Pixels == Format::CMYK) add(NotesMarker, ExifStart, ExifToWrite(info));
    add(NotesMarker, XmpStart, XmpToWrite(info));
    add(RecordsMarker, {}, ResourcesWithIptc(info.Iptc));
    return head;
  }
  void Write(std::span<const std::uint8_t> piece) {
    if (std::fwrite(piece.data(), 1, piece.size(), File.get()) != piece.size())
      throw Failure(Path, std::strerror(errno));
  }

  std::filesystem::path Path;
  Stream File;
  JPEGBands Bands;
};

}

const FileType JPEGType{
    .Name = "JPEG",
    .Extensions = {".jpg", ".jpeg", ".jpe"},
    .Holds = {Format::G, Format::RGB, Format::CMYK},
    .MostEdge = 65500,
    .Begins = [](std::span<const std::uint8_t> start) { return StartsWith(start, "\xFF\xD8"); },
    .InOrder = true,
    .Open = OpenAs<JPEGReader>,
    .Create = CreateAs<JPEGWriter>,
};

}
