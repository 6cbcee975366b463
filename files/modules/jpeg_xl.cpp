#include "types/jpeg_xl.h"

#include <jxl/decode.h>
#include <jxl/encode.h>
#include <jxl/thread_parallel_runner.h>

#include <algorithm>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "handle.h"
#include "type_module.h"
#include "types/boxes.h"
#include "whole_reader.h"
#include "whole_writer.h"
#include "worker_threads.h"

namespace picturezor::files {

namespace {

using Runner = Handle<void, JxlThreadParallelRunnerDestroy>;

Runner StartRunner(int threads) {
  return Runner(JxlThreadParallelRunnerCreate(nullptr, std::size_t(ThreadsFor(threads))));
}

JxlPixelFormat PixelsOf(Format format) {
  return {std::uint32_t(ChannelsOf(format)), JXL_TYPE_UINT8, JXL_NATIVE_ENDIAN, 0};
}

class JPEGXLReader : public WholeReader {
 public:
  JPEGXLReader(const Input& input, const ReadOptions& options)
      : WholeReader(input, options), File(input.All(options.MemoryLimit)) {
    const bool boxed = StartsWith(File, BoxedMagic);
    if (boxed && !ForBoxes(File, [](std::string_view, Span, std::size_t) {})) CutOff();
    Start(JXL_DEC_BASIC_INFO | JXL_DEC_COLOR_ENCODING | JXL_DEC_FRAME | JXL_DEC_BOX);
    // The names of boxes that are packed are those of what is in them.
    JxlDecoderSetDecompressBoxes(Decoder.get(), JXL_TRUE);
    std::string kind;
    Bytes box;
    About.Pages = 0;
    const auto endOfBox = [&] {
      if (kind.empty()) return;
      box.resize(box.size() - JxlDecoderReleaseBoxBuffer(Decoder.get()));
      TakeBox(std::exchange(kind, {}), box);
    };
    for (;;) {
      switch (JxlDecoderProcessInput(Decoder.get())) {
        case JXL_DEC_BASIC_INFO: TakeHeader(); break;
        case JXL_DEC_COLOR_ENCODING: TakeProfile(); break;
        case JXL_DEC_FRAME:
          ++About.Pages;
          JxlDecoderSkipCurrentFrame(Decoder.get());
          break;
        case JXL_DEC_BOX: {
          endOfBox();
          JxlBoxType type;
          JxlDecoderGetBoxType(Decoder.get(), type, JXL_TRUE);
          kind.assign(type, sizeof type);
          if (kind != "Exif" && kind != "xml ") {
            kind.clear();
            break;
          }
          box.resize(BoxPiece);
          JxlDecoderSetBoxBuffer(Decoder.get(), box.data(), box.size());
          break;
        }
        case JXL_DEC_BOX_NEED_MORE_OUTPUT: {
          const std::size_t done = box.size() - JxlDecoderReleaseBoxBuffer(Decoder.get());
          if (done > MostBox) throw Failure(input.Name(), "corrupt JPEG XL: a box is too large");
          box.resize(done + std::max(done, BoxPiece));
          JxlDecoderSetBoxBuffer(Decoder.get(), box.data() + done, box.size() - done);
          break;
        }
        case JXL_DEC_NEED_MORE_INPUT:
          // More boxes might come.
          if (!boxed) CutOff();
          [[fallthrough]];
        case JXL_DEC_SUCCESS:
          endOfBox();
          if (About.Pages == 0) CutOff();
          RequirePage(input, options, About.Pages);
          return;
        default: Refuse();
      }
    }
  }

 private:
  static constexpr std::size_t BoxPiece = 1 << 16, MostBox = 1 << 28;

  [[noreturn]] void Refuse() const { throw Failure(From.Name(), "corrupt JPEG XL"); }
  [[noreturn]] void CutOff() const { throw Failure(From.Name(), "the JPEG XL file is cut off"); }

  void Start(int events) {
    Decoder.reset(JxlDecoderCreate(nullptr));
    if (!Decoder) throw Failure(From.Name(), "not enough memory");
    JxlDecoderSubscribeEvents(Decoder.get(), events);
    JxlDecoderSetUnpremultiplyAlpha(Decoder.get(), JXL_TRUE);
    // It isn't told that there is no more, since it would complain on standard error of files that are cut
    // off.
    JxlDecoderSetInput(Decoder.get(), File.data(), File.size());
  }

