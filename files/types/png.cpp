#include <png.h>

#include <cerrno>
#include <cmath>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "file_types.h"
#include "png_blocks.h"
#include "png_source.h"
#include "stream.h"

namespace picturezor::files {

namespace {

constexpr double MetresOfInch = 0.0254;
constexpr const char* XmpKey = "XML:com.adobe.xmp";
/// What deflate gives at most for a byte.
constexpr double MostInflation = 1032;
/// For less no thread is begun.
constexpr std::int64_t FewBytes = 256 << 10;

/// What reading and writing share: libpng reports by a jump, which becomes a Failure here.
class PNGFile {
 protected:
  explicit PNGFile(std::filesystem::path path) : Path(std::move(path)) {}

  /// `call` may hold nothing that needs a destructor, since libpng jumps out of it.
  template <class Call>
  void Try(Call call) {
    if (setjmp(png_jmpbuf(Png)) == 0)
      call();
    else
      throw Failure(Path, Reason);
  }

  static void OnError(png_structp png, png_const_charp message) {
    auto& self = *static_cast<PNGFile*>(png_get_error_ptr(png));
    std::snprintf(self.Reason, sizeof self.Reason, self.System ? "%s" : "corrupt PNG: %s", message);
    png_longjmp(png, 1);
  }
  static void OnWarning(png_structp, png_const_charp) {}

  [[noreturn]] void SystemError(const char* message) {
    System = true;
    png_error(Png, message);
  }

  std::filesystem::path Path;
  png_structp Png = nullptr;
  png_infop Header = nullptr;
  char Reason[256] = {};
  bool System = false;
};

class PNGReader : public ImageReader, PNGFile {
 public:
  PNGReader(const Input& input, const ReadOptions& options)
      : PNGFile(input.Name()),
        FileSize(input.Size()),
        Source(input.Open(), FileSize > FewBytes && ThreadsFor(options.Threads) > 1) {
    Png = png_create_read_struct(PNG_LIBPNG_VER_STRING, static_cast<PNGFile*>(this), OnError, OnWarning);
    Header = Png ? png_create_info_struct(Png) : nullptr;
    if (!Header) {
      png_destroy_read_struct(&Png, nullptr, nullptr);
      throw Failure(Path, "not enough memory");
    }
    try {
      Start(options.MemoryLimit);
    } catch (...) {
      png_destroy_read_struct(&Png, &Header, nullptr);
      throw;
    }
  }
  ~PNGReader() override { png_destroy_read_struct(&Png, &Header, nullptr); }

  void ReadRow(std::uint8_t* row) override {
    const std::size_t size = std::size_t(About.Width) * ChannelsOf(About.Pixels);
    if (Whole.empty())
      Try([&] { png_read_row(Png, row, nullptr); });
    else
      std::memcpy(row, Whole.data() + size * NextRow++, size);
  }

  void Finish() override {
    Try([&] { png_read_end(Png, nullptr); });
  }

 private:
  static void OnRead(png_structp png, png_bytep data, std::size_t size) {
    auto& self = *static_cast<PNGReader*>(png_get_io_ptr(png));
    if (self.Source.Read(data, size)) return;
    self.System = !self.Source.Found().Damaged;
    png_error(png, self.Source.Found().Text.c_str());
  }

