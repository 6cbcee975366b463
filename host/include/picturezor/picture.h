#pragma once
#include <functional>
#include <optional>

#include "picturezor/host.h"
#include "picturezor/host_picture.h"
#include "picturezor/object.h"

namespace picturezor {

/// The 39 pixel formats and the other names of some of them. One byte a sample, always.
enum class Format : std::int32_t {
  Unknown = 0,
  RGB = 1,
  RGBA,
  RGBX,
  ARGB,
  XRGB,
  BGR,
  BGRA,
  BGRX,
  ABGR,
  XBGR,
  G = 11,
  GA,
  AG,
  // One plane of pixels of 3 or 4 bytes.
  OneOf3 = 15,
  TwoOf3,
  ThreeOf3,
  OneOf4,
  TwoOf4,
  ThreeOf4,
  FourOf4,
  RofRGB = 15,
  GofRGB,
  BofRGB,
  RofRGBA = 18,
  GofRGBA,
  BofRGBA,
  AofRGBA,
  AofARGB = 18,
  RofARGB,
  GofARGB,
  BofARGB,
  BofBGR = 15,
  GofBGR,
  RofBGR,
  BofBGRA = 18,
  GofBGRA,
  RofBGRA,
  AofBGRA,
  AofABGR = 18,
  BofABGR,
  GofABGR,
  RofABGR,
  Buffer = 22,
  CMYK = 23,
  CMYKA,
  ACMYK,
  CMYKX,
  XCMYK,
  KYMC,
  KYMCA,
  AKYMC,
  KYMCX,
  XKYMC,
  // Raw pixels of 1 to 8 bytes.
  Scaling1 = 33,
  Scaling2,
  Scaling3,
  Scaling4,
  Scaling5,
  Scaling6,
  Scaling7,
  Scaling8,
};

/// Bytes of a pixel, 1 to 8; 0 for a code that isn't a format.
int BytesPerPixel(Format format);

enum class Kernel : std::int32_t { Triangle = 1, Box, Lanczos3, Lanczos8, Mitchell, Poly3, Cubic };

enum class DitherMatrix : std::int32_t {
  Magic2x2 = 1,
  Magic4x4,
  Ordered4x4,
  Lines4x4,
  Halftone90_6x6,
  Ordered6x6,
  Ordered8x8,
  Cluster3,
  Cluster4,
  Cluster8,
};

/// A rectangle of pixels. A negative width or height means to the left or upwards; what lies outside a
/// picture is left out.
struct Rect {
  std::int32_t X = 0, Y = 0, Width = 0, Height = 0;
};

class PictureFactory;
struct CombineOptions;

/// An image: a reference to an object of the class PictureZOR.
///
/// Copies refer to the same image; `Clone` copies the samples. An empty Picture is nil: what a method gives
/// where it fails, and what can be given for an optional `dest`. Calling a method on it throws ModuleError.
/// Constructors don't throw for sizes or formats that can't be had: look at `Valid`. What the module raises
/// comes as HostException. Where a method trusts its caller with the length of some bytes, it is checked here
/// first, and std::invalid_argument is thrown.
class Picture : public Object {
 public:
  Picture() = default;
  explicit Picture(Object object) : Object(std::move(object)) {}
  /// Zeroed samples in memory, below 2 GiB.
  Picture(std::int32_t width, std::int32_t height, Format format);
  /// Over somebody's memory, `rowSize` bytes from row to row. Throws std::invalid_argument where the block is
  /// too small for it.
  Picture(const MemoryBlock& block, std::int32_t width, std::int32_t height, Format format,
          std::int32_t rowSize);
  /// Zeroed samples in a block of the host's: in memory too, but below 4 GiB where addresses have 64 bits.
  /// Memory is taken as rows are touched. Not `Valid` where there plainly isn't as much. `Clone` gives nil
  /// from 2 GiB on.
  static Picture InBlock(std::int32_t width, std::int32_t height, Format format);
  /// Over the pixels of a host picture; see Constructor in the module. Alpha only `useAlpha`.
  explicit Picture(const HostPicture& picture, bool useAlpha = false);
  /// In a temporary file, which is created or overwritten and goes away with the last picture using it. About
  /// `blockSize` bytes of it, at least 16 MiB and five rows, are in the address space at a time. Needs 5
  /// rows.
  static Picture Mapped(const std::filesystem::path& file, std::int32_t width, std::int32_t height,
                        Format format, std::int32_t blockSize = 0);