  void TakeHeader() {
    JxlBasicInfo info;
    if (JxlDecoderGetBasicInfo(Decoder.get(), &info) != JXL_DEC_SUCCESS) Refuse();
    RequirePlausible(From.Name(), info.xsize, info.ysize, From.Size(), MostPixelsPerByte);
    for (std::uint32_t i = 0; i < info.num_extra_channels; ++i) {
      JxlExtraChannelInfo extra;
      if (JxlDecoderGetExtraChannelInfo(Decoder.get(), i, &extra) == JXL_DEC_SUCCESS &&
          extra.type == JXL_CHANNEL_BLACK)
        throw Failure(From.Name(), "JPEG XL files in CMYK aren't supported");
    }
    // The decoder turns the picture upright itself.
    About.Width = std::int32_t(info.xsize);
    About.Height = std::int32_t(info.ysize);
    SetBits(int(info.bits_per_sample));
    About.Pixels = info.num_color_channels == 1 ? Format::G : Format::RGB;
    if (info.alpha_bits) About.Pixels = WithAlpha(About.Pixels);
    // What it works on besides has four bytes a sample.
    Needs = 5;
  }

  void TakeProfile() {
    const JxlPixelFormat format = PixelsOf(About.Pixels);
    std::size_t size = 0;
    // Of a gray picture's, the decoder sets no primaries.
    JxlColorEncoding colours{};
    // sRGB is what pixels without a profile are.
    if (JxlDecoderGetColorAsEncodedProfile(Decoder.get(), &format, JXL_COLOR_PROFILE_TARGET_DATA, &colours) ==
            JXL_DEC_SUCCESS &&
        colours.primaries == JXL_PRIMARIES_SRGB && colours.white_point == JXL_WHITE_POINT_D65 &&
        colours.transfer_function == JXL_TRANSFER_FUNCTION_SRGB)
      return;
    if (JxlDecoderGetICCProfileSize(Decoder.get(), &format, JXL_COLOR_PROFILE_TARGET_DATA, &size) !=
        JXL_DEC_SUCCESS)
      return;
    RequireWithinLimit(From.Name(), std::int64_t(size), Options.MemoryLimit, "the profile");
    About.Profile.resize(size);
    if (JxlDecoderGetColorAsICCProfile(Decoder.get(), &format, JXL_COLOR_PROFILE_TARGET_DATA,
                                       About.Profile.data(), size) != JXL_DEC_SUCCESS)
      About.Profile.clear();
  }

  void TakeBox(const std::string& kind, const Bytes& box) {
    if (kind == "xml ") About.Xmp = box;
    if (kind == "Exif") SetExifOfBox(About, box);
  }

  void Decode(std::uint8_t* pixels, const Extent& whole) override {
    const Runner runner = StartRunner(Options.Threads);
    Start(JXL_DEC_FULL_IMAGE);
    JxlDecoderSetParallelRunner(Decoder.get(), JxlThreadParallelRunner, runner.get());
    JxlDecoderSkipFrames(Decoder.get(), std::size_t(Options.Page));
    const JxlPixelFormat format = PixelsOf(About.Pixels);
    const auto size = std::size_t(whole.Width) * std::size_t(whole.Height) * format.num_channels;
    for (;;) {
      switch (JxlDecoderProcessInput(Decoder.get())) {
        case JXL_DEC_NEED_IMAGE_OUT_BUFFER:
          if (JxlDecoderSetImageOutBuffer(Decoder.get(), &format, pixels, size) != JXL_DEC_SUCCESS) Refuse();
          break;
        case JXL_DEC_FULL_IMAGE: Decoder.reset(); return;
        case JXL_DEC_NEED_MORE_INPUT: CutOff();
        default: Refuse();
      }
    }
  }

  std::span<const std::uint8_t> File;
  Handle<JxlDecoder, JxlDecoderDestroy> Decoder;
};

class JPEGXLWriter : public WholeWriter {
 public:
  JPEGXLWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
               const WriteOptions& options)
      : WholeWriter(descriptor, target, info, options) {
    RequireUsualPacking();
  }

 private:
  /// What the quality of JPEG stands for, as a distance: 1 is what is just seen.
  static float DistanceOf(int quality) {
    const float q = float(quality);
    return quality >= 30 ? 0.1f + (100 - q) * 0.09f : 53 / 3000.0f * q * q - 23 / 20.0f * q + 25;
  }

