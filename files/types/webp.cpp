#include <webp/decode.h>
#include <webp/demux.h>
#include <webp/encode.h>
#include <webp/mux.h>

#include <cstring>

#include "exif.h"
#include "failure.h"
#include "file_types.h"
#include "handle.h"
#include "whole_reader.h"
#include "whole_writer.h"

namespace picturezor::files {

namespace {

class WebPReader : public WholeReader {
 public:
  WebPReader(const Input& input, const ReadOptions& options)
      : WholeReader(input, options), File(input.All(options.MemoryLimit)) {
    const WebPData data = Data();
    WebPDemuxState state = WEBP_DEMUX_PARSE_ERROR;
    const Handle<WebPDemuxer, WebPDemuxDelete> parts(WebPDemuxPartial(&data, &state));
    if (!parts || state == WEBP_DEMUX_PARSE_ERROR) throw Failure(input.Name(), "corrupt WebP");
    if (state != WEBP_DEMUX_DONE) throw Failure(input.Name(), "the WebP file is cut off");
    RequirePlausible(input.Name(), WebPDemuxGetI(parts.get(), WEBP_FF_CANVAS_WIDTH),
                     WebPDemuxGetI(parts.get(), WEBP_FF_CANVAS_HEIGHT), input.Size(), MostPixelsPerByte);
    About.Width = std::int32_t(WebPDemuxGetI(parts.get(), WEBP_FF_CANVAS_WIDTH));
    About.Height = std::int32_t(WebPDemuxGetI(parts.get(), WEBP_FF_CANVAS_HEIGHT));
    About.Pages = int(WebPDemuxGetI(parts.get(), WEBP_FF_FRAME_COUNT));
    RequirePage(input, options, About.Pages);
    Animated = WebPDemuxGetI(parts.get(), WEBP_FF_FORMAT_FLAGS) & ANIMATION_FLAG;
    WebPIterator frame;
    if (!WebPDemuxGetFrame(parts.get(), 1, &frame)) throw Failure(input.Name(), "corrupt WebP: no picture");
    About.Pixels = Animated || frame.has_alpha ? Format::RGBA : Format::RGB;
    WebPDemuxReleaseIterator(&frame);
    About.Profile = Chunk(parts.get(), "ICCP");
    About.Xmp = Chunk(parts.get(), "XMP ");
    SetExif(About, Chunk(parts.get(), "EXIF"));
    // An animation is put together in two canvases of the library.
    Needs = Animated ? 3 : 1;
  }

 private:
  WebPData Data() const { return {File.data(), File.size()}; }

  static Bytes Chunk(WebPDemuxer* parts, const char* name) {
    WebPChunkIterator chunk;
    Bytes bytes;
    if (WebPDemuxGetChunk(parts, name, 1, &chunk))
      bytes.assign(chunk.chunk.bytes, chunk.chunk.bytes + chunk.chunk.size);
    WebPDemuxReleaseChunkIterator(&chunk);
    return bytes;
  }

  void Decode(std::uint8_t* pixels, const Extent& whole) override {
    const std::size_t row = std::size_t(whole.Width) * std::size_t(ChannelsOf(About.Pixels));
    const std::size_t size = row * std::size_t(whole.Height);
    if (Animated) return DecodeFrame(pixels, size);
    WebPDecoderConfig config;
    WebPInitDecoderConfig(&config);
    config.options.use_threads = Options.Threads != 1;
    config.output.colorspace = HasAlpha(About.Pixels) ? MODE_RGBA : MODE_RGB;
    config.output.is_external_memory = 1;
    config.output.u.RGBA = {.rgba = pixels, .stride = int(row), .size = size};
    switch (WebPDecode(File.data(), File.size(), &config)) {
      case VP8_STATUS_OK: return;
      case VP8_STATUS_OUT_OF_MEMORY: throw Failure(From.Name(), "not enough memory");
      case VP8_STATUS_NOT_ENOUGH_DATA: throw Failure(From.Name(), "the WebP file is cut off");
      default: throw Failure(From.Name(), "corrupt WebP");
    }
  }

