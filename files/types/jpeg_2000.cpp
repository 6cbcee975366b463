#include <openjpeg.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>

#include "boxes.h"
#include "exif.h"
#include "failure.h"
#include "file_types.h"
#include "handle.h"
#include "whole_reader.h"
#include "whole_writer.h"
#include "worker_threads.h"

namespace picturezor::files {

namespace {

using namespace std::string_view_literals;

constexpr auto BoxedMagic = "\0\0\0\x0CjP  \r\n\x87\n"sv, BareMagic = "\xFF\x4F\xFF\x51"sv;
constexpr auto XmpUuid = "\xBE\x7A\xCF\xCB\x97\xA9\x42\xE8\x9C\x71\x99\x94\x91\xE3\xAF\xAC"sv;
constexpr auto ExifUuid = "JpgTiffExif->JP2"sv;
constexpr double MetresOfInch = 0.0254;
void Append(Bytes& bytes, std::string_view text) {
  const std::size_t at = bytes.size();
  bytes.resize(at + text.size());
  std::ranges::copy(text, bytes.begin() + std::ptrdiff_t(at));
}

void Append(Bytes& bytes, std::uint64_t number, int size) {
  std::string text;
  for (int i = size - 1; i >= 0; --i) text += char(number >> 8 * i);
  Append(bytes, text);
}

/// Bytes in memory as the library reads and writes them.
struct Memory {
  Span From;
  Bytes* Into = nullptr;
  std::size_t At = 0;

  static Handle<opj_stream_t, opj_stream_destroy> Stream(Memory& self) {
    const bool reads = !self.Into;
    Handle<opj_stream_t, opj_stream_destroy> stream(opj_stream_create(1 << 20, reads));
    opj_stream_set_user_data(stream.get(), &self, nullptr);
    opj_stream_set_user_data_length(stream.get(), self.From.size());
    opj_stream_set_read_function(stream.get(), [](void* into, OPJ_SIZE_T size, void* user) -> OPJ_SIZE_T {
      auto& memory = *static_cast<Memory*>(user);
      const std::size_t got = std::min(size, memory.From.size() - std::min(memory.At, memory.From.size()));
      if (got == 0) return OPJ_SIZE_T(-1);
      std::memcpy(into, &memory.From[memory.At], got);
      memory.At += got;
      return got;
    });
    opj_stream_set_write_function(stream.get(), [](void* from, OPJ_SIZE_T size, void* user) -> OPJ_SIZE_T {
      auto& memory = *static_cast<Memory*>(user);
      memory.Into->resize(std::max(memory.Into->size(), memory.At + size));
      std::memcpy(&(*memory.Into)[memory.At], from, size);
      memory.At += size;
      return size;
    });
    opj_stream_set_skip_function(stream.get(), [](OPJ_OFF_T by, void* user) -> OPJ_OFF_T {
      static_cast<Memory*>(user)->At += std::size_t(by);
      return by;
    });
    opj_stream_set_seek_function(stream.get(), [](OPJ_OFF_T to, void* user) -> OPJ_BOOL {
      static_cast<Memory*>(user)->At = std::size_t(to);
      return OPJ_TRUE;
    });
    return stream;
  }
};

using Codec = Handle<opj_codec_t, opj_destroy_codec>;
using Image = Handle<opj_image_t, opj_image_destroy>;

/// Keeps the first thing that the library complains about.
void Listen(opj_codec_t* codec, std::string& report) {
  opj_set_error_handler(
      codec,
      [](const char* text, void* user) {
        auto& kept = *static_cast<std::string*>(user);
        if (kept.empty()) kept = text;
        while (!kept.empty() && kept.back() == '\n') kept.pop_back();
      },
      &report);
}

class JPEG2000Reader : public WholeReader {
 public:
  JPEG2000Reader(const Input& input, const ReadOptions& options) : WholeReader(input, options) {
    File.From = input.All(options.MemoryLimit);
    const bool boxed = StartsWith(File.From, BoxedMagic);
    if (boxed) ReadBoxes();
    Source = Memory::Stream(File);
    Reading.reset(opj_create_decompress(boxed ? OPJ_CODEC_JP2 : OPJ_CODEC_J2K));
    Listen(Reading.get(), Report);
    opj_dparameters_t parameters;
    opj_set_default_decoder_parameters(&parameters);
    opj_image_t* image = nullptr;
    Check(opj_setup_decoder(Reading.get(), &parameters));
    Check(opj_read_header(Source.get(), Reading.get(), &image));
    Header.reset(image);
    if (ThreadsFor(options.Threads) > 1) opj_codec_set_threads(Reading.get(), ThreadsFor(options.Threads));
    RequirePlausible(input.Name(), image->x1 - image->x0, image->y1 - image->y0, input.Size(),
                     MostPixelsPerByte);
    SetSize(0);
    ChoosePixels();
    // The library works on four bytes a sample.
    Needs = 1 + 4 * std::int64_t(image->numcomps) / ChannelsOf(About.Pixels) + 4;
  }

