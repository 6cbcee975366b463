#include "jpeg_bands.h"

#include <algorithm>
#include <cmath>
#include <new>

#include "jpeg_errors.h"

namespace picturezor::files {

namespace {

constexpr std::int64_t BandBytes = 512 << 10, MostInterval = 65535, BlockEdge = 8;
constexpr std::uint8_t StartOfScan = 0xDA;

UINT16 PerInch(double density) { return UINT16(std::clamp(std::lround(density), 1L, 65535L)); }

/// What libjpeg writes, in memory.
struct Written : jpeg_destination_mgr {
  Bytes File;

  Written() : jpeg_destination_mgr{} {
    init_destination = [](j_compress_ptr jpeg) { Of(jpeg).Grow(jpeg); };
    empty_output_buffer = [](j_compress_ptr jpeg) -> boolean {
      Of(jpeg).Grow(jpeg);
      return TRUE;
    };
    term_destination = [](j_compress_ptr jpeg) {
      Of(jpeg).File.resize(Of(jpeg).File.size() - Of(jpeg).free_in_buffer);
    };
  }
  static Written& Of(j_compress_ptr jpeg) { return *static_cast<Written*>(jpeg->dest); }
  void Grow(j_compress_ptr jpeg) {
    const std::size_t used = File.size();
    bool grown = true;
    try {
      File.resize(std::max<std::size_t>(2 * used, 64 << 10));
    } catch (const std::bad_alloc&) {
      grown = false;
    }
    // Outside of what catches, since it jumps.
    if (!grown) ERREXIT1(jpeg, JERR_OUT_OF_MEMORY, 0);
    next_output_byte = &File[used];
    free_in_buffer = File.size() - used;
  }
};

/// A file in memory on its way through libjpeg.
class Encoder {
 public:
  explicit Encoder(const std::filesystem::path& target) : Path(target) { Jpeg.err = &Errors.Manager; }
  Encoder(const Encoder&) = delete;
  ~Encoder() { jpeg_destroy_compress(&Jpeg); }

  void Start(const ImageInfo& info, std::int32_t height, int quality) {
    Try([&] {
      jpeg_create_compress(&Jpeg);
      Jpeg.dest = &Into;
      Jpeg.image_width = JDIMENSION(info.Width);
      Jpeg.image_height = JDIMENSION(height);
      Jpeg.input_components = ChannelsOf(info.Pixels);
      Jpeg.in_color_space = info.Pixels == Format::G     ? JCS_GRAYSCALE
                            : info.Pixels == Format::RGB ? JCS_RGB
                                                         : JCS_CMYK;
      jpeg_set_defaults(&Jpeg);
      jpeg_set_quality(&Jpeg, quality, TRUE);
      if (quality >= 90) Jpeg.comp_info[0].h_samp_factor = Jpeg.comp_info[0].v_samp_factor = 1;
      if (info.Density) {
        Jpeg.density_unit = 1;
        Jpeg.X_density = PerInch(info.Density->X);
        Jpeg.Y_density = PerInch(info.Density->Y);
      }
    });
  }
  /// The pixels that are coded together.
  std::int64_t UnitWidth() const { return BlockEdge * Jpeg.comp_info[0].h_samp_factor; }
  std::int64_t UnitHeight() const { return BlockEdge * Jpeg.comp_info[0].v_samp_factor; }

  void BeginFile(const JPEGMarkers& head, const Bytes& profile, unsigned interval) {
    Try([&] {
      Jpeg.restart_interval = interval;
      jpeg_start_compress(&Jpeg, TRUE);
      for (const JPEGMarker& marker : head)
        jpeg_write_marker(&Jpeg, marker.Code, marker.Data.data(), unsigned(marker.Data.size()));
      if (!profile.empty()) jpeg_write_icc_profile(&Jpeg, profile.data(), unsigned(profile.size()));
    });
  }
  /// Of later bands the headers are dropped.
  void BeginBand() {
    Try([&] {
      Jpeg.write_JFIF_header = Jpeg.write_Adobe_marker = FALSE;
      jpeg_suppress_tables(&Jpeg, TRUE);
      jpeg_start_compress(&Jpeg, FALSE);
    });
  }