  /// A new picture through the global factory, or in memory.
  static Picture Create(std::int32_t width, std::int32_t height, Format format);
  /// A new picture through this picture's factory.
  Picture CreatePicture(std::int32_t width, std::int32_t height, Format format) const;
  /// Bytes that a picture in memory takes; 0 for a size or format that is refused.
  static std::int64_t CalculateMemory(std::int32_t width, std::int32_t height, Format format);
  static bool CanAllocate(std::int32_t width, std::int32_t height, Format format);

  /// Ends the picture now. Views on it go on working.
  void Close() const;
  /// A copy in memory; nil for a mapped picture.
  Picture Clone() const;

  // Properties.
  bool Valid() const;
  std::int32_t Width() const;
  std::int32_t Height() const;
  Format ImageFormat() const;
  /// Empty for a format without a name.
  std::string ImageFormatString() const;
  /// Bytes of a pixel, and from row to row.
  std::int32_t PixelSize() const;
  std::int32_t RowSize() const;
  std::int32_t RowOffset() const;
  std::int64_t TotalSize() const;
  std::int32_t ChannelCount() const;
  bool IsGray() const;
  bool IsRGB() const;
  bool IsCMYK() const;
  bool IsMapping() const;
  /// Whether the pixels have a plane, and where it stands: bytes from the start of a row to its first sample.
  bool HasRed() const;
  bool HasGreen() const;
  bool HasBlue() const;
  bool HasGray() const;
  bool HasAlpha() const;
  bool HasCyan() const;
  bool HasMagenta() const;
  bool HasYellow() const;
  bool HasBlack() const;
  std::int32_t RedOffset() const;
  std::int32_t GreenOffset() const;
  std::int32_t BlueOffset() const;
  std::int32_t GrayOffset() const;
  std::int32_t AlphaOffset() const;
  std::int32_t CyanOffset() const;
  std::int32_t MagentaOffset() const;
  std::int32_t YellowOffset() const;
  std::int32_t BlackOffset() const;
  /// A property by its name. Throws ModuleError where the class has none of that name and type.
  std::int32_t IntegerProperty(std::string_view name) const;
  bool BooleanProperty(std::string_view name) const;
  /// The bytes of a window of a mapped picture, as rounded by the module.
  std::int32_t MappingBlockSize() const;
  void SetMappingBlockSize(std::int32_t bytes) const;
  /// Least sixtieths of a second between two yields to the host; 0 is never.
  std::int32_t YieldTicks() const;
  void SetYieldTicks(std::int32_t ticks) const;
  /// This picture's own factory, asked before the global one.
  PictureFactory Factory() const;
  void SetFactory(const PictureFactory& factory) const;
  /// The picture that this view was made from; nil for one that isn't a view.
  Picture Parent() const;
  /// The caller's block that holds the samples, or nil.
  MemoryBlock MemoryTarget() const;
  /// The host picture that holds the samples, or nil.
  HostPicture Target() const;
  /// Whether the module may show this picture to a debugger, and the corner that it shows.
  bool DebugPictureEnabled() const;
  void SetDebugPictureEnabled(bool enabled) const;
  HostPicture DebugPicture() const;
  /// The start of the store, or of the window of a mapped one; nil without either. It has no size of its own.
  MemoryBlock Memory() const;

  // Rows and whole pictures as bytes. An index outside the picture throws HostException.
  /// The stored row itself, `RowSize` bytes of it. On a mapped picture good until another row is asked for.
  MemoryBlock RawRow(std::int32_t index) const;
  /// A copy of the stored row, filler and padding included.
  Bytes Row(std::int32_t index) const;
  void SetRow(std::int32_t index, std::span<const std::uint8_t> bytes) const;
  /// A row as packed pixels of a format. Empty where there is no way to that format; between RGB and CMYK
  /// HostException.
  Bytes RowInFormat(std::int32_t index, Format format) const;
  Bytes RowInFormat(std::int32_t index, Format format, bool invertAlpha) const;
  void SetRowInFormat(std::int32_t index, Format format, std::span<const std::uint8_t> bytes) const;
  void SetRowInFormat(std::int32_t index, Format format, bool invertAlpha,
                      std::span<const std::uint8_t> bytes) const;
  Bytes RowStringInFormat(std::int32_t index, Format format) const;
  void SetRowStringInFormat(std::int32_t index, Format format, std::span<const std::uint8_t> bytes) const;
  /// All rows, one after the other, below 2 GiB.
  Bytes DataStringInFormat(Format format) const;
  void SetDataStringInFormat(Format format, std::span<const std::uint8_t> bytes) const;

