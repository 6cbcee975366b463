#pragma once
#include <cstdint>
#include <span>

#include "pictures.h"

namespace picturezor::flow {

/// Bytes that are written once, in any order and by several threads, and read later: in memory where they fit
/// in what the options allow, otherwise in a file without a name.
class Spool {
 public:
  /// For the pixels of a picture. Throws files::Failure where there is no room for them.
  Spool(const files::PictureSize& size, const files::StoreOptions& options);
  Spool(const Spool&) = delete;
  ~Spool();
  void Write(std::int64_t at, std::span<const std::uint8_t> bytes);
  /// `count` runs of `bytes` each that stand one behind the other, to places `stride` bytes apart.
  void Read(std::int64_t at, std::size_t bytes, std::int64_t count, std::uint8_t* into,
            std::ptrdiff_t stride) const;
  /// Bytes first to end - 1 are not going to be read any more; whole blocks of the file system are freed.
  void GiveBack(std::int64_t first, std::int64_t end);

 private:
  [[noreturn]] void Fail() const;

  files::StoreOptions Options;
  int File;
};

}