  /// Frames are drawn over each other.
  void DecodeFrame(std::uint8_t* pixels, std::size_t size) const {
    const WebPData data = Data();
    WebPAnimDecoderOptions options;
    WebPAnimDecoderOptionsInit(&options);
    options.color_mode = MODE_RGBA;
    options.use_threads = Options.Threads != 1;
    const Handle<WebPAnimDecoder, WebPAnimDecoderDelete> decoder(WebPAnimDecoderNew(&data, &options));
    std::uint8_t* canvas = nullptr;
    int page = 0, time = 0;
    do {
      if (!decoder || !WebPAnimDecoderGetNext(decoder.get(), &canvas, &time))
        throw Failure(From.Name(), "corrupt WebP");
    } while (page++ < Options.Page);
    std::memcpy(pixels, canvas, size);
  }

  std::span<const std::uint8_t> File;
  bool Animated = false;
};

class WebPWriter : public WholeWriter {
 public:
  WebPWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
             const WriteOptions& options)
      : WholeWriter(descriptor, target, info, options) {
    RequireUsualPacking();
  }

 private:
  void Encode(std::uint8_t* pixels) override {
    WebPConfig config;
    WebPConfigInit(&config);
    config.quality = float(Options.Quality);
    if (Options.Lossless) {
      config.lossless = config.exact = 1;
      config.quality = 75;
    }
    if (Options.Level) config.method = (*Options.Level * 6 + 4) / 9;
    config.thread_level = Options.Threads != 1;
    WebPPicture picture;
    WebPPictureInit(&picture);
    const Handle<WebPPicture, WebPPictureFree> owner(&picture);
    picture.width = About.Width;
    picture.height = About.Height;
    picture.use_argb = Options.Lossless;
    const int stride = About.Width * ChannelsOf(About.Pixels);
    const bool taken = HasAlpha(About.Pixels) ? WebPPictureImportRGBA(&picture, pixels, stride)
                                              : WebPPictureImportRGB(&picture, pixels, stride);
    WebPMemoryWriter packed;
    WebPMemoryWriterInit(&packed);
    const Handle<WebPMemoryWriter, WebPMemoryWriterClear> alsoPacked(&packed);
    picture.writer = WebPMemoryWrite;
    picture.custom_ptr = &packed;
    if (!taken || !WebPEncode(&config, &picture))
      Fail(picture.error_code == VP8_ENC_ERROR_OUT_OF_MEMORY ||
                   picture.error_code == VP8_ENC_ERROR_BITSTREAM_OUT_OF_MEMORY
               ? "not enough memory"
               : "WebP can't pack it (error " + std::to_string(picture.error_code) + ")");
    PutWithChunks({packed.mem, packed.size});
  }

  void PutWithChunks(const WebPData& image) {
    const Bytes exif = ExifToWrite(About), xmp = XmpToWrite(About);
    if (About.Profile.empty() && exif.empty() && xmp.empty()) return Put({image.bytes, image.size});
    const Handle<WebPMux, WebPMuxDelete> mux(WebPMuxNew());
    bool good = mux && WebPMuxSetImage(mux.get(), &image, 0) == WEBP_MUX_OK;
    const auto add = [&](const char* name, const Bytes& bytes) {
      const WebPData data{bytes.data(), bytes.size()};
      if (!bytes.empty()) good = good && WebPMuxSetChunk(mux.get(), name, &data, 0) == WEBP_MUX_OK;
    };
    add("ICCP", About.Profile);
    add("EXIF", exif);
    add("XMP ", xmp);
    WebPData file{};
    if (!good || WebPMuxAssemble(mux.get(), &file) != WEBP_MUX_OK) Fail("not enough memory");
    const Handle<WebPData, WebPDataClear> owner(&file);
    Put({file.bytes, file.size});
  }
};

}

const FileType WebPType{
    .Name = "WebP",
    .Extensions = {".webp"},
    .Holds = {Format::RGB, Format::RGBA},
    .MostEdge = WEBP_MAX_DIMENSION,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          return StartsWith(start, "RIFF") && start.size() >= 12 && StartsWith(start.subspan(8), "WEBP");
        },
    .InOrder = false,
    .Several = true,
    .Open = OpenAs<WebPReader>,
    .Create = CreateAs<WebPWriter>,
};

}