  // Views: they show and write this picture's samples.
  Picture AlphaChannel() const;
  Picture RedChannel() const;
  Picture GreenChannel() const;
  Picture BlueChannel() const;
  Picture GrayChannel() const;
  Picture CyanChannel() const;
  Picture MagentaChannel() const;
  Picture YellowChannel() const;
  Picture BlackChannel() const;
  /// By its place in the pixel; outside of them HostException.
  Picture Channel(std::int32_t index) const;
  Picture RGBChannels() const;
  Picture CMYKChannels() const;
  Picture ClipImage() const;
  Picture ClipImage(const Rect& rect) const;
  Picture MirroredView() const;

  // Into new host pictures; nil where it fails. Alpha becomes a gray picture, white where it is 255.
  HostPicture CopyPicture() const;
  HostPicture CopyPicture(const Rect& rect) const;
  HostPicture CopyMask() const;
  HostPicture CopyMask(const Rect& rect) const;
  HostPicture CopyPictureWithMask() const;
  HostPicture CopyPictureWithMask(const Rect& rect) const;
  GWorld CopyGWorld() const;

  // From host pictures, without scaling: all of one, or a block of it, to a place in this picture. Nothing
  // changes where it fails.
  void DrawPictureRedToGrayChannel(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureRedToGrayChannel(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                   std::int32_t sourceY) const;
  void DrawPictureGreenToGrayChannel(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureGreenToGrayChannel(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                     std::int32_t sourceY) const;
  void DrawPictureBlueToGrayChannel(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureBlueToGrayChannel(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                    std::int32_t sourceY) const;
  void DrawPictureRGB(const HostPicture& picture) const;
  void DrawPictureRGB(const HostPicture& picture, std::int32_t x, std::int32_t y) const;
  void DrawPictureRGB(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureRGB(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                      std::int32_t sourceY) const;
  /// The mask becomes alpha.
  void DrawMaskedPictureRGB(const HostPicture& picture, bool invertMask = false) const;
  void DrawMaskedPictureRGB(const HostPicture& picture, std::int32_t x, std::int32_t y,
                            bool invertMask = false) const;
  void DrawMaskedPictureRGB(const HostPicture& picture, const Rect& dest, bool invertMask = false) const;
  void DrawMaskedPictureRGB(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                            std::int32_t sourceY, bool invertMask = false) const;
  /// The mask says how much of this picture stays: all where it is white, or none with `invertMask`.
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, bool invertMask = false) const;
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, std::int32_t x, std::int32_t y,
                                     bool invertMask = false) const;
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, const Rect& dest,
                                     bool invertMask = false) const;
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                     std::int32_t sourceY, bool invertMask = false) const;

  // Scaling: `source`, resampled, into the top left width x height pixels of this picture. False where the
  // formats have no way to each other, or the size doesn't fit.
  bool Scale(const Picture& source, const Picture& temp, Kernel kernel, std::int32_t width,
             std::int32_t height) const;
  /// The same on a number of threads, 0 for one a processor.
  bool ScaleMT(std::int32_t threads, const Picture& source, const Picture& temp, Kernel kernel,
               std::int32_t width, std::int32_t height) const;
  /// By nearest neighbour.
  bool ScaleFast(const Picture& source, std::int32_t width, std::int32_t height) const;

  // Geometry. A nil `dest` makes a new picture; nil comes back where it fails.
  void HMirror() const;
  void VMirror() const;
  void Rotate180() const;
  Picture Rotate180(const Picture& dest) const;
  Picture Rotate90(const Picture& dest = {}) const;
  Picture Rotate270(const Picture& dest = {}) const;
  Picture Rotate90slow(const Picture& dest = {}) const;
  Picture Rotate270slow(const Picture& dest = {}) const;
  /// The samples that fill the corners of a turned picture.
  struct Background {
    std::int32_t Red = 0, Green = 0, Blue = 0, Alpha = 0, Gray = 0, Cyan = 0, Magenta = 0, Yellow = 0,
                 Black = 0;
  };
  /// By degrees.
  Picture Rotate(double angle) const;
  Picture Rotate(double angle, const Background& background) const;

