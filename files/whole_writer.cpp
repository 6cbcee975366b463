#include "whole_writer.h"

#include "failure.h"
#include "temporary_files.h"

namespace picturezor::files {

WholeWriter::WholeWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
                         const WriteOptions& options)
    : Path(target), About(info), Options(options), File(descriptor) {
  // The samples, and what libraries make of them.
  constexpr std::int64_t bytesPerSample = 6;
  const std::int64_t samples = std::int64_t{info.Width} * info.Height * ChannelsOf(info.Pixels);
  RequireWithinLimit(target, samples * bytesPerSample, options.MemoryLimit, "to pack a picture of this type");
  Pixels.reserve(std::size_t(samples));
}

void WholeWriter::WriteRow(const std::uint8_t* row) {
  Pixels.insert(Pixels.end(), row, row + std::size_t(About.Width) * std::size_t(ChannelsOf(About.Pixels)));
}

void WholeWriter::Finish() { Encode(Pixels.data()); }

void WholeWriter::Put(std::span<const std::uint8_t> bytes) { WriteAll(File, bytes, Path); }

void WholeWriter::RequireUsualPacking() const {
  if (Options.Packing != Compression::Usual)
    throw UsageFailure(Path, "this type has --compression 0 to 9 only");
}

void WholeWriter::Fail(const std::string& reason) const { throw Failure(Path, reason); }

}