  /// Half, quarter and so on are the first things that stand in the file.
  void Reduce(std::int32_t leastWidth, std::int32_t leastHeight) override {
    opj_codestream_info_v2_t* info = opj_get_cstr_info(Reading.get());
    if (!info) return;
    const int most = int(info->m_default_tile_info.tccp_info[0].numresolutions) - 1;
    opj_destroy_cstr_info(&info);
    for (int by = most; by > 0; --by) {
      SetSize(by);
      if (About.Width >= leastWidth && About.Height >= leastHeight) {
        Check(opj_set_decoded_resolution_factor(Reading.get(), OPJ_UINT32(by)));
        return;
      }
    }
    SetSize(0);
  }

 private:
  void Check(bool good) const {
    if (!good)
      throw Failure(From.Name(), "corrupt JPEG 2000: " + (Report.empty() ? "it can't be read" : Report));
  }

  void SetSize(int halvings) {
    const auto reduced = [&](OPJ_UINT32 at) {
      return std::int64_t((std::uint64_t(at) + (std::uint64_t{1} << halvings) - 1) >> halvings);
    };
    About.Width = std::int32_t(reduced(Header->x1) - reduced(Header->x0));
    About.Height = std::int32_t(reduced(Header->y1) - reduced(Header->y0));
  }

  void ReadBoxes() {
    ForBoxes(File.From, [&](std::string_view name, Span box, std::size_t) {
      if (name == "jp2h")
        ForBoxes(box, [&](std::string_view inner, Span of, std::size_t) { Take(inner, of); });
      if (name != "uuid" || box.size() < 16) return;
      const Span rest = box.subspan(16);
      if (StartsWith(box, XmpUuid)) About.Xmp.assign(rest.begin(), rest.end());
      if (StartsWith(box, ExifUuid)) SetExif(About, Bytes(rest.begin(), rest.end()));
    });
  }

  void Take(std::string_view name, Span box) {
    if (name == "res ") {
      ForBoxes(box, [&](std::string_view, Span of, std::size_t) {
        // Pixels a metre, down before across, as ratios and powers of ten.
        const auto perInch = [&](std::size_t at, std::size_t power) {
          const double below = double(Number(of, at + 2, 2));
          return of.size() < 10 || below == 0 ? 0
                                              : double(Number(of, at, 2)) / below *
                                                    std::pow(10.0, std::int8_t(of[power])) * MetresOfInch;
        };
        if (perInch(0, 8) > 0 && perInch(4, 9) > 0) About.Density = {perInch(4, 9), perInch(0, 8)};
      });
    } else if (name == "colr" && !box.empty()) {
      if (box[0] == 2 && About.Profile.empty()) About.Profile.assign(box.begin() + 3, box.end());
      if (box[0] == 1 && Space == 0) Space = Number(box, 3, 4);
    } else if (name == "cdef") {
      for (std::size_t i = 0; i < Number(box, 0, 2); ++i)
        if (const auto kind = Number(box, 2 + 6 * i + 2, 2); kind == 1 || kind == 2) {
          WithAlphaChannel = true;
          Associated = kind == 2;
        }
    } else if (name == "cmap") {
      PaletteChannels = int(box.size() / 4);
    }
  }

  void ChoosePixels() {
    enum : std::uint64_t { CMYK = 12, SYCC = 18 };
    const int samples = PaletteChannels ? PaletteChannels : int(Header->numcomps);
    const int colours = samples - WithAlphaChannel;
    if (Space == CMYK || (ProfileFits(About.Profile, Format::CMYK) && colours >= 4))
      About.Pixels = Format::CMYK;
    else
      About.Pixels = colours >= 3 ? Format::RGB : Format::G;
    Luma = Space == SYCC;
    if (ChannelsOf(About.Pixels) > samples || (Luma && About.Pixels != Format::RGB)) Check(false);
    const int left = colours - ChannelsOf(About.Pixels);
    if (left > 0) About.Notes.push_back(std::to_string(left) + " extra samples per pixel left out");
    if (WithAlphaChannel) About.Pixels = WithAlpha(About.Pixels);
    SetBits(PaletteChannels ? 8 : int(Header->comps[0].prec));
  }