  void Start(std::int64_t memoryLimit) {
    Try([&] {
      png_set_read_fn(Png, this, OnRead);
      png_set_user_limits(Png, PNG_UINT_31_MAX, PNG_UINT_31_MAX);
      // The source has looked at the sums.
      png_set_crc_action(Png, PNG_CRC_QUIET_USE, PNG_CRC_QUIET_USE);
      png_set_option(Png, PNG_IGNORE_ADLER32, PNG_OPTION_ON);
      png_set_compression_buffer_size(Png, 64 << 10);
      png_read_info(Png, Header);
    });
    const std::int64_t width = png_get_image_width(Png, Header), height = png_get_image_height(Png, Header);
    const int type = png_get_color_type(Png, Header);
    About.Bits = png_get_bit_depth(Png, Header);
    const int bits = About.Bits * png_get_channels(Png, Header);
    RequirePlausible(Path, width, height, FileSize, MostInflation * 8 / bits);
    About.Width = std::int32_t(width);
    About.Height = std::int32_t(height);
    if (About.Bits == 16) About.Notes.push_back("16 bits per sample reduced to 8");

    int passes = 1;
    Try([&] {
      png_set_expand(Png);
      png_set_scale_16(Png);
      passes = png_set_interlace_handling(Png);
      png_read_update_info(Png, Header);
    });
    const bool alpha = png_get_color_type(Png, Header) & PNG_COLOR_MASK_ALPHA;
    About.Pixels = type & PNG_COLOR_MASK_COLOR ? Format::RGB : Format::G;
    if (alpha) About.Pixels = WithAlpha(About.Pixels);
    ReadExtras();
    if (passes > 1) ReadWhole(passes, memoryLimit);
  }

  void ReadExtras() {
    png_charp name = nullptr;
    png_bytep profile = nullptr, exif = nullptr;
    png_uint_32 profileSize = 0, exifSize = 0, x = 0, y = 0;
    int compression = 0, unit = 0;
    // What PNG itself tells of the resolution counts more.
    if (png_get_eXIf_1(Png, Header, &exifSize, &exif)) SetExif(About, Bytes(exif, exif + exifSize));
    if (png_get_iCCP(Png, Header, &name, &compression, &profile, &profileSize))
      About.Profile.assign(profile, profile + profileSize);
    if (png_get_pHYs(Png, Header, &x, &y, &unit) && unit == PNG_RESOLUTION_METER && x && y)
      About.Density = {x * MetresOfInch, y * MetresOfInch};
    png_textp texts = nullptr;
    const int count = png_get_text(Png, Header, &texts, nullptr);
    for (const png_text& text : std::span(texts, std::size_t(count)))
      if (std::strcmp(text.key, XmpKey) == 0) {
        const std::string_view value(text.text, std::max(text.text_length, text.itxt_length));
        About.Xmp.assign(value.begin(), value.end());
      }
  }

  /// The passes of an interlaced file fill each other's gaps.
  void ReadWhole(int passes, std::int64_t memoryLimit) {
    const std::int64_t size = std::int64_t{About.Width} * ChannelsOf(About.Pixels);
    RequireWithinLimit(Path, size * About.Height, memoryLimit, "an interlaced PNG");
    Whole.resize(std::size_t(size * About.Height));
    Try([&] {
      for (int pass = 0; pass < passes; ++pass)
        for (std::int32_t y = 0; y < About.Height; ++y) png_read_row(Png, Whole.data() + size * y, nullptr);
    });
  }

  std::int64_t FileSize;
  PNGSource Source;
  Bytes Whole;
  std::size_t NextRow = 0;
};

class PNGWriter : public ImageWriter, PNGFile {
 public:
  PNGWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
            const WriteOptions& options)
      : PNGFile(target), File(StreamOn(descriptor, target)) {
    Png = png_create_write_struct(PNG_LIBPNG_VER_STRING, static_cast<PNGFile*>(this), OnError, OnWarning);
    Header = Png ? png_create_info_struct(Png) : nullptr;
    if (!Header) {
      png_destroy_write_struct(&Png, nullptr);
      throw Failure(target, "not enough memory");
    }
    try {
      if (options.Packing != Compression::Usual)
        throw UsageFailure(target, "PNG has --compression 0 to 9 only");
      Start(info);
      const int channels = ChannelsOf(info.Pixels);
      Samples = std::make_unique<PNGBlocks>(
          std::size_t(info.Width) * std::size_t(channels), channels, info.Height, options.Level,
          options.Threads, [this](std::span<const std::uint8_t> piece) { WriteData(piece); });
    } catch (...) {
      png_destroy_write_struct(&Png, &Header);
      throw;
    }
  }
  ~PNGWriter() override { png_destroy_write_struct(&Png, &Header); }

