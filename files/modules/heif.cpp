#include <libheif/heif.h>

#include <algorithm>
#include <cstring>

#include "exif.h"
#include "failure.h"
#include "handle.h"
#include "type_module.h"
#include "whole_reader.h"
#include "whole_writer.h"
#include "worker_threads.h"

// AVIF and HEIC: the same boxes around pictures packed as AV1 or HEVC.

namespace picturezor::files {

namespace {

using Context = Handle<heif_context, heif_context_free>;
using Colours = Handle<heif_color_profile_nclx, heif_nclx_color_profile_free>;

class HEIFReader : public WholeReader {
 public:
  HEIFReader(const Input& input, const ReadOptions& options, const char* type)
      : WholeReader(input, options), Of(type), File(heif_context_alloc()) {
    const auto bytes = input.All(options.MemoryLimit);
    heif_context_set_max_decoding_threads(File.get(), ThreadsFor(options.Threads));
    Check(heif_context_read_from_memory_without_copy(File.get(), bytes.data(), bytes.size(), nullptr));
    About.Pages = heif_context_get_number_of_top_level_images(File.get());
    RequirePage(input, options, About.Pages);
    OpenPage();
    const heif_image_handle* image = Image.get();
    RequirePlausible(input.Name(), heif_image_handle_get_width(image), heif_image_handle_get_height(image),
                     input.Size(), MostPixelsPerByte);
    // The library turns the picture upright itself.
    About.Width = heif_image_handle_get_width(image);
    About.Height = heif_image_handle_get_height(image);
    About.Pixels = heif_image_handle_has_alpha_channel(image) ? Format::RGBA : Format::RGB;
    SetBits(std::max(1, heif_image_handle_get_luma_bits_per_pixel(image)));
    ReadExtras();
    // Planes as they are packed, and as they are given.
    Needs = 4 * std::max(1, (About.Bits + 7) / 8);
    heif_context_set_maximum_image_size_limit(File.get(), std::max(About.Width, About.Height) + 64);
  }

 private:
  void Check(const heif_error& error) const {
    if (error.code != heif_error_Ok)
      throw Failure(From.Name(), "corrupt " + std::string(Of) + ": " + error.message);
  }

  /// The main picture comes first, whatever its place in the file.
  void OpenPage() {
    std::vector<heif_item_id> all(std::size_t(About.Pages));
    heif_context_get_list_of_top_level_image_IDs(File.get(), all.data(), About.Pages);
    heif_item_id main = 0;
    Check(heif_context_get_primary_image_ID(File.get(), &main));
    const auto at = std::ranges::find(all, main);
    if (at != all.end()) std::rotate(all.begin(), at, at + 1);
    heif_image_handle* image = nullptr;
    Check(heif_context_get_image_handle(File.get(), all[std::size_t(Options.Page)], &image));
    Image.reset(image);
  }

  void ReadExtras() {
    if (const std::size_t size = heif_image_handle_get_raw_color_profile_size(Image.get())) {
      About.Profile.resize(size);
      Check(heif_image_handle_get_raw_color_profile(Image.get(), About.Profile.data()));
    }
    const int count = heif_image_handle_get_number_of_metadata_blocks(Image.get(), nullptr);
    std::vector<heif_item_id> blocks(std::size_t(std::max(0, count)));
    heif_image_handle_get_list_of_metadata_block_IDs(Image.get(), nullptr, blocks.data(), count);
    for (const heif_item_id id : blocks) {
      const std::string kind = heif_image_handle_get_metadata_type(Image.get(), id);
      const std::string content = heif_image_handle_get_metadata_content_type(Image.get(), id);
      Bytes block(heif_image_handle_get_metadata_size(Image.get(), id));
      if (block.empty()) continue;
      Check(heif_image_handle_get_metadata(Image.get(), id, block.data()));
      if (kind == "mime" && content == "application/rdf+xml") About.Xmp = block;
      if (kind == "Exif") SetExifOfBox(About, block);
    }
  }

  void Decode(std::uint8_t* pixels, const Extent& size) override {
    const Handle<heif_decoding_options, heif_decoding_options_free> options(heif_decoding_options_alloc());
    options->convert_hdr_to_8bit = 1;
    options->strict_decoding = 1;
    const bool alpha = HasAlpha(About.Pixels);
    heif_image* decoded = nullptr;
    Check(heif_decode_image(Image.get(), &decoded, heif_colorspace_RGB,
                            alpha ? heif_chroma_interleaved_RGBA : heif_chroma_interleaved_RGB,
                            options.get()));
    const Handle<heif_image, heif_image_release> owner(decoded);
    int stride = 0;
    const std::uint8_t* rows = heif_image_get_plane_readonly(decoded, heif_channel_interleaved, &stride);
    if (!rows || heif_image_get_width(decoded, heif_channel_interleaved) != size.Width ||
        heif_image_get_height(decoded, heif_channel_interleaved) != size.Height)
      throw Failure(From.Name(), "corrupt " + std::string(Of) + ": the picture has another size");
    const int channels = ChannelsOf(About.Pixels);
    const std::size_t row = std::size_t(size.Width) * std::size_t(channels);
    for (std::int32_t y = 0; y < size.Height; ++y, pixels += row, rows += stride) {
      std::memcpy(pixels, rows, row);
      if (alpha && heif_image_handle_is_premultiplied_alpha(Image.get()))
        TakeAlphaOut(pixels, size.Width, channels);
    }
  }