  void Decode(std::uint8_t* pixels, const Extent& size) override {
    Check(opj_decode(Reading.get(), Source.get(), Header.get()));
    Check(opj_end_decompress(Reading.get(), Source.get()));
    const int channels = ChannelsOf(About.Pixels);
    const int samples = int(Header->numcomps);
    for (int c = 0; c < channels; ++c) {
      // Alpha may stand behind samples that are left out.
      int at = c;
      if (HasAlpha(About.Pixels) && c == channels - 1)
        for (int i = samples - 1; i > c; --i)
          if (Header->comps[i].alpha) at = i;
      if (at >= samples) Check(false);
      CopySamples(Header->comps[at], pixels + c, channels, size);
    }
    Header.reset();
    for (std::int32_t y = 0; y < size.Height; ++y, pixels += std::ptrdiff_t{size.Width} * channels) {
      if (Luma) ToRGB(pixels, size.Width, channels);
      if (Associated) TakeAlphaOut(pixels, size.Width, channels);
    }
  }

  /// Samples of any depth, and of which some stand for several pixels, as bytes.
  void CopySamples(const opj_image_comp_t& of, std::uint8_t* out, int step, const Extent& size) const {
    const std::int64_t across = of.w, down = of.h;
    if (!of.data || across < 1 || down < 1) Check(false);
    const std::int64_t most = (std::int64_t{1} << of.prec) - 1;
    const std::int64_t shift = of.sgnd ? std::int64_t{1} << (of.prec - 1) : 0;
    for (std::int64_t y = 0; y < size.Height; ++y) {
      const OPJ_INT32* row = of.data + std::min(y / std::max<std::int64_t>(of.dy, 1), down - 1) * across;
      for (std::int64_t x = 0; x < size.Width; ++x, out += step) {
        const std::int64_t value = std::clamp<std::int64_t>(
            row[std::min(x / std::max<std::int64_t>(of.dx, 1), across - 1)] + shift, 0, most);
        *out = std::uint8_t(of.prec == 8 ? value : (value * 255 + most / 2) / most);
      }
    }
  }

  /// From luma and differences of colour as JPEG has them.
  static void ToRGB(std::uint8_t* row, std::int64_t width, int channels) {
    const auto byte = [](double value) { return std::uint8_t(std::clamp(std::lround(value), 0L, 255L)); };
    for (std::int64_t x = 0; x < width; ++x, row += channels) {
      const double y = row[0], blue = row[1] - 128.0, red = row[2] - 128.0;
      row[0] = byte(y + 1.402 * red);
      row[1] = byte(y - 0.344136 * blue - 0.714136 * red);
      row[2] = byte(y + 1.772 * blue);
    }
  }

  Memory File;
  std::string Report;
  Handle<opj_stream_t, opj_stream_destroy> Source;
  Codec Reading;
  Image Header;
  std::uint64_t Space = 0;
  int PaletteChannels = 0;
  bool WithAlphaChannel = false, Associated = false, Luma = false;
};

class JPEG2000Writer : public WholeWriter {
 public:
  JPEG2000Writer(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
                 const WriteOptions& options)
      : WholeWriter(descriptor, target, info, options) {
    RequireUsualPacking();
    if (options.Level) throw UsageFailure(target, "JPEG 2000 has no --compression");
  }

 private:
  /// Decibels that the samples stand above their faults: those that JPEG has about at this quality, by the
  /// step that it rounds to.
  static float DecibelsOf(int quality) {
    const double step = quality < 50 ? 50.0 / quality : std::max(0.02, (100 - quality) / 50.0);
    return float(33 - 10 * std::log10(step));
  }

