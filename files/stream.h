#pragma once
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <memory>

namespace picturezor::files {

struct CloseStream {
  void operator()(std::FILE* stream) const { std::fclose(stream); }
};
using Stream = std::unique_ptr<std::FILE, CloseStream>;

/// A regular file, open; throws Failure with the reason otherwise.
Stream OpenForReading(const std::filesystem::path& file);
std::int64_t SizeOf(const Stream& stream);
/// A stream on a copy of a descriptor, which stays the caller's.
Stream StreamOn(int descriptor, const std::filesystem::path& target);
/// Writes out what is buffered. Throws Failure.
void Flush(const Stream& stream, const std::filesystem::path& target);

}
