#pragma once
#ifdef PICTUREZOR_VIPS
#include <vips/vips.h>

#include <memory>

#include "race.h"

namespace picturezor::bench {

/// Runs work of libvips on a picture in memory, on one thread, and writes its result to memory.
inline Contender Vips(Format format, std::function<int(VipsImage*, VipsImage**)> work) {
  [[maybe_unused]] static const bool named =
      VIPS_INIT("picturezor_bench") == 0 && NamePeer("libvips", vips_version_string());
  return {"libvips", [=] {
            vips_concurrency_set(1);
            vips_cache_set_max(0);
            auto pixels = std::make_shared<Bytes>(TestPicture(format).DataStringInFormat(format));
            return [=] {
              VipsImage* in = vips_image_new_from_memory(pixels->data(), pixels->size(), Width, Height,
                                                         BytesPerPixel(format), VIPS_FORMAT_UCHAR);
              VipsImage* out = nullptr;
              std::size_t size = 0;
              void* result = work(in, &out) == 0 ? vips_image_write_to_memory(out, &size) : nullptr;
              g_free(result);
              if (out) g_object_unref(out);
              g_object_unref(in);
            };
          }};
}

}
#endif