  void Encode(std::uint8_t* pixels) override {
    const Image image = Samples(pixels);
    opj_cparameters_t parameters;
    opj_set_default_encoder_parameters(&parameters);
    parameters.tcp_numlayers = 1;
    parameters.tcp_mct = WithoutAlpha(About.Pixels) == Format::RGB;
    if (Options.Lossless) {
      parameters.cp_disto_alloc = 1;
    } else {
      parameters.irreversible = 1;
      parameters.cp_fixed_quality = 1;
      parameters.tcp_distoratio[0] = DecibelsOf(Options.Quality);
    }
    const std::int32_t edge = std::min(About.Width, About.Height);
    while (parameters.numresolution > 1 && edge >> (parameters.numresolution - 1) == 0)
      --parameters.numresolution;
    std::string report;
    Bytes file;
    Memory memory{.From = {}, .Into = &file};
    const Codec codec(opj_create_compress(OPJ_CODEC_JP2));
    Listen(codec.get(), report);
    const auto stream = Memory::Stream(memory);
    if (!opj_setup_encoder(codec.get(), &parameters, image.get())) Fail(report);
    if (ThreadsFor(Options.Threads) > 1) opj_codec_set_threads(codec.get(), ThreadsFor(Options.Threads));
    if (!opj_start_compress(codec.get(), image.get(), stream.get()) ||
        !opj_encode(codec.get(), stream.get()) || !opj_end_compress(codec.get(), stream.get()))
      Fail(report);
    PutWithBoxes(file);
  }

  Image Samples(const std::uint8_t* pixels) const {
    const int channels = ChannelsOf(About.Pixels);
    std::array<opj_image_cmptparm_t, 4> shapes{};
    for (auto& shape : shapes) {
      shape.dx = shape.dy = 1;
      shape.w = OPJ_UINT32(About.Width);
      shape.h = OPJ_UINT32(About.Height);
      shape.prec = 8;
    }
    Image image(opj_image_create(OPJ_UINT32(channels), shapes.data(),
                                 channels < 3 ? OPJ_CLRSPC_GRAY : OPJ_CLRSPC_SRGB));
    if (!image) Fail("not enough memory");
    image->x1 = OPJ_UINT32(About.Width);
    image->y1 = OPJ_UINT32(About.Height);
    const std::int64_t count = std::int64_t{About.Width} * About.Height;
    for (int c = 0; c < channels; ++c)
      for (std::int64_t i = 0; i < count; ++i) image->comps[c].data[i] = pixels[i * channels + c];
    if (HasAlpha(About.Pixels)) image->comps[channels - 1].alpha = 1;
    if (!About.Profile.empty()) {
      // The library frees it.
      image->icc_profile_buf = static_cast<OPJ_BYTE*>(std::malloc(About.Profile.size()));
      if (!image->icc_profile_buf) Fail("not enough memory");
      std::ranges::copy(About.Profile, image->icc_profile_buf);
      image->icc_profile_len = OPJ_UINT32(About.Profile.size());
    }
    return image;
  }

  /// The library writes no resolution and no notes: the former belongs at the end of the header's box, the
  /// latter behind it.
  void PutWithBoxes(Bytes& file) {
    std::size_t header = 0, end = 0;
    ForBoxes(file, [&](std::string_view name, Span box, std::size_t at) {
      if (name == "jp2h") {
        header = at;
        end = at + 8 + box.size();
      }
    });
    Bytes inside, behind;
    if (About.Density) {
      Append(inside, 26, 4);
      Append(inside, "res ");
      Append(inside, 18, 4);
      Append(inside, "resc");
      // Hundredths of pixels a metre don't fit, tens of them do.
      for (const double perInch : {About.Density->Y, About.Density->X}) {
        Append(inside, std::uint64_t(std::clamp(std::lround(perInch / MetresOfInch / 10), 1L, 65535L)), 2);
        Append(inside, 1, 2);
      }
      Append(inside, "\1\1");
    }
    const auto addNotes = [&](std::string_view uuid, const Bytes& notes) {
      if (notes.empty()) return;
      Append(behind, 8 + uuid.size() + notes.size(), 4);
      Append(behind, "uuid");
      Append(behind, uuid);
      behind.insert(behind.end(), notes.begin(), notes.end());
    };
    if (!About.Exif.empty()) addNotes(ExifUuid, ExifToWrite(About));
    addNotes(XmpUuid, XmpToWrite(About));
    Bytes size;
    Append(size, end - header + inside.size(), 4);
    std::ranges::copy(size, file.begin() + std::ptrdiff_t(header));
    const Span all(file);
    Put(all.first(end));
    Put(inside);
    Put(behind);
    Put(all.subspan(end));
  }
};

}

const FileType JPEG2000Type{
    .Name = "JPEG 2000",
    .Extensions = {".jp2"},
    .Holds = {Format::G, Format::GA, Format::RGB, Format::RGBA},
    .MostEdge = INT32_MAX,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          return StartsWith(start, BoxedMagic) || StartsWith(start, BareMagic);
        },
    .InOrder = false,
    .Open = OpenAs<JPEG2000Reader>,
    .Create = CreateAs<JPEG2000Writer>,
};

}
