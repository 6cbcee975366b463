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

/// What pixels are weighed by when an image is scaled, with the reach on either side in pixels of the coarser
/// of the two: Triangle 1 (bilinear), Box 0.5 (the mean of an area), Lanczos3 3, Lanczos8 8, Mitchell, Poly3
/// and Cubic 2.
enum class Kernel : std::int32_t { Triangle = 1, Box, Lanczos3, Lanczos8, Mitchell, Poly3, Cubic };

/// The threshold matrices of `DitherFilter`, named after their kind and size.
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
  ///@{
  /// In pixels, from the top left.
  std::int32_t X = 0, Y = 0, Width = 0, Height = 0;
  ///@}
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
  /// Nil.
  Picture() = default;
  /// The picture that an object of the class is; nothing is checked.
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
  /// Over the pixels of a host picture: what is written to one shows in the other. Only of one in a GWorld of
  /// 24 or 32 bits; of others it isn't `Valid`. In 32 bits `useAlpha` says whether the byte before the
  /// colours is alpha.
  explicit Picture(const HostPicture& picture, bool useAlpha = false);
  /// In a temporary file, which is created or overwritten and goes away with the last picture using it. About
  /// `blockSize` bytes of it, at least 16 MiB and five rows, are in the address space at a time. Needs 5
  /// rows.
  static Picture Mapped(const std::filesystem::path& file, std::int32_t width, std::int32_t height,
                        Format format, std::int32_t blockSize = 0);

  /// A new picture through the global factory, or in memory; nil for a size or format that can't be had.
  static Picture Create(std::int32_t width, std::int32_t height, Format format);
  /// A new picture through this picture's factory, the global one, or in memory; nil for a size or format
  /// that can't be had.
  Picture CreatePicture(std::int32_t width, std::int32_t height, Format format) const;
  /// Bytes that a picture in memory takes; 0 for a size or format that is refused.
  static std::int64_t CalculateMemory(std::int32_t width, std::int32_t height, Format format);
  /// Whether these bytes and a MiB more can be had now; false from 4 GiB on.
  static bool CanAllocate(std::int32_t width, std::int32_t height, Format format);

  /// Ends the picture now. Views on it go on working.
  void Close() const;
  /// A copy in memory; nil for a mapped picture, one that isn't `Valid`, or without memory.
  Picture Clone() const;

  // Properties.

  /// Whether the picture could be made and hasn't been closed.
  bool Valid() const;
  /// Columns.
  std::int32_t Width() const;
  /// Rows.
  std::int32_t Height() const;
  /// The pixel format.
  Format ImageFormat() const;
  /// The format's name, such as "RGBA"; empty for one without a name.
  std::string ImageFormatString() const;
  /// Bytes of a pixel, 1 to 8.
  std::int32_t PixelSize() const;
  /// Bytes from the start of a row to that of the next one: the stride.
  std::int32_t RowSize() const;
  /// The row of the store that is the first of this picture; not 0 on clip views only.
  std::int32_t RowOffset() const;
  /// `RowSize` times the rows of the store, which a view has from its parent.
  std::int64_t TotalSize() const;
  /// Channels of a pixel, fillers not counted.
  std::int32_t ChannelCount() const;
  ///@{
  /// Which colours the pixels have: gray, red, green and blue, or inks. At most one of them is true.
  bool IsGray() const;
  bool IsRGB() const;
  bool IsCMYK() const;
  ///@}
  /// Whether the samples are in a mapped file.
  bool IsMapping() const;
  ///@{
  /// Whether the pixels have the channel.
  bool HasRed() const;
  bool HasGreen() const;
  bool HasBlue() const;
  bool HasGray() const;
  bool HasAlpha() const;
  bool HasCyan() const;
  bool HasMagenta() const;
  bool HasYellow() const;
  bool HasBlack() const;
  ///@}
  ///@{
  /// Where a channel stands: bytes from the start of a row to its first sample.
  std::int32_t RedOffset() const;
  std::int32_t GreenOffset() const;
  std::int32_t BlueOffset() const;
  std::int32_t GrayOffset() const;
  std::int32_t AlphaOffset() const;
  std::int32_t CyanOffset() const;
  std::int32_t MagentaOffset() const;
  std::int32_t YellowOffset() const;
  std::int32_t BlackOffset() const;
  ///@}
  ///@{
  /// A property by its name. Throws ModuleError where the class has none of that name and type.
  std::int32_t IntegerProperty(std::string_view name) const;
  bool BooleanProperty(std::string_view name) const;
  ///@}
  ///@{
  /// The bytes of a window of a mapped picture, as rounded by the module.
  std::int32_t MappingBlockSize() const;
  void SetMappingBlockSize(std::int32_t bytes) const;
  ///@}
  ///@{
  /// Least sixtieths of a second between two yields to the host; 0 is never.
  std::int32_t YieldTicks() const;
  void SetYieldTicks(std::int32_t ticks) const;
  ///@}
  ///@{
  /// This picture's own factory, asked before the global one; nil for none.
  PictureFactory Factory() const;
  void SetFactory(const PictureFactory& factory) const;
  ///@}
  /// The picture that this view was made from; nil for one that isn't a view.
  Picture Parent() const;
  /// The caller's block that holds the samples, or nil.
  MemoryBlock MemoryTarget() const;
  /// The host picture that holds the samples, or nil.
  HostPicture Target() const;
  ///@{
  /// Whether the module may show this picture to a debugger; false at first.
  bool DebugPictureEnabled() const;
  void SetDebugPictureEnabled(bool enabled) const;
  ///@}
  /// What a debugger is shown: the top left 512 x 512 pixels with their mask; nil unless enabled.
  HostPicture DebugPicture() const;
  /// The start of the store, or of the window of a mapped one; nil without either. It has no size of its own.
  MemoryBlock Memory() const;

  // Rows and whole pictures as bytes. Rows count from 0 at the top; an index outside the picture throws
  // HostException. Bytes that are too few throw std::invalid_argument.

  /// The stored row itself, `RowSize` bytes of it. On a mapped picture good until another row is asked for.
  MemoryBlock RawRow(std::int32_t index) const;
  ///@{
  /// The `RowSize` bytes of the stored row, filler and padding included.
  Bytes Row(std::int32_t index) const;
  void SetRow(std::int32_t index, std::span<const std::uint8_t> bytes) const;
  ///@}
  ///@{
  /// A row as packed pixels of a format, `Width` times its `BytesPerPixel` bytes. Red, green and blue become
  /// gray by (77 r + 151 g + 28 b) / 256, gray becomes all three or all four inks, black becomes gray. Empty,
  /// or nothing set, where there is no way to that format; between RGB and CMYK HostException. With
  /// `invertAlpha` alpha becomes 255 less alpha.
  Bytes RowInFormat(std::int32_t index, Format format) const;
  Bytes RowInFormat(std::int32_t index, Format format, bool invertAlpha) const;
  void SetRowInFormat(std::int32_t index, Format format, std::span<const std::uint8_t> bytes) const;
  void SetRowInFormat(std::int32_t index, Format format, bool invertAlpha,
                      std::span<const std::uint8_t> bytes) const;
  ///@}
  ///@{
  /// The same through a string of the host.
  Bytes RowStringInFormat(std::int32_t index, Format format) const;
  void SetRowStringInFormat(std::int32_t index, Format format, std::span<const std::uint8_t> bytes) const;
  ///@}
  ///@{
  /// All rows as packed pixels of a format, one after the other, below 2 GiB; as `RowInFormat` otherwise.
  Bytes DataStringInFormat(Format format) const;
  void SetDataStringInFormat(Format format, std::span<const std::uint8_t> bytes) const;
  ///@}

  // Views: they show and write this picture's samples, and keep them alive.

  ///@{
  /// One channel as a gray picture; nil where the pixels don't have it.
  Picture AlphaChannel() const;
  Picture RedChannel() const;
  Picture GreenChannel() const;
  Picture BlueChannel() const;
  Picture GrayChannel() const;
  Picture CyanChannel() const;
  Picture MagentaChannel() const;
  Picture YellowChannel() const;
  Picture BlackChannel() const;
  ///@}
  /// By its place in the pixel, from 0, fillers not counted; outside of them HostException.
  Picture Channel(std::int32_t index) const;
  ///@{
  /// The colours without alpha; nil for other colours.
  Picture RGBChannels() const;
  Picture CMYKChannels() const;
  ///@}
  ///@{
  /// The part that lies in the rectangle, or all of the picture. Outside of it the view has no columns or
  /// rows, and nothing can be done with it.
  Picture ClipImage() const;
  Picture ClipImage(const Rect& rect) const;
  ///@}
  /// The picture with its rows in reverse order.
  Picture MirroredView() const;

  // Into new host pictures, of the whole picture or a part of it; nil where it fails.

  ///@{
  /// The colours.
  HostPicture CopyPicture() const;
  HostPicture CopyPicture(const Rect& rect) const;
  ///@}
  ///@{
  /// Alpha as a gray picture, white where it is 255; nil without alpha.
  HostPicture CopyMask() const;
  HostPicture CopyMask(const Rect& rect) const;
  ///@}
  ///@{
  /// The colours, and alpha drawn into the picture's mask; without alpha there is no mask.
  HostPicture CopyPictureWithMask() const;
  HostPicture CopyPictureWithMask(const Rect& rect) const;
  ///@}
  /// Gray, RGB, or RGB with alpha in a GWorld of its own; nil for other colours.
  GWorld CopyGWorld() const;

  // From host pictures, without scaling: all of one, or a block of it from `sourceX`, `sourceY` on, to the
  // place and with the size of `dest`, cut off at both pictures' edges. Nothing changes where it fails.

  ///@{
  /// One colour of `picture` into the gray channel.
  void DrawPictureRedToGrayChannel(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureRedToGrayChannel(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                   std::int32_t sourceY) const;
  void DrawPictureGreenToGrayChannel(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureGreenToGrayChannel(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                     std::int32_t sourceY) const;
  void DrawPictureBlueToGrayChannel(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureBlueToGrayChannel(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                    std::int32_t sourceY) const;
  ///@}
  ///@{
  /// The colours of `picture`; its mask plays no part, and alpha stays as it is.
  void DrawPictureRGB(const HostPicture& picture) const;
  void DrawPictureRGB(const HostPicture& picture, std::int32_t x, std::int32_t y) const;
  void DrawPictureRGB(const HostPicture& picture, const Rect& dest) const;
  void DrawPictureRGB(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                      std::int32_t sourceY) const;
  ///@}
  ///@{
  /// The colours of `picture`, and red of its mask as alpha, 255 less it with `invertMask`. A picture without
  /// a mask counts as white.
  void DrawMaskedPictureRGB(const HostPicture& picture, bool invertMask = false) const;
  void DrawMaskedPictureRGB(const HostPicture& picture, std::int32_t x, std::int32_t y,
                            bool invertMask = false) const;
  void DrawMaskedPictureRGB(const HostPicture& picture, const Rect& dest, bool invertMask = false) const;
  void DrawMaskedPictureRGB(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                            std::int32_t sourceY, bool invertMask = false) const;
  ///@}
  ///@{
  /// `picture` laid over this one. The mask says, colour by colour, how much of this picture stays: all where
  /// it is white, or none with `invertMask`. Alpha stays.
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, bool invertMask = false) const;
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, std::int32_t x, std::int32_t y,
                                     bool invertMask = false) const;
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, const Rect& dest,
                                     bool invertMask = false) const;
  void DrawMaskedPictureApplyMaskRGB(const HostPicture& picture, const Rect& dest, std::int32_t sourceX,
                                     std::int32_t sourceY, bool invertMask = false) const;
  ///@}

  // Scaling.

  ///@{
  /// Resamples `source` into the top left `width` x `height` pixels of this picture, along the rows and then
  /// along the columns. Colours are converted as by `RowInFormat`; alpha takes part where both pictures have
  /// it. `temp` is nil, or a picture that keeps what stands between the passes: of the pixel size that the
  /// pair asks for, at least `width` wide and as high as `source`. False where the formats have no way to
  /// each other, the size is below 1 or passes this picture, or memory fails. `ScaleMT` works on a number of
  /// threads: 0 for one a processor, 32 at most, with the same result.
  bool Scale(const Picture& source, const Picture& temp, Kernel kernel, std::int32_t width,
             std::int32_t height) const;
  bool ScaleMT(std::int32_t threads, const Picture& source, const Picture& temp, Kernel kernel,
               std::int32_t width, std::int32_t height) const;
  ///@}
  /// The nearest pixel of `source` for each, at the truncated place. The size is cut to this picture's. False
  /// when nothing is left of it, and where the formats have no way to each other.
  bool ScaleFast(const Picture& source, std::int32_t width, std::int32_t height) const;

  // Geometry. A nil `dest` makes a new picture; a given one is large enough for the result and has this
  // picture's channels. The result is the destination, or nil where it fails.

  /// Swaps left and right, in place.
  void HMirror() const;
  /// Swaps top and bottom, in place.
  void VMirror() const;
  ///@{
  /// Half a turn, in place or into `dest`.
  void Rotate180() const;
  Picture Rotate180(const Picture& dest) const;
  ///@}
  ///@{
  /// A quarter turn counter-clockwise; `dest` is as wide as this picture is high. The slow form gives the
  /// same pixels without tiles.
  Picture Rotate90(const Picture& dest = {}) const;
  Picture Rotate90slow(const Picture& dest = {}) const;
  ///@}
  ///@{
  /// A quarter turn clockwise.
  Picture Rotate270(const Picture& dest = {}) const;
  Picture Rotate270slow(const Picture& dest = {}) const;
  ///@}
  /// The samples that fill the corners of a turned picture; the low 8 bits of each count.
  struct Background {
    ///@{
    /// By the channel.
    std::int32_t Red = 0, Green = 0, Blue = 0, Alpha = 0, Gray = 0, Cyan = 0, Magenta = 0, Yellow = 0,
                 Black = 0;
    ///@}
  };
  ///@{
  /// By degrees counter-clockwise, into a new picture that holds all of it. Right angles are exact, and 0
  /// gives the picture itself; others are three shears. Nil for an angle that isn't finite.
  Picture Rotate(double angle) const;
  Picture Rotate(double angle, const Background& background) const;
  ///@}

  // Filters. A nil `dest` makes a new picture, and the picture itself may be the `dest` but where it is said;
  // the result is the destination, or nil where it fails. Colours that a filter doesn't serve are left as
  // they are.

  ///@{
  /// 255 less each sample, alpha included, in place.
  void Invert() const;
  void Invert(const Rect& rect) const;
  ///@}
  ///@{
  /// Stretches the levels of red, green and blue alike, in place, so that about half a percent of the pixels
  /// becomes black and as many white. False for other colours, and for an empty rectangle.
  bool AutoLevel() const;
  bool AutoLevel(const Rect& rect) const;
  ///@}
  /// Darkest in the middle and bright at both ends, all channels alike, alpha included.
  Picture SolarizeFilter(const Picture& dest = {}) const;
  ///@{
  /// 255 (v / 255)^(1 / gamma), for gray and RGB; above 1 lightens. Alpha is left out but where it has a
  /// gamma of its own. Of three gammas gray takes a weighted mean of their whole parts.
  Picture GammaFilter(const Picture& dest, double gamma) const;
  Picture GammaFilter(const Picture& dest, double gamma, double alphaGamma) const;
  Picture GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma) const;
  Picture GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma,
                      double alphaGamma) const;
  ///@}
  /// An S-shaped curve, steeper with more `gain`, and one that lightens with more `bias`; 0.5 and 0.5 change
  /// nothing but for rounding. For gray and RGB, alpha included.
  Picture GainFilter(const Picture& dest, double gain, double bias) const;
  ///@{
  /// Each sample v becomes the low 8 bits of element v of the channel's array; what an array doesn't have is
  /// 0. For gray and RGB; gray takes the `green` of three. Alpha is left out but where it has an array.
  Picture TransferFilter(const Picture& dest, const IntegerArray& gray) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& gray, const IntegerArray& alpha) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                         const IntegerArray& blue) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                         const IntegerArray& blue, const IntegerArray& alpha) const;
  ///@}
  ///@{
  /// Convolution with a square of weights, `dimension` on a side (50 at most), row by row, the middle being
  /// the sample itself; beyond the edges the nearest sample counts. The result is (sum + delta) scaleFactor;
  /// without them delta is 0 and the factor 1. A weight of 255 or more leaves its place out. Alpha is treated
  /// like a colour.
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                      std::int32_t delta) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                      std::int32_t delta, double scaleFactor) const;
  ///@}
  ///@{
  /// The mean of the 2 r + 1 rows and then columns around each sample, r being the radius without its
  /// fraction, once or `iterations` times; either direction may be left out. `dest` may not be the picture
  /// itself. With several iterations the result is a new picture, with none the picture itself.
  Picture BoxBlurFilter(const Picture& dest, double radius) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, bool vertical, bool horizontal) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations, bool vertical,
                        bool horizontal) const;
  ///@}
  /// A blur by less than a pixel: the neighbours count by the radius' fraction.
  Picture BoxBlurFractionalFilter(const Picture& dest, double radius) const;
  /// Two colours with a step between them where the picture, blurred by `radius`, passes `threshold`; the
  /// step is `softness` wide, both with 1 for 255. Gives a new picture without alpha; `dest`, which may not
  /// be the picture itself, receives the first blur.
  Picture StampFilter(const Picture& dest, double radius, double threshold, double softness, Color black,
                      Color white) const;
  /// Pushes each sample away from that of `original`, a blurred copy as a rule, by 4 `amount` times their
  /// difference, in place; differences below `threshold` (in sample values) are left alone. False unless both
  /// have one size and format.
  bool UnsharpFilter(const Picture& original, double amount, std::int32_t threshold) const;
  /// The mean of the most frequent among `levels` classes of values (1 to 256) within `range` pixels. Nil for
  /// a `dest` with pixels of another size.
  Picture OilFilter(const Picture& dest, std::int32_t levels, std::int32_t range) const;
  /// Each pixel from a place up to `level` columns and rows away, by the process's `rand`. For gray and RGB.
  Picture DiffuseFilter(const Picture& dest, std::int32_t level) const;
  /// 128 and the difference to the sample `level` columns and rows further on. For gray and RGB.
  Picture EngraveFilter(const Picture& dest, std::int32_t level) const;
  /// Edges: the root of 2 (a^2 + b^2) of the differences to the samples below and to the right.
  Picture NeonFilter(const Picture& dest = {}) const;
  /// Ordered dithering to `levels` evenly spaced values, 2 to 256. For gray and RGB.
  Picture DitherFilter(const Picture& dest, DitherMatrix matrix, std::int32_t levels) const;

  // Composition, in place. Without a rectangle all of the picture.

  ///@{
  /// The low 8 bits of a value into every sample, alpha included; filler bytes stay.
  void FillRect(std::int32_t value) const;
  void FillRect(const Rect& rect, std::int32_t value) const;
  ///@}
  ///@{
  /// Red, green and blue, by the low 8 bits, and alpha where it is given and the picture has it. Pictures of
  /// other colours stay as they are.
  void FillRectRGB(std::int32_t red, std::int32_t green, std::int32_t blue) const;
  void FillRectRGB(std::int32_t red, std::int32_t green, std::int32_t blue, std::int32_t alpha) const;
  void FillRectRGB(const Rect& rect, std::int32_t red, std::int32_t green, std::int32_t blue) const;
  void FillRectRGB(const Rect& rect, std::int32_t red, std::int32_t green, std::int32_t blue,
                   std::int32_t alpha) const;
  void FillRectRGB(Color color) const;
  void FillRectRGB(Color color, std::int32_t alpha) const;
  void FillRectRGB(const Rect& rect, Color color) const;
  void FillRectRGB(const Rect& rect, Color color, std::int32_t alpha) const;
  ///@}
  ///@{
  /// Random samples by the process's `rand`.
  void FillRectRandom() const;
  void FillRectRandom(const Rect& rect) const;
  ///@}
  ///@{
  /// Zeros, filler bytes included.
  void ClearRect() const;
  void ClearRect(const Rect& rect) const;
  ///@}
  /// The sum of the absolute differences of all samples; -1 when the two can't be compared.
  std::int64_t CompareImages(const Picture& other) const;
  ///@{
  /// Copies `source`, or a block of it, to a place in this picture, with colours converted as by
  /// `RowInFormat`, cut off at both pictures' edges. False where the formats have no way to each other, or
  /// nothing is left.
  bool CopyPixels(const Picture& source) const;
  bool CopyPixels(const Picture& source, const Rect& dest) const;
  bool CopyPixels(const Picture& source, const Rect& dest, std::int32_t sourceX, std::int32_t sourceY) const;
  ///@}

  /// Lays a block of `image`, from `sourceX`, `sourceY` on, over this picture at dest's place and size. False
  /// where the two, or the mask, don't fit together.
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

  /// None.
  PictureFactory() = default;
  /// The factory that an object of its class is.
  explicit PictureFactory(Object object) : Object(std::move(object)) {}
  /// A factory without a handler is as good as none.
  explicit PictureFactory(Handler handler);

  /// The factory that all new pictures of the process are asked from; an empty one for none.
  static void SetFactory(const PictureFactory& factory);
};

}
