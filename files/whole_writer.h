#pragma once
#include "image_file.h"

namespace picturezor::files {

/// A writer of a type whose library takes a picture as a whole: it is encoded behind the last row.
class WholeWriter : public ImageWriter {
 public:
  void WriteRow(const std::uint8_t* row) override;
  void Finish() override;

 protected:
  WholeWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info,
              const WriteOptions& options);
  /// Packed pixels from the top down; the whole file goes to `Put`, in parts.
  virtual void Encode(std::uint8_t* pixels) = 0;
  void Put(std::span<const std::uint8_t> bytes);
  /// For types that have one way of packing only.
  void RequireUsualPacking() const;
  [[noreturn]] void Fail(const std::string& reason) const;

  std::filesystem::path Path;
  const ImageInfo About;
  const WriteOptions Options;

 private:
  int File;
  Bytes Pixels;
};

}
