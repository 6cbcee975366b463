// jpeglib.h needs FILE.
#include <cstdio>
// clang-format off
#include <jpeglib.h>
#include <jerror.h>
// clang-format on

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <csetjmp>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "file_types.h"
#include "stream.h"

namespace picturezor::files {

namespace {

constexpr int NotesMarker = JPEG_APP0 + 1, ProfileMarker = JPEG_APP0 + 2, RecordsMarker = JPEG_APP0 + 13;
constexpr std::string_view ExifStart("Exif\0\0", 6), XmpStart("http://ns.adobe.com/xap/1.0/\0", 29);
constexpr std::size_t MostMarkerBytes = 65533;
constexpr double CentimetresOfInch = 2.54;
/// A block of 64 samples takes at least a bit.
constexpr double MostPixelsPerByte = 512;

/// libjpeg reports by a call that mustn't return: a jump, which becomes a Failure here.
struct JPEGErrors {
  jpeg_error_mgr Manager;
  std::jmp_buf Back;
  char Reason[JMSG_LENGTH_MAX + 32] = {};

  JPEGErrors() {
    jpeg_std_error(&Manager);
    Manager.error_exit = OnError;
    Manager.emit_message = OnMessage;
  }

  static void OnError(j_common_ptr file) {
    auto& self = *reinterpret_cast<JPEGErrors*>(file->err);
    char message[JMSG_LENGTH_MAX];
    file->err->format_message(file, message);
    switch (file->err->msg_code) {
      case JERR_FILE_WRITE:
      case JERR_FILE_READ: std::snprintf(self.Reason, sizeof self.Reason, "%s", std::strerror(errno)); break;
      case JERR_NO_BACKING_STORE:
      case JERR_OUT_OF_MEMORY:
        std::snprintf(self.Reason, sizeof self.Reason,
                      "a progressive JPEG of this size needs more memory than --memory-limit allows");
        break;
      case JWRN_JPEG_EOF:
      case JERR_INPUT_EOF: std::snprintf(self.Reason, sizeof self.Reason, "the JPEG file is cut off"); break;
      default: std::snprintf(self.Reason, sizeof self.Reason, "corrupt JPEG: %s", message);
    }
    std::longjmp(self.Back, 1);
  }

  /// What libjpeg would make up for by gray or noise is an error.
  static void OnMessage(j_common_ptr file, int level) {
    if (level >= 0) return;
    switch (file->err->msg_code) {
      case JWRN_EXTRANEOUS_DATA:
      case JWRN_ADOBE_XFORM:
      case JWRN_JFIF_MAJOR: return;
      default: OnError(file);
    }
  }
};

class JPEGReader : public ImageReader {
 public:
  JPEGReader(const Input& input, std::int64_t memoryLimit)
      : Path(input.Name()), FileSize(input.Size()), File(input.Open()) {
    Jpeg.err = &Errors.Manager;
    try {
      Try([&] { jpeg_create_decompress(&Jpeg); });
      Start(memoryLimit);
    } catch (...) {
      jpeg_destroy_decompress(&Jpeg);
      throw;
    }
  }
  ~JPEGReader() override { jpeg_destroy_decompress(&Jpeg); }

  const FileType& Type() const override { return JPEGType; }

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

  void ReadRow(std::uint8_t* row) override {
    if (!Started) Try([&] { jpeg_start_decompress(&Jpeg); });
    Started = true;
    Try([&] { jpeg_read_scanlines(&Jpeg, &row, 1); });
    if (Inverted)
      for (std::size_t i = 0; i < std::size_t(About.Width) * 4; ++i) row[i] = std::uint8_t(255 - row[i]);
  }

  void Finish() override {
    Try([&] { jpeg_finish_decompress(&Jpeg); });
  }

 private:
  /// `call` may hold nothing that needs a destructor, since libjpeg jumps out of it.
  template <class Call>
  void Try(Call call) {
    if (setjmp(Errors.Back) == 0)
      call();
    else
      throw Failure(Path, Errors.Reason);
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
};

class JPEGWriter : public ImageWriter {
 public:
  JPEGWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
             const WriteOptions& options)
      : Path(target), File(StreamOn(descriptor, target)) {
    if (info.Pixels == Format::CMYK) Ink.resize(std::size_t(info.Width) * 4);
    Jpeg.err = &Errors.Manager;
    try {
      Start(info, options);
    } catch (...) {
      jpeg_destroy_compress(&Jpeg);
      throw;
    }
  }
  ~JPEGWriter() override { jpeg_destroy_compress(&Jpeg); }

