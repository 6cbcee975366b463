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
/// of the two: Triangle 1 (bilinear), Box 0.5 (the mean of an area), Lanczos3 and Cubic 3, Lanczos8 8, Mitchell
/// and Poly3 2.
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
  /// Zeroed samples in memory, at least 1 x 1 and below 2 GiB. Rows start 64 bytes apart, or a multiple of
  /// it.
  Picture(std::int32_t width, std::int32_t height, Format format);
  /// Over somebody's memory, `rowSize` bytes from row to row, below 4 GiB together. Throws
  /// std::invalid_argument where the block is too small for it. Not `Valid` for nil or a negative `rowSize`.
  Picture(const MemoryBlock& block, std::int32_t width, std::int32_t height, Format format,
          std::int32_t rowSize);
  /// Zeroed samples in a block of the host's: in memory too, but below 4 GiB where addresses have 64 bits.
  /// Memory is taken as rows are touched. Not `Valid` where there plainly isn't as much. `Clone` gives nil
  /// from 2 GiB on.
  static Picture InBlock(std::int32_t width, std::int32_t height, Format format);
  /// In memory too, but its samples are whatever they are, for who writes all of them: to clear a picture
  /// takes about as long as to copy one. Below 2 GiB.
  static Picture ToBeFilled(std::int32_t width, std::int32_t height, Format format);
  /// Over the pixels of a host picture: what is written to one shows in the other. Only of one in a GWorld of
  /// 24 or 32 bits; of others it isn't `Valid`. In 32 bits `useAlpha` says whether the byte before the
  /// colours is alpha.
  explicit Picture(const HostPicture& picture, bool useAlpha = false);
  /// In a temporary file, which is created or overwritten and goes away with the last picture using it. About
  /// `blockSize` bytes of it, at least 16 MiB and five rows, are in the address space at a time. Not `Valid`
  /// with less than 5 rows, without room on the disk, and for a file that can't be written or that another
  /// picture is on.
  static Picture Mapped(const std::filesystem::path& file, std::int32_t width, std::int32_t height,
                        Format format, std::int32_t blockSize = 0);

  /// A new picture through the global factory, or in memory; nil for a size or format that can't be had.
  static Picture Create(std::int32_t width, std::int32_t height, Format format);
  /// A new picture through this picture's factory, the global one, or in memory; nil for a size or format
  /// that can't be had.
  Picture CreatePicture(std::int32_t width, std::int32_t height, Format format) const;
  /// Bytes that a picture in memory takes, also where they are more than one may have; 0 for a size below 1,
  /// a row from 2 GiB on, and a code that isn't a format.
  static std::int64_t CalculateMemory(std::int32_t width, std::int32_t height, Format format);
  /// Whether these bytes and a MiB more can be had now; false for a size or format that is refused, and from
  /// 4 GiB on.
  static bool CanAllocate(std::int32_t width, std::int32_t height, Format format);

  /// Ends the picture now. Views on it go on working.
  void Close() const;
  /// A copy in memory, without this picture's factory and settings; nil for a mapped picture, one that isn't
  /// `Valid`, or without memory.
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
  /// The format's name, such as "ARGB"; "RBBA" for RGBA, "Scaling" for all eight of those, "Unknown" for 0,
  /// empty for one without a name.
  std::string ImageFormatString() const;
  /// Bytes of a pixel, 1 to 8.
  std::int32_t PixelSize() const;
  /// Bytes from the start of a row to that of the next one: the stride.
  std::int32_t RowSize() const;
  /// The row of the store that is the first of this picture; not 0 on clip views only.
  std::int32_t RowOffset() const;
  /// `RowSize` times the rows of the store, which a view has from its parent.
  std::int64_t TotalSize() const;
  /// Channels of a pixel, 0 to 5, fillers not counted. Over a host picture 0.
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
  /// The bytes of a window of a mapped picture: what is set becomes at least 16 MiB and five rows, at most
  /// the picture, and whole pages. Means nothing to others.
  std::int32_t MappingBlockSize() const;
  void SetMappingBlockSize(std::int32_t bytes) const;
  ///@}
  ///@{
  /// Least sixtieths of a second between two yields to the host; 0 or less, as at first, is never.
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
  /// gray by (77 r + 151 g + 28 b) / 256, gray becomes all three or all four inks, black becomes gray. Alpha
  /// goes along where both have it, with `invertAlpha` as 255 less it; otherwise it is 0 in a row that is
  /// made, and stays in one that is set, like fillers. Empty, or nothing set, where there is no way to that
  /// format; between RGB and CMYK HostException.
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

  // Into new host pictures, of the whole picture or a part of it; inks are mixed to light. Nil for pixels
  // without colours, where nothing of the part is left, beyond 32767 pixels on a side, or without memory.

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
  /// Gray, RGB, or RGB with alpha in a GWorld of its own; nil for other colours, beyond 65535 pixels on a
  /// side, or without memory.
  GWorld CopyGWorld() const;

  // From host pictures, without scaling: all of one, or a block of it from `sourceX`, `sourceY` on, to the
  // place and with the size of `dest`, cut off at both pictures' edges. Nothing changes where it fails, on a
  // picture of other colours, and for nil.

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
  /// it. `temp` is nil, or a picture that keeps what stands between the passes: no view, at least `width`
  /// wide and as high as `source`, with pixels of 4 bytes where this picture is RGB, and otherwise of a byte
  /// for each colour of this picture and for alpha where it takes part. False where the formats have no way
  /// to each other, the size is below 1 or passes this picture, `temp` doesn't fit, or memory fails.
  /// `ScaleMT` works on a number of threads, with the same result: 0 is one a processor, 32 the most, and
  /// below 0 or with a mapped picture the caller does it alone.
  bool Scale(const Picture& source, const Picture& temp, Kernel kernel, std::int32_t width,
             std::int32_t height) const;
  bool ScaleMT(std::int32_t threads, const Picture& source, const Picture& temp, Kernel kernel,
               std::int32_t width, std::int32_t height) const;
  ///@}
  /// The nearest pixel of `source` for each, at the truncated place. The size is cut to this picture's.
  /// Colours are converted as by `CopyPixels`. False when nothing is left of the size, where the formats have
  /// no way to each other, for inks without alpha, and for gray without alpha to inks with it.
  bool ScaleFast(const Picture& source, std::int32_t width, std::int32_t height) const;

  // Geometry. A nil `dest` makes a new picture; a given one is another picture, large enough for the result,
  // with this picture's channels. The result is the destination; nil for another `dest`, a picture that isn't
  // `Valid`, or without memory. Pixels without colours aren't moved.

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
  /// By degrees counter-clockwise, any number of them, into a new picture that holds all of it. Right angles
  /// are exact, and whole turns give the picture itself; others are three shears, alpha like a colour, and
  /// without `background` the corners are 0. Nil for an angle that isn't finite, for pixels without colours
  /// but by right angles, or without memory.
  Picture Rotate(double angle) const;
  Picture Rotate(double angle, const Background& background) const;
  ///@}

  // Filters. A nil `dest` makes a new picture of this size and format. A given one is at least as large and
  // has the channels that are written, in any order; it may be the picture itself but where it is said. The
  // result is the destination; nil for another `dest`, a picture that isn't `Valid`, or without memory for a
  // new one. Colours that a filter doesn't serve, and alpha where it is left out, stay as they are in `dest`;
  // in a new picture they are 0.

  ///@{
  /// 255 less each sample, alpha included, in place.
  void Invert() const;
  void Invert(const Rect& rect) const;
  ///@}
  ///@{
  /// Stretches the levels of red, green and blue alike, in place, so that about half a percent of the pixels
  /// becomes black and as many white. Alpha stays. False for other colours, and where nothing of the
  /// rectangle is left.
  bool AutoLevel() const;
  bool AutoLevel(const Rect& rect) const;
  ///@}
  /// Darkest in the middle and bright at both ends: 0 and 255 become 255, 127 and 128 become 0. All channels
  /// alike, alpha included.
  Picture SolarizeFilter(const Picture& dest = {}) const;
  ///@{
  /// 255 (v / 255)^(1 / gamma), for gray and RGB; above 1 lightens. A gamma is above 0: with 0 all but 255
  /// becomes 0, and below 0 everything 255. Alpha is left out but where it has a gamma of its own. Of three
  /// gammas gray takes a weighted mean of their whole parts, so 0 where all are below 1.
  Picture GammaFilter(const Picture& dest, double gamma) const;
  Picture GammaFilter(const Picture& dest, double gamma, double alphaGamma) const;
  Picture GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma) const;
  Picture GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma,
                      double alphaGamma) const;
  ///@}
  /// An S-shaped curve, steeper with more `gain`, and one that lightens with more `bias`, both between 0 and
  /// 1 without the ends; 0.5 and 0.5 change nothing but for rounding. Other numbers aren't refused, but give
  /// no such curve. For gray and RGB, alpha included.
  Picture GainFilter(const Picture& dest, double gain, double bias) const;
  ///@{
  /// Each sample v becomes the low 8 bits of element v of the channel's array; what an array doesn't have is
  /// 0, nil has nothing, and elements behind the 256th don't count. For gray and RGB; gray takes the `green`
  /// of three. Alpha is left out but where it has an array.
  Picture TransferFilter(const Picture& dest, const IntegerArray& gray) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& gray, const IntegerArray& alpha) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                         const IntegerArray& blue) const;
  Picture TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                         const IntegerArray& blue, const IntegerArray& alpha) const;
  ///@}
  ///@{
  /// Convolution with a square of weights, 1 to 50 on a side, row by row, the middle being the sample itself;
  /// an even square has one more row and column before it. Beyond the edges the nearest sample counts. The
  /// result is (sum + delta) scaleFactor, truncated, and 0 to 255 at most; without them delta is 0 and the
  /// factor 1. A weight of 255 or more leaves its place out, and those that `matrix` doesn't have are 0.
  /// Alpha is treated like a colour. Nil above 50; below 1 the sum is 0. With the picture itself for `dest`
  /// pixels are read as those before them have left them.
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                      std::int32_t delta) const;
  Picture ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                      std::int32_t delta, double scaleFactor) const;
  ///@}
  ///@{
  /// The mean of the 2 r + 1 rows and then columns around each sample, truncated, r being the radius in
  /// pixels without its fraction, once or `iterations` times; beyond the edges the nearest sample counts. A
  /// radius below 1 copies. Either direction may be left out; without both nothing is written. Alpha is
  /// treated like a colour. `dest` may not be the picture itself: nil. With several iterations the result is
  /// a new picture, and `dest` has the first; with less than 1 it is the picture itself.
  Picture BoxBlurFilter(const Picture& dest, double radius) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, bool vertical, bool horizontal) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations) const;
  Picture BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations, bool vertical,
                        bool horizontal) const;
  ///@}
  /// A blur by less than a pixel: the neighbours count by the fraction of the radius, so 2.5 is as 0.5, and a
  /// whole number copies. Alpha is treated like a colour. Nil for pixels without colours.
  Picture BoxBlurFractionalFilter(const Picture& dest, double radius) const;
  /// Two colours with a step between them where the picture, blurred three times by a third of `radius`,
  /// passes `threshold`; the step is `softness` wide, 0 for a hard one, both with 1 for 255. A radius below 3
  /// doesn't blur. For gray, which takes the green of the colours, and RGB. Gives a new picture, alpha left
  /// out; `dest`, which may not be the picture itself, receives the first blur.
  Picture StampFilter(const Picture& dest, double radius, double threshold, double softness, Color black,
                      Color white) const;
  /// Pushes each sample away from that of `original`, a blurred copy as a rule, by 4 `amount` times their
  /// difference, in place, alpha included; an `amount` of 0 changes nothing, and one below 0 goes the other
  /// way. Differences below `threshold` (in sample values) are left alone, with 0 or less none. False unless
  /// both are `Valid` and have one size and format.
  bool UnsharpFilter(const Picture& original, double amount, std::int32_t threshold) const;
  /// The mean of the most frequent among `levels` classes of values within `range` pixels, alpha like a
  /// colour. `levels` are 1 to 256, and others count as the nearer of these; a `range` below 0 counts as 0,
  /// which changes nothing. Nil for a `dest` with pixels of another size. `dest` as in `ApplyMatrix`.
  Picture OilFilter(const Picture& dest, std::int32_t levels, std::int32_t range) const;
  /// Each pixel from a place up to `level` columns and rows away, or from the edge where that is nearer, by
  /// the process's `rand`. A `level` below 0 counts as 0, which copies. For gray and RGB, alpha included.
  /// `dest` as in `ApplyMatrix`.
  Picture DiffuseFilter(const Picture& dest, std::int32_t level) const;
  /// 128 and the difference to the sample `level` columns and rows further on, or back below 0, or at the
  /// edge where that is nearer; 0 to 255 at most. For gray and RGB, alpha included. `dest` as in
  /// `ApplyMatrix`.
  Picture EngraveFilter(const Picture& dest, std::int32_t level) const;
  /// Edges: the root of 2 (a^2 + b^2), at most 255, of the differences to the samples below and to the right,
  /// alpha like a colour. Below the last row lies 0.
  Picture NeonFilter(const Picture& dest = {}) const;
  /// Ordered dithering to `levels` evenly spaced values, 2 to 256; others count as the nearer of these. For
  /// gray and RGB, alpha included. A number that isn't one of the matrices leaves `dest` as it is.
  Picture DitherFilter(const Picture& dest, DitherMatrix matrix, std::int32_t levels) const;

  // Composition, in place. Without a rectangle all of the picture. What lies outside the picture is left out,
  // and nothing is done to one that isn't `Valid`.

  ///@{
  /// The low 8 bits of a value into every sample, alpha included; filler bytes, and pixels without colours,
  /// stay.
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
  /// Random samples, alpha included, by the process's `rand`; filler bytes, and pixels without colours, stay.
  void FillRectRandom() const;
  void FillRectRandom(const Rect& rect) const;
  ///@}
  ///@{
  /// Zeros, filler bytes and pixels without colours included.
  void ClearRect() const;
  void ClearRect(const Rect& rect) const;
  ///@}
  /// The sum of the absolute differences of all samples, alpha included, whatever their order in the pixel; 0
  /// for equal ones. -1 for nil, another size, other colours, alpha in one of the two only, pixels without
  /// colours, or a picture that isn't `Valid`.
  std::int64_t CompareImages(const Picture& other) const;
  ///@{
  /// Copies `source`, or a block of it of dest's size, to a place in this picture, unscaled and cut off at
  /// both pictures' edges. Colours are converted as by `RowInFormat`, but that gray becomes black ink alone;
  /// alpha goes along where both have it, and stays otherwise. False, and nothing changed, for nil, between
  /// RGB and CMYK, for pixels without colours, or where nothing is left.
  bool CopyPixels(const Picture& source) const;
  bool CopyPixels(const Picture& source, const Rect& dest) const;
  bool CopyPixels(const Picture& source, const Rect& dest, std::int32_t sourceX, std::int32_t sourceY) const;
  ///@}

  /// Lays a block of `image`, from `sourceX`, `sourceY` on, over this picture at dest's place and size,
  /// unscaled and cut off at both pictures' edges. With neither a mask nor a colour it is `CopyPixels`;
  /// otherwise for gray and RGB, and with other colours anywhere nothing is written, though the result is
  /// true. False, and nothing changed, for a nil `image`, a width or height below 1, a mask of another size
  /// than the image, a picture that isn't `Valid`, or where nothing is left.
  bool Combine(const Picture& image, const Rect& dest, std::int32_t sourceX, std::int32_t sourceY,
               const CombineOptions& options) const;
};

/// What decides how much of the destination stays where an image is laid over it: 255 keeps it, 0 takes the
/// image.
struct CombineOptions {
  /// The image's samples have been scaled by their coverage already, so they are added; a sum above 255 keeps
  /// its low 8 bits.
  bool PreMultipliedSource = false;
  /// As large as the image; decides alone where it is given, colour by colour, and for alpha by its own,
  /// which counts as 255 where it has none. With the colours below alpha stays.
  Picture Mask{};
  /// Whether `MaskColour` counts; otherwise, where it is given, black stands for it and takes the image.
  bool UseColours = false;
  /// A flat colour that the image is the mask for, where there is no `MaskColour`. A pixel of red, green and
  /// blue counts by their mean.
  std::optional<Color> ForeColour{};
  /// One mask value a channel.
  std::optional<Color> MaskColour{};
};

/// Makes the pictures that operations need, in the program's own way.
class PictureFactory : public Object {
 public:
  /// Gives a picture of at least the size asked for; an empty one, or one that is smaller or not `Valid`,
  /// lets the next way be tried. An exception that it throws comes out of the call that asked.
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
