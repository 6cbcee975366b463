#pragma once
#include <cstdio>
#include <filesystem>
#include <memory>

namespace picturezor::files {

struct CloseStream {
  void operator()(std::FILE* stream) const { std::fclose(stream); }
};
using Stream = std::unique_ptr<std::FILE, CloseStream>;

/// A stream on a copy of a descriptor, which stays the caller's.
Stream StreamOn(int descriptor, const std::filesystem::path& target);
/// Writes out what is buffered. Throws Failure.
void Flush(const Stream& stream, const std::filesystem::path& target);

}
