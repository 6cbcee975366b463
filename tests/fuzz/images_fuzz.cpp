#include <cstdlib>

#include "failure.h"
#include "image_file.h"

// The readers of the command: any file is read to its end or refused with one line.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace picturezor::files;
  constexpr std::int64_t memoryLimit = 16 << 20, mostRows = 512;
  try {
    const auto reader = OpenImage(Input::Memory({data, size}, "image"), {memoryLimit});
    const ImageInfo& info = reader->Info();
    const std::int64_t bytes = std::int64_t{info.Width} * ChannelsOf(info.Pixels);
    if (info.Width < 1 || info.Height < 1 || ChannelsOf(info.Pixels) < 1) std::abort();
    if (bytes > memoryLimit) return 0;
    picturezor::Bytes row(static_cast<std::size_t>(bytes));
    for (std::int64_t y = 0; y < info.Height && y < mostRows; ++y) reader->ReadRow(row.data());
    if (info.Height <= mostRows) reader->Finish();
  } catch (const Failure&) {
    // Refused.
  }
  return 0;
}