  const char* const Of;
  Context File;
  Handle<heif_image_handle, heif_image_handle_release> Image;
};

class HEIFWriter : public WholeWriter {
 public:
  HEIFWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
             const WriteOptions& options, heif_compression_format packing)
      : WholeWriter(descriptor, target, info, options), Packing(packing) {
    RequireUsualPacking();
  }

 private:
  void Check(const heif_error& error) const {
    if (error.code != heif_error_Ok) Fail(error.message);
  }

  void Encode(std::uint8_t* pixels) override {
    const Context file(heif_context_alloc());
    heif_encoder* made = nullptr;
    Check(heif_context_get_encoder_for_format(file.get(), Packing, &made));
    const Handle<heif_encoder, heif_encoder_release> encoder(made);
    Check(heif_encoder_set_lossy_quality(made, Options.Quality));
    // From this quality on colours are kept at full resolution, as in JPEG.
    const bool full = Options.Lossless || Options.Quality >= 90;
    Check(heif_encoder_set_parameter_string(made, "chroma", full ? "444" : "420"));
    if (Options.Lossless) Check(heif_encoder_set_lossless(made, 1));
    if (Options.Level && Packing == heif_compression_AV1)
      Check(heif_encoder_set_parameter_integer(made, "speed", 9 - *Options.Level));
    if (Packing == heif_compression_AV1)
      Check(heif_encoder_set_parameter_integer(made, "threads", std::min(16, ThreadsFor(Options.Threads))));

    const Handle<heif_image, heif_image_release> image(Planes(pixels));
    const Handle<heif_encoding_options, heif_encoding_options_free> options(heif_encoding_options_alloc());
    const Colours colours(heif_nclx_color_profile_alloc());
    if (Options.Lossless) {
      // Green, blue and red as they are.
      colours->matrix_coefficients = heif_matrix_coefficients_RGB_GBR;
      colours->full_range_flag = 1;
      options->output_nclx_profile = colours.get();
      Check(heif_image_set_nclx_color_profile(image.get(), colours.get()));
    }
    heif_image_handle* stored = nullptr;
    Check(heif_context_encode_image(file.get(), image.get(), made, options.get(), &stored));
    const Handle<heif_image_handle, heif_image_handle_release> owner(stored);
    const Bytes exif = ExifToWrite(About), xmp = XmpToWrite(About);
    if (!exif.empty())
      Check(heif_context_add_exif_metadata(file.get(), stored, exif.data(), int(exif.size())));
    if (!xmp.empty()) Check(heif_context_add_XMP_metadata(file.get(), stored, xmp.data(), int(xmp.size())));

    heif_writer writer{};
    writer.writer_api_version = 1;
    writer.write = [](heif_context*, const void* data, std::size_t size, void* self) {
      const auto* bytes = static_cast<const std::uint8_t*>(data);
      static_cast<Bytes*>(self)->assign(bytes, bytes + size);
      return heif_error{heif_error_Ok, heif_suberror_Unspecified, ""};
    };
    Bytes written;
    Check(heif_context_write(file.get(), &writer, &written));
    Put(written);
  }

  heif_image* Planes(const std::uint8_t* pixels) const {
    const bool alpha = HasAlpha(About.Pixels);
    heif_image* image = nullptr;
    Check(heif_image_create(About.Width, About.Height, heif_colorspace_RGB,
                            alpha ? heif_chroma_interleaved_RGBA : heif_chroma_interleaved_RGB, &image));
    Check(heif_image_add_plane(image, heif_channel_interleaved, About.Width, About.Height, 8));
    int stride = 0;
    std::uint8_t* rows = heif_image_get_plane(image, heif_channel_interleaved, &stride);
    const std::size_t row = std::size_t(About.Width) * std::size_t(ChannelsOf(About.Pixels));
    for (std::int32_t y = 0; y < About.Height; ++y, rows += stride, pixels += row)
      std::memcpy(rows, pixels, row);
    if (!About.Profile.empty())
      Check(heif_image_set_raw_color_profile(image, "prof", About.Profile.data(), About.Profile.size()));
    return image;
  }

  const heif_compression_format Packing;
};

template <bool AVIF>
std::unique_ptr<ImageReader> Open(const Input& input, const ReadOptions& options) {
  return std::make_unique<HEIFReader>(input, options, AVIF ? "AVIF" : "HEIC");
}

template <bool AVIF>
std::unique_ptr<ImageWriter> Create(int descriptor, const std::filesystem::path& target,
                                    const ImageInfo& info, const WriteOptions& options) {
  return std::make_unique<HEIFWriter>(descriptor, target, info, options,
                                      AVIF ? heif_compression_AV1 : heif_compression_HEVC);
}

}

PICTUREZOR_TYPE_CODE(AVIF){PICTUREZOR_VERSION, nullptr, Open<true>, Create<true>};
PICTUREZOR_TYPE_CODE(HEIC){PICTUREZOR_VERSION, nullptr, Open<false>, Create<false>};

}
