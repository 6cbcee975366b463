#pragma once
#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <vector>

#include "image_file.h"
#include "pictures.h"

namespace picturezor::tiles {

using Opener = std::function<std::unique_ptr<files::ImageReader>()>;

/// The samples of an upright picture at one size, as far as they are there. Several threads may read.
class Plane {
 public:
  virtual ~Plane() = default;
  files::Extent Size() const { return Of; }
  /// Rows from the top that can be read by now.
  virtual std::int32_t Rows() const = 0;
  /// The pixels of a part that is there, as packed rows.
  virtual void Read(const Rect& part, std::uint8_t* into) = 0;

 protected:
  explicit Plane(files::Extent size) : Of(size) {}
  files::Extent Of;
};

/// A file that gives any part of a picture for little, or a smaller copy in it that does.
class FilePlane final : public Plane {
 public:
  /// Nothing where the file isn't such a one. `size` is that of the picture or one of its smaller copies.
  static std::unique_ptr<FilePlane> Of(const Opener& opener, files::Extent size);
  std::int32_t Rows() const override { return Size().Height; }
  void Read(const Rect& part, std::uint8_t* into) override;

 private:
  FilePlane(const Opener& opener, files::Extent size) : Plane(size), Open(opener) {}
  std::unique_ptr<files::ImageReader> TakeReader();

  Opener Open;
  std::mutex Access;
  std::vector<std::unique_ptr<files::ImageReader>> Free;
};

/// Samples in a mapped temporary file without a name. One thread puts rows, from the top down.
class MappedPlane final : public Plane {
 public:
  /// Throws files::Failure where there is no room for it.
  MappedPlane(files::Extent size, int channels, const std::filesystem::path& directory);
  ~MappedPlane() override;
  MappedPlane(const MappedPlane&) = delete;
  std::int32_t Rows() const override { return Done; }
  void Read(const Rect& part, std::uint8_t* into) override;
  std::uint8_t* Row(std::int32_t y) { return Start + std::size_t(y) * RowBytes; }
  std::size_t BytesOfRow() const { return RowBytes; }
  /// So many more rows are there.
  void Add(std::int32_t rows) { Done += rows; }

 private:
  int Channels;
  std::size_t RowBytes, Bytes;
  std::uint8_t* Start = nullptr;
  std::atomic<std::int32_t> Done = 0;
};

/// A small version that is made in a moment where that can be, at most `edge` pixels long: by a reader that
/// gives the picture smaller, or of some rows out of many. Null where neither is there, or it is cancelled.
std::unique_ptr<MappedPlane> RoughPlane(const Opener& opener, std::int32_t edge,
                                        const std::filesystem::path& directory,
                                        const std::atomic<bool>& stop);

}