  std::span<std::uint8_t> Encode(Bytes& rows, std::size_t rowBytes) {
    Try([&] {
      while (Jpeg.next_scanline < Jpeg.image_height) {
        JSAMPROW row = rows.data() + Jpeg.next_scanline * rowBytes;
        jpeg_write_scanlines(&Jpeg, &row, 1);
      }
      jpeg_finish_compress(&Jpeg);
    });
    return Into.File;
  }

 private:
  template <class Call>
  void Try(Call call) {
    Errors.Try(Path, call);
  }

  const std::filesystem::path& Path;
  JPEGErrors Errors;
  jpeg_compress_struct Jpeg{};
  Written Into;
};

std::size_t Number16(const std::uint8_t* at) { return std::size_t(at[0]) << 8 | at[1]; }

/// Where the coded pixels of a file begin. The frame header, which says how high the picture is, gets
/// `height`.
std::size_t ScanOf(std::span<std::uint8_t> file, std::int32_t height) {
  std::size_t at = 2;
  for (;;) {
    const std::uint8_t marker = file[at + 1];
    if (marker == 0xC0 || marker == 0xC1) {
      file[at + 5] = std::uint8_t(height >> 8);
      file[at + 6] = std::uint8_t(height);
    }
    at += 2 + Number16(&file[at + 2]);
    if (marker == StartOfScan) return at;
  }
}

}

JPEGBands::JPEGBands(const std::filesystem::path& target, const ImageInfo& info, JPEGMarkers head,
                     int quality, int threads, Sink sink)
    : Path(target),
      Info(info),
      Head(std::move(head)),
      Quality(quality),
      Into(std::move(sink)),
      RowBytes(std::size_t(info.Width) * std::size_t(ChannelsOf(info.Pixels))),
      MostWaiting(std::size_t(ThreadsFor(threads)) + 2),
      Bands(ThreadsFor(threads), [this](Band& band, int) { Pack(band); }) {
  Encoder encoder(Path);
  encoder.Start(Info, Info.Height, Quality);
  const std::int64_t units = (info.Width + encoder.UnitWidth() - 1) / encoder.UnitWidth();
  const std::int64_t bytes = std::int64_t(RowBytes) * encoder.UnitHeight();
  const std::int64_t rows = std::max<std::int64_t>(std::min(MostInterval / units, BandBytes / bytes), 1);
  RowsPerBand = std::int32_t(rows * encoder.UnitHeight());
  RestartInterval = RowsPerBand < info.Height ? unsigned(rows * units) : 0;
}

void JPEGBands::Add(const std::uint8_t* row) {
  if (!Open) {
    Open = std::make_unique<Band>();
    Open->Number = Numbers++;
    Open->Rows.reserve(std::size_t(std::min<std::int64_t>(RowsPerBand, Info.Height - Begun)) * RowBytes);
  }
  Open->Rows.insert(Open->Rows.end(), row, row + RowBytes);
  ++Open->Count;
  const bool last = ++Begun == Info.Height;
  if (Open->Count < RowsPerBand && !last) return;
  Bands.Put(std::move(Open));
  while (Bands.Size() >= (last ? 1 : MostWaiting)) GiveOldest();
}

void JPEGBands::Pack(Band& band) const {
  // In files ink is counted from full to none.
  if (Info.Pixels == Format::CMYK)
    for (std::uint8_t& sample : band.Rows) sample = std::uint8_t(255 - sample);
  Encoder encoder(Path);
  encoder.Start(Info, band.Count, Quality);
  const bool first = band.Number == 0, last = Info.Height <= (band.Number + 1) * RowsPerBand;
  if (first)
    encoder.BeginFile(Head, Info.Profile, RestartInterval);
  else
    encoder.BeginBand();
  std::span<std::uint8_t> file = encoder.Encode(band.Rows, RowBytes);
  const std::size_t scan = ScanOf(file, Info.Height);
  if (!last) file = file.first(file.size() - 2);
  if (first) {
    band.Packed.assign(file.begin(), file.end());
    return;
  }
  band.Packed = {0xFF, std::uint8_t(JPEG_RST0 + (band.Number - 1) % 8)};
  band.Packed.insert(band.Packed.end(), file.begin() + std::ptrdiff_t(scan), file.end());
}

void JPEGBands::GiveOldest() { Into(Bands.Take()->Packed); }

}