  void WriteRow(const std::uint8_t* row) override {
    for (std::size_t i = 0; i < Ink.size(); ++i) Ink[i] = std::uint8_t(255 - row[i]);
    auto samples = const_cast<JSAMPROW>(Ink.empty() ? row : Ink.data());
    Try([&] { jpeg_write_scanlines(&Jpeg, &samples, 1); });
  }

  void Finish() override {
    Try([&] { jpeg_finish_compress(&Jpeg); });
    Flush(File, Path);
  }

 private:
  template <class Call>
  void Try(Call call) {
    if (setjmp(Errors.Back) == 0)
      call();
    else
      throw Failure(Path, Errors.Reason);
  }

  void Start(const ImageInfo& info, const WriteOptions& options) {
    if (options.Lossless) throw UsageFailure(Path, "JPEG has no --lossless; JPEG XL, WebP and PNG have");
    // CMYK has no JFIF header, so its density needs a block of EXIF.
    const bool needsExif = !info.Exif.empty() || info.Pixels == Format::CMYK;
    const Bytes exif = needsExif ? ExifToWrite(info) : Bytes(), xmp = XmpToWrite(info);
    const Bytes iptc = ResourcesWithIptc(info.Iptc);
    Try([&] {
      jpeg_create_compress(&Jpeg);
      jpeg_stdio_dest(&Jpeg, File.get());
      Jpeg.image_width = JDIMENSION(info.Width);
      Jpeg.image_height = JDIMENSION(info.Height);
      Jpeg.input_components = ChannelsOf(info.Pixels);
      Jpeg.in_color_space = info.Pixels == Format::G     ? JCS_GRAYSCALE
                            : info.Pixels == Format::RGB ? JCS_RGB
                                                         : JCS_CMYK;
      jpeg_set_defaults(&Jpeg);
      jpeg_set_quality(&Jpeg, options.Quality, TRUE);
      if (options.Quality >= 90) Jpeg.comp_info[0].h_samp_factor = Jpeg.comp_info[0].v_samp_factor = 1;
      if (info.Density) {
        Jpeg.density_unit = 1;
        Jpeg.X_density = Density(info.Density->X);
        Jpeg.Y_density = Density(info.Density->Y);
      }
      jpeg_start_compress(&Jpeg, TRUE);
      WriteMarker(NotesMarker, ExifStart, exif);
      WriteMarker(NotesMarker, XmpStart, xmp);
      WriteMarker(RecordsMarker, {}, iptc);
      if (!info.Profile.empty())
        jpeg_write_icc_profile(&Jpeg, info.Profile.data(), unsigned(info.Profile.size()));
    });
  }

  static UINT16 Density(double perInch) { return UINT16(std::clamp(std::lround(perInch), 1L, 65535L)); }

  /// A marker that would be too long is left out.
  void WriteMarker(int marker, std::string_view start, const Bytes& data) {
    if (data.empty() || start.size() + data.size() > MostMarkerBytes) return;
    jpeg_write_m_header(&Jpeg, marker, unsigned(start.size() + data.size()));
    for (const char c : start) jpeg_write_m_byte(&Jpeg, std::uint8_t(c));
    for (const std::uint8_t c : data) jpeg_write_m_byte(&Jpeg, c);
  }

  std::filesystem::path Path;
  Stream File;
  JPEGErrors Errors;
  jpeg_compress_struct Jpeg{};
  Bytes Ink;
};

}

const FileType JPEGType{
    .Name = "JPEG",
    .Extensions = {".jpg", ".jpeg", ".jpe"},
    .Holds = {Format::G, Format::RGB, Format::CMYK},
    .MostEdge = 65500,
    .Begins = [](std::span<const std::uint8_t> start) { return StartsWith(start, "\xFF\xD8"); },
    .InOrder = true,
    .Open = [](const Input& input, const ReadOptions& options) -> std::unique_ptr<ImageReader> {
      return std::make_unique<JPEGReader>(input, options.MemoryLimit);
    },
    .Create = [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
                 const WriteOptions& options) -> std::unique_ptr<ImageWriter> {
      return std::make_unique<JPEGWriter>(descriptor, target, info, options);
    },
};

}