  void Check(JxlEncoderStatus status) {
    if (status != JXL_ENC_SUCCESS) Fail("JPEG XL can't pack it, or there isn't enough memory");
  }

  void Encode(std::uint8_t* pixels) override {
    const Runner runner = StartRunner(Options.Threads);
    const Handle<JxlEncoder, JxlEncoderDestroy> owner(JxlEncoderCreate(nullptr));
    JxlEncoder* encoder = owner.get();
    if (!encoder) Fail("not enough memory");
    Check(JxlEncoderSetParallelRunner(encoder, JxlThreadParallelRunner, runner.get()));
    SetHeader(encoder);
    AddBoxes(encoder);
    JxlEncoderFrameSettings* frame = JxlEncoderFrameSettingsCreate(encoder, nullptr);
    Check(JxlEncoderFrameSettingsSetOption(frame, JXL_ENC_FRAME_SETTING_EFFORT,
                                           std::clamp(Options.Level.value_or(UsualEffort), 1, 9)));
    if (Options.Lossless)
      Check(JxlEncoderSetFrameLossless(frame, JXL_TRUE));
    else
      Check(JxlEncoderSetFrameDistance(frame, DistanceOf(Options.Quality)));
    const JxlPixelFormat format = PixelsOf(About.Pixels);
    const auto size = std::size_t(About.Width) * std::size_t(About.Height) * format.num_channels;
    Check(JxlEncoderAddImageFrame(frame, &format, pixels, size));
    JxlEncoderCloseInput(encoder);
    Bytes piece(1 << 20);
    for (JxlEncoderStatus status = JXL_ENC_NEED_MORE_OUTPUT; status == JXL_ENC_NEED_MORE_OUTPUT;) {
      std::uint8_t* next = piece.data();
      std::size_t room = piece.size();
      status = JxlEncoderProcessOutput(encoder, &next, &room);
      if (status != JXL_ENC_NEED_MORE_OUTPUT) Check(status);
      Put(std::span(piece).first(piece.size() - room));
    }
  }

  void SetHeader(JxlEncoder* encoder) {
    JxlBasicInfo info;
    JxlEncoderInitBasicInfo(&info);
    info.xsize = std::uint32_t(About.Width);
    info.ysize = std::uint32_t(About.Height);
    info.bits_per_sample = 8;
    info.num_color_channels = WithoutAlpha(About.Pixels) == Format::G ? 1 : 3;
    info.uses_original_profile = Options.Lossless;
    if (HasAlpha(About.Pixels)) {
      info.num_extra_channels = 1;
      info.alpha_bits = 8;
    }
    Check(JxlEncoderSetBasicInfo(encoder, &info));
    if (JxlEncoderGetRequiredCodestreamLevel(encoder) == 10) Check(JxlEncoderSetCodestreamLevel(encoder, 10));
    // A profile that the encoder finds fault with is left out.
    if (!About.Profile.empty() &&
        JxlEncoderSetICCProfile(encoder, About.Profile.data(), About.Profile.size()) == JXL_ENC_SUCCESS)
      return;
    JxlColorEncoding colours;
    JxlColorEncodingSetToSRGB(&colours, info.num_color_channels == 1);
    Check(JxlEncoderSetColorEncoding(encoder, &colours));
  }

  void AddBoxes(JxlEncoder* encoder) {
    Bytes exif = ExifToWrite(About);
    const Bytes xmp = XmpToWrite(About);
    if (exif.empty() && xmp.empty()) return;
    Check(JxlEncoderUseBoxes(encoder));
    if (!exif.empty()) {
      exif.insert(exif.begin(), 4, 0);
      Check(JxlEncoderAddBox(encoder, "Exif", exif.data(), exif.size(), JXL_FALSE));
    }
    if (!xmp.empty()) Check(JxlEncoderAddBox(encoder, "xml ", xmp.data(), xmp.size(), JXL_FALSE));
  }

  static constexpr int UsualEffort = 5;
};

}

PICTUREZOR_TYPE_CODE(JPEGXL){
    PICTUREZOR_VERSION,
    nullptr,
    OpenAs<JPEGXLReader>,
    CreateAs<JPEGXLWriter>,
};

}
