#pragma once
#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <numeric>
#include <random>
#include <string>
#include <vector>

#include "picturezor/picture.h"

namespace zor {
struct PictureData;
}

namespace picturezor {

using Samples = Bytes;

inline void PrintTo(Format format, std::ostream* out) { *out << "Format " << int(format); }
inline void PrintTo(const Rect& rect, std::ostream* out) {
  *out << rect.Width << " x " << rect.Height << " at " << rect.X << ", " << rect.Y;
}

/// All codes that have a layout.
inline std::vector<Format> EveryFormat() {
  std::vector<Format> formats;
  for (int code = 1; code <= 40; ++code)
    if (BytesPerPixel(Format(code)) > 0) formats.push_back(Format(code));
  return formats;
}

/// In the order of a group, alpha last.
enum class Plane { Gray, Red, Green, Blue, Cyan, Magenta, Yellow, Black, Alpha };

/// The planes of a picture, and where they stand in its rows.
struct PlacedPlane {
  Plane Of;
  int Offset;
};
std::vector<PlacedPlane> PlanesOf(const Picture& picture);

/// The bytes of a pixel as letters: R G B, C M Y K, g for gray, A for alpha, - for none.
std::string LettersOf(const Picture& picture);
const std::string& LettersOf(Format format);

/// A stream of numbers from a seed that a failing test prints.
class Noise {
 public:
  explicit Noise(unsigned seed) : Engine(seed) {}
  std::uint8_t Byte() { return std::uint8_t(Engine()); }
  /// From first to last, both included.
  int Between(int first, int last) { return first + int(Engine() % unsigned(last - first + 1)); }
  Samples Many(std::size_t count) {
    Samples samples(count);
    for (auto& sample : samples) sample = Byte();
    return samples;
  }

 private:
  std::mt19937 Engine;
};

/// Every value of a sample, 0 to 255.
inline Samples Ramp() {
  Samples ramp(256);
  std::iota(ramp.begin(), ramp.end(), std::uint8_t(0));
  return ramp;
}

/// A file name that nobody has, in the folder for temporary files; the file is removed at the end.
class TemporaryFile {
 public:
  TemporaryFile();
  ~TemporaryFile();
  TemporaryFile(const TemporaryFile&) = delete;
  const std::filesystem::path& Path() const { return At; }

 private:
  std::filesystem::path At;
};

/// The class and the message of the exception that a call raises; empty for none.
std::string RaisedBy(const std::function<void()>& call);

/// The instance data of a picture, for what can't be seen from outside.
zor::PictureData& DataOf(const Picture& picture);

/// Gives a mapped picture a window of five rows, the fewest that the module promises itself. Asked for, a
/// window has at least 16 MiB, so that none would ever move under a picture as small as a test's.
void MakeWindowSmall(const Picture& picture);

/// The stored rows of a picture, filler and padding included.
std::vector<Samples> StoredRows(const Picture& picture);
void SetStoredRows(const Picture& picture, const std::vector<Samples>& rows);

/// Fills every byte of a picture's rows, filler and padding included.
void FillWithNoise(const Picture& picture, unsigned seed);
Picture NoisePicture(int width, int height, Format format, unsigned seed);

/// The packed pixels of the whole picture as they are stored, filler included.
Samples Packed(const Picture& picture);
void SetPacked(const Picture& picture, const Samples& pixels);

/// A picture in one of the stores, its surroundings filled with noise.
class StoredPicture {
 public:
  enum Kind { Memory, Block, Mapped, Clip, Mirrored, MappedClip };
  static constexpr Kind Kinds[] = {Memory, Block, Mapped, Clip, Mirrored, MappedClip};
  static const char* NameOf(Kind kind);
  /// A file's window needs five rows.
  static bool Fits(Kind kind, int height) { return kind != Mapped || height >= 5; }

  StoredPicture(Kind kind, int width, int height, Format format);
  const Picture& Get() const { return Shown; }
  /// Whether the bytes that don't belong to the picture are as they were.
  bool SurroundingsIntact() const;

 private:
  /// Rows of the whole with the picture's own bytes set to zero.
  std::vector<Samples> Surroundings() const;

  TemporaryFile File;
  Picture Whole, Shown;
  int Left = 0, Top = 0;
  std::vector<Samples> Before;
};

/// Runs body once for each store that a picture can live in: own memory, the caller's block with a wide
/// stride, a mapped file with a window of five rows, a clip of a larger picture, a mirrored view, a clip of a
/// mapped file with such a window. The bytes around the picture must be as they were afterwards.
template <class Body>
void ForEveryStore(int width, int height, Format format, Body&& body) {
  for (const StoredPicture::Kind kind : StoredPicture::Kinds) {
    if (!StoredPicture::Fits(kind, height)) continue;
    SCOPED_TRACE(StoredPicture::NameOf(kind));
    const StoredPicture picture(kind, width, height, format);
    body(picture.Get());
    EXPECT_TRUE(picture.SurroundingsIntact());
  }
}

}