  // Filters. A nil `dest` makes a new picture; nil comes back where it fails.
  void Invert() const;
  void Invert(const Rect& rect) const;
  bool AutoLevel() const;
  bool AutoLevel(const Rect& rect) const;
  Picture SolarizeFilter(const Picture& dest = {}) const;
  Picture GammaFilter(const Picture& dest, double gamma) const;
  Picture GammaFilter(const Picture& dest, double gamma, double alphaGamma) const;
  Picture GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma) const;
  Picture GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma,
                      double alphaGamma) const;
  Picture GainFilter(const Picture& dest, double gain, double bias) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& gray) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& gray, const IntegerArray& alpha) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                         const IntegerArray& blue) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                         const IntegerArray& blue, const IntegerArray& alpha) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                      std::int32_t delta) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                      std::int32_t delta, double scaleFactor) const;
  Picture BoxBlurFilter(const Picture& dest, double radius) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, bool vertical, bool horizontal) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations, bool vertical,
                        bool horizontal) const;
  Picture BoxBlurFractionalFilter(const Picture& dest, double radius) const;
  Picture StampFilter(const Picture& dest, double radius, double threshold, double softness, Color black,
                      Color white) const;
  bool UnsharpFilter(const Picture& original, double amount, std::int32_t threshold) const;
  Picture OilFilter(const Picture& dest, std::int32_t levels, std::int32_t range) const;
  Picture DiffuseFilter(const Picture& dest, std::int32_t level) const;
  Picture EngraveFilter(const Picture& dest, std::int32_t level) const;
  Picture NeonFilter(const Picture& dest = {}) const;
  Picture DitherFilter(const Picture& dest, DitherMatrix matrix, std::int32_t levels) const;

  // Composition.
  void FillRect(std::int32_t value) const;
  void FillRect(const Rect& rect, std::int32_t value) const;
  void FillRectRGB(std::int32_t red, std::int32_t green, std::int32_t blue) const;
  void FillRectRGB(std::int32_t red, std::int32_t green, std::int32_t blue, std::int32_t alpha) const;
  void FillRectRGB(const Rect& rect, std::int32_t red, std::int32_t green, std::int32_t blue) const;
  void FillRectRGB(const Rect& rect, std::int32_t red, std::int32_t green, std::int32_t blue,
                   std::int32_t alpha) const;
  void FillRectRGB(Color color) const;
  void FillRectRGB(Color color, std::int32_t alpha) const;
  void FillRectRGB(const Rect& rect, Color color) const;
  void FillRectRGB(const Rect& rect, Color color, std::int32_t alpha) const;
  void FillRectRandom() const;
  void FillRectRandom(const Rect& rect) const;
  void ClearRect() const;
  void ClearRect(const Rect& rect) const;
  /// The sum of the absolute differences of all samples; -1 when the two can't be compared.
  std::int64_t CompareImages(const Picture& other) const;
  bool CopyPixels(const Picture& source) const;
  bool CopyPixels(const Picture& source, const Rect& dest) const;
  bool CopyPixels(const Picture& source, const Rect& dest, std::int32_t sourceX, std::int32_t sourceY) const;

  /// Lays a block of `image` over this picture, at dest's origin and size.
  bool Combine(const Picture& image, const Rect& dest, std::int32_t sourceX, std::int32_t sourceY,
               const CombineOptions& options) const;
};

/// What decides how much of the destination stays where an image is laid over it: 255 keeps it, 0 takes the
/// image.
struct CombineOptions {
  /// The image's samples have been scaled by their coverage already, so they are added.
  bool PreMultipliedSource = false;
  /// As large as the image; decides alone where it is given.
  Picture Mask{};
  /// Whether `MaskColour` counts; otherwise it stands for 0.
  bool UseColours = false;
  /// A flat colour that the image is the mask for, where there is no `MaskColour`.
  std::optional<Color> ForeColour{};
  /// One mask value a channel.
  std::optional<Color> MaskColour{};
};

/// Makes the pictures that operations need, in the program's own way.
class PictureFactory : public Object {
 public:
  /// Gives a picture of at least the size asked for; an empty one lets the next way be tried.
  using Handler = std::function<Picture(std::int32_t width, std::int32_t height, Format format)>;

  PictureFactory() = default;
  explicit PictureFactory(Object object) : Object(std::move(object)) {}
  /// A factory without a handler is as good as none.
  explicit PictureFactory(Handler handler);

  /// The factory that all new pictures of the process are asked from; an empty one for none.
  static void SetFactory(const PictureFactory& factory);
};

}