  void WriteRow(const std::uint8_t* row) override { Samples->Add(row); }

  void Finish() override {
    Try([&] { png_write_chunk(Png, reinterpret_cast<png_const_bytep>("IEND"), nullptr, 0); });
    Flush(File, Path);
  }

 private:
  static void OnWrite(png_structp png, png_bytep data, std::size_t size) {
    auto& self = *static_cast<PNGWriter*>(png_get_io_ptr(png));
    if (std::fwrite(data, 1, size, self.File.get()) != size) self.SystemError(std::strerror(errno));
  }
  static void OnFlush(png_structp) {}

  void WriteData(std::span<const std::uint8_t> piece) {
    constexpr std::size_t most = 1 << 30;
    for (; !piece.empty(); piece = piece.subspan(std::min(most, piece.size())))
      Try([&] {
        png_write_chunk(Png, reinterpret_cast<png_const_bytep>("IDAT"), piece.data(),
                        std::min(most, piece.size()));
      });
  }

  void Start(const ImageInfo& info) {
    int type = WithoutAlpha(info.Pixels) == Format::RGB ? PNG_COLOR_TYPE_RGB : PNG_COLOR_TYPE_GRAY;
    if (HasAlpha(info.Pixels)) type |= PNG_COLOR_MASK_ALPHA;
    Bytes exif = info.Exif.empty() ? Bytes() : ExifToWrite(info), xmp = XmpToWrite(info);
    xmp.push_back(0);
    png_text text{};
    text.compression = PNG_ITXT_COMPRESSION_NONE;
    text.key = const_cast<char*>(XmpKey);
    text.text = reinterpret_cast<char*>(xmp.data());
    text.itxt_length = xmp.size() - 1;
    Try([&] {
      png_set_write_fn(Png, this, OnWrite, OnFlush);
      // A profile that libpng finds fault with is left out.
      png_set_benign_errors(Png, 1);
      png_set_user_limits(Png, PNG_UINT_31_MAX, PNG_UINT_31_MAX);
      png_set_IHDR(Png, Header, png_uint_32(info.Width), png_uint_32(info.Height), 8, type,
                   PNG_INTERLACE_NONE, PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
      if (!info.Profile.empty())
        png_set_iCCP(Png, Header, "ICC profile", PNG_COMPRESSION_TYPE_BASE, info.Profile.data(),
                     png_uint_32(info.Profile.size()));
      if (!exif.empty()) png_set_eXIf_1(Png, Header, png_uint_32(exif.size()), exif.data());
      if (text.itxt_length) png_set_text(Png, Header, &text, 1);
      if (info.Density)
        png_set_pHYs(Png, Header, png_uint_32(std::lround(info.Density->X / MetresOfInch)),
                     png_uint_32(std::lround(info.Density->Y / MetresOfInch)), PNG_RESOLUTION_METER);
      png_write_info(Png, Header);
    });
  }

  Stream File;
  std::unique_ptr<PNGBlocks> Samples;
};

}

const FileType PNGType{
    .Name = "PNG",
    .Extensions = {".png"},
    .Holds = {Format::G, Format::GA, Format::RGB, Format::RGBA},
    .MostEdge = INT32_MAX,
    .Begins = [](std::span<const std::uint8_t> start) { return StartsWith(start, "\x89PNG"); },
    .InOrder = true,
    .Open = [](const Input& input, const ReadOptions& options) -> std::unique_ptr<ImageReader> {
      return std::make_unique<PNGReader>(input, options);
    },
    .Create = [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
                 const WriteOptions& options) -> std::unique_ptr<ImageWriter> {
      return std::make_unique<PNGWriter>(descriptor, target, info, options);
    },
};

}
