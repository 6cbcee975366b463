#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <string_view>
#include <utility>
#include <vector>

#include "fuzz/input.h"
#include "fuzz/time_limit.h"
#include "picturezor/host_picture.h"
#include "support/row_arguments.h"

// An input is a program of small steps: pictures are made in all stores and formats, any row is called with
// any objects and numbers, results are kept and called in turn, and everything goes in an order of the
// input's.

namespace picturezor {
namespace {

using model::MethodEntry;
using model::Parameter;

/// Pixels of the pictures that are asked for by numbers, of those that are kept, and of all that the calls of
/// a program look at, so that it stays short.
constexpr std::int64_t MostPixels = 4096, MostKept = 1 << 18, MostWork = 1 << 24;
constexpr int MostRowsInFile = 5000;
constexpr std::size_t MostPictures = 12, MostSteps = 200, BlockSize = 1 << 16;

class Program {
 public:
  explicit Program(std::span<const std::uint8_t> bytes) : In(bytes) {
    Shown[0].MakeMask();
    Host::OnYield([this] { Yielded(); });
  }
  ~Program() {
    Host::OnYield({});
    Host::FailCreationsAfter(-1);
    PictureFactory::SetFactory({});
    model::UnlockString(Text);
    while (!Pictures.empty()) DropPicture();
  }
  Program(const Program&) = delete;

  void Run() {
    for (std::size_t step = 0; step < MostSteps && Work < MostWork && !In.AtEnd(); ++step) {
      try {
        Step();
      } catch (const HostException&) {
        // Bad indices raise; that is their failure.
      } catch (const std::invalid_argument&) {
      }
    }
  }

 private:
  void Step() {
    switch (In.Between(0, 11)) {
      case 0: return Keep(NewPicture());
      case 1: return DropPicture();
      case 2: return SetProperty();
      case 3: return SetFactories();
      case 4: return Host::FailCreationsAfter(In.Between(-3, 6));
      case 5: return Assign();
      case 6:
      case 7:
      case 8: return Call(Numbers::Fitting);
      default: return Call(Numbers::Any);
    }
  }

  /// Of the size and format of another one as often as of its own, since most rows want pictures that fit.
  Picture NewPicture() {
    int width = In.Between(1, 40), height = In.Between(1, 24);
    auto format = Format(In.Between(0, 41));
    if (format == Format(41)) return Extreme();
    if (In.Byte() & 1)
      if (const Picture like = Any(); like && like.Valid() && like.Width() > 0 && like.Height() > 0) {
        width = like.Width();
        height = like.Height();
        if (In.Byte() & 3) format = like.ImageFormat();
      }
    // A row of a file takes up a page.
    const int store = In.Between(0, 3);
    switch (store == 0 && height > MostRowsInFile ? 1 : store) {
      case 0:
        return Filled(Picture::Mapped(Files[std::size_t(In.Between(0, 3))].Path(), width, height, format, 1));
      case 1: {
        // Just as many bytes as the rows need, so that a sanitizer sees the first one beyond.
        const int pixels = width * BytesPerPixel(format), rowSize = In.Between(0, 2) ? pixels + 3 : 4;
        const auto bytes = std::size_t(rowSize * (height - 1) + std::max(rowSize, pixels));
        return Filled(Picture(MemoryBlock(bytes), width, height, format, rowSize));
      }
      default: return Filled(Picture(width, height, format));
    }
  }
  /// As tall, or as wide, as one in a file can be too; and, in memory, 70000 rows.
  Picture Extreme() {
    constexpr std::pair<int, int> sizes[] = {{1, 5000}, {5000, 1}, {3, 70000}, {6000, 6}, {2, 4000}};
    const auto& [width, height] = sizes[In.Between(0, 4)];
    const auto format = Format(In.Between(1, 40));
    const Picture small = Filled(Picture(std::min(width, 40), std::min(height, 24), format));
    const Picture picture =
        height >= 5 && height <= MostRowsInFile && In.Byte() % 2
            ? Picture::Mapped(Files[std::size_t(In.Between(0, 3))].Path(), width, height, format, 1)
            : Picture(width, height, format);
    if (picture.Valid() && picture.IsMapping()) MakeWindowSmall(picture);
    picture.ScaleFast(small, width, height);
    return picture;
  }
  static Picture Filled(Picture picture) {
    if (!picture.Valid()) return picture;
    if (picture.IsMapping()) MakeWindowSmall(picture);
    FillWithNoise(picture, 5);
    return picture;
  }

  void Keep(const Picture& picture) {
    if (PixelsOf(picture) <= MostKept && Pictures.size() < MostPictures) Pictures.push_back(picture);
  }
  static std::int64_t PixelsOf(const Picture& picture) {
    return picture ? std::int64_t{std::max(picture.Width(), 0)} * std::max(picture.Height(), 0) : 0;
  }
  void DropPicture() {
    if (Pictures.empty()) return;
    std::swap(Pictures[std::size_t(In.Byte()) % Pictures.size()], Pictures.back());
    Pictures.pop_back();
  }
  /// Nil now and then.
  Picture Any() {
    const std::size_t pick = In.Byte() % (Pictures.size() + 1);
    return pick < Pictures.size() ? Pictures[pick] : Picture();
  }

  void SetProperty() {
    const Picture picture = Any();
    if (!picture) return;
    switch (In.Between(0, 3)) {
      case 0: return picture.SetYieldTicks(In.Integer());
      case 1: return picture.SetMappingBlockSize(In.Integer());
      case 2: return picture.SetDebugPictureEnabled(In.Byte() & 1);
      case 3: return picture.SetFactory(AnyFactory());
    }
  }
  void SetFactories() { PictureFactory::SetFactory(AnyFactory()); }
  /// A program's own pictures, whatever they are: kept ones, larger ones, none, or an exception.
  PictureFactory AnyFactory() {
    const int way = In.Between(0, 5);
    if (way == 0) return {};
    if (way == 1) return PictureFactory(PictureFactory::Handler());
    // By its place, since a factory that held its picture would keep both alive for good.
    const std::size_t place = In.Byte();
    return PictureFactory([=, this](std::int32_t width, std::int32_t height, Format format) -> Picture {
      if (way == 2) throw std::invalid_argument("no picture");
      if (way == 3) return Pictures.empty() ? Picture() : Pictures[place % Pictures.size()];
      if (width < 1 || height < 1 || std::int64_t{width} * height > MostPixels) return {};
      return way == 4 ? Picture(width + 3, height + 1, Format::RGBA) : Picture(width, height, format);
    });
  }

  /// Another part of the program runs while an operation is half done.
  void Yielded() {
    if (std::exchange(Yielding, true)) return;
    const Picture picture(9, 5, Format::GA);
    if (picture.Valid()) picture.Clone();
    Yielding = false;
  }

  /// An operation that wants six numbers to fit would hardly ever get them by chance.
  enum class Numbers { Any, Fitting };
  int Fitting(const std::string& name) {
    if (name.ends_with("width") || name.ends_with("height")) return In.Between(1, 24);
    if (name == "mode") return In.Between(1, 7);
    return In.Between(-2, 13);
  }
  Value Argument(const Parameter& parameter, Numbers numbers = Numbers::Any) {
    const model::TypeName& type = parameter.Type;
    if (type == "integer" && numbers == Numbers::Fitting)
      return {.Whole = Fitting(model::Lower(parameter.Name))};
    if (type == "integer" || type == "color") return {.Whole = In.Integer()};
    if (type == "boolean") return {.Whole = In.Byte() & 1};
    if (type == "double") return {.Real = In.Real()};
    if (type == "picturezor") return {.Address = Any().Address()};
    if (In.Between(0, 9) == 0) return {};
    if (type == "picture") return {.Address = Shown[std::size_t(In.Between(0, 2))].Address()};
    if (type == "memoryblock") return {.Address = Block.Address()};
    if (type == "string") return {.Address = Text};
    if (type == "folderitem") return {.Address = Folder.Address()};
    if (type == "integer()") return {.Address = Arrays[std::size_t(In.Between(0, 2))].Address()};
    return {};
  }

  /// By its name, so that an input means the same after other rows have come or gone: each row bids a number
  /// made of its name and the input's, and the highest bid has it.
  const MethodEntry& AnyRow() {
    const int high = In.Byte(), number = high << 8 | In.Byte();
    return *std::ranges::max_element(model::ClassNamed("PictureZOR").Methods, {},
                                     [&](const MethodEntry& row) {
                                       std::uint64_t bid = 14695981039346656037u ^ std::uint64_t(number);
                                       const auto add = [&bid](std::string_view text) {
                                         for (const char letter : text)
                                           bid = (bid ^ std::uint8_t(letter)) * 1099511628211u;
                                       };
                                       add(row.LowerName);
                                       for (const Parameter& parameter : row.Of.Parameters)
                                         add(parameter.Type);
                                       return bid ^ bid >> 29;
                                     });
  }

  /// Numbers that would only take long.
  static bool IsLarge(const MethodEntry& row, const Picture& self, const std::vector<Value>& arguments) {
    std::int64_t pixels = 1;
    const bool makes = row.LowerName == "constructor" || row.LowerName == "createpicturezor";
    for (std::size_t i = 0; i < arguments.size(); ++i) {
      const std::string name = model::Lower(row.Of.Parameters[i].Name);
      // A factory may be asked in each.
      if (name == "iterations" && arguments[i].Whole > 1000) return true;
      if (makes && (name == "width" || name == "height"))
        pixels = arguments[i].Whole > MostPixels ? MostPixels + 1 : pixels * arguments[i].Whole;
    }
    if (row.LowerName == "rotate" && std::fmod(arguments[0].Real, 90) != 0)
      pixels = std::max<std::int64_t>(self.Width(), self.Height()) * (self.Width() + self.Height()) / 4;
    return pixels > MostPixels;
  }

  /// The pixels of a call's pictures.
  std::int64_t PixelsOf(const MethodEntry& row, const Picture& self,
                        const std::vector<Value>& arguments) const {
    std::int64_t pixels = PixelsOf(self);
    for (std::size_t i = 0; i < arguments.size(); ++i)
      for (const Picture& picture : Pictures)
        if (row.Of.Parameters[i].Type == "picturezor" && picture.Address() == arguments[i].Address)
          pixels += PixelsOf(picture);
    return pixels;
  }
  /// How often a call looks at them, by its numbers.
  static std::int64_t TimesOf(const MethodEntry& row, const std::vector<Value>& arguments) {
    std::int64_t times = 1;
    for (std::size_t i = 0; i < arguments.size(); ++i) {
      const std::string name = model::Lower(row.Of.Parameters[i].Name);
      const std::int64_t number = std::clamp<std::int64_t>(arguments[i].Whole, 1, 1000);
      if (name == "iterations") times *= number;
      if (name == "range" || name == "matrixdimension") times *= 4 * number * number;
    }
    return times;
  }

  void Call(Numbers numbers) {
    const MethodEntry& row = AnyRow();
    const bool constructs = row.LowerName == "constructor";
    const Picture self = constructs && In.Between(0, 7) ? UnbuiltPicture() : Any();
    std::vector<Value> arguments;
    for (const Parameter& parameter : row.Of.Parameters) arguments.push_back(Argument(parameter, numbers));
    if ((self && IsLarge(row, self, arguments)) || !KeepsPromises(row, arguments)) return;
    const std::int64_t pixels = PixelsOf(row, self, arguments), all = pixels * TimesOf(row, arguments);
    const bool few = pixels <= MostPixels;
    if (!few && all > MostWork) return;
    Work += few ? pixels : all;
    const Outcome outcome = [&] {
      const TimeLimit limit(std::min(all, MostWork));
      return CallRow(row, self.Address(), arguments);
    }();
    if (constructs) Keep(self);
    if (row.Of.Result == "picturezor")
      Keep(Picture(Object::Adopt(outcome.Result.Address)));
    else
      GiveBack(row.Of.Result, outcome.Result);
  }

  /// What is assigned is long enough for every row, as the module must be able to trust.
  void Assign() {
    const MethodEntry& row = AnyRow();
    const Picture self = Any();
    if (!self || !row.Record->Setter) return;
    if (row.LowerName == "datastringinformat" && PixelsOf(self) > MostPixels) return;
    std::vector<Value> arguments;
    for (const Parameter& parameter : row.Of.Parameters) arguments.push_back(Argument(parameter));
    Work += PixelsOf(self);
    const TimeLimit limit(PixelsOf(self));
    AssignRow(row, self.Address(), arguments, Argument({"value", row.Of.Result}));
  }

  Input In;
  const TemporaryFile Files[4];
  std::vector<Picture> Pictures;
  const MemoryBlock Block{BlockSize};
  const std::vector<HostPicture> Shown = {HostPicture(30, 20), HostPicture(9, 40, PictureForm::GWorld32),
                                          HostPicture(1, 1)};
  const FolderItem Folder{Files[0].Path()};
  const std::vector<IntegerArray> Arrays = {IntegerArray(std::vector<std::int32_t>(256, 200)),
                                            IntegerArray({1, -2, 2147483647, 4, 5, 6, 7, 8, 9}),
                                            IntegerArray(std::vector<std::int32_t>{})};
  model::StringRecord* const Text = model::NewString(Bytes(BlockSize, 'x'), model::UTF8);
  std::int64_t Work = 0;
  bool Yielding = false;
};

}
}

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  picturezor::Host::Load(PICTUREZOR_MODULE);
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using picturezor::Host;
  const Host::Alive before = Host::Count();
  picturezor::Program({data, size}).Run();
  if (!(Host::Count() == before)) {
    const Host::Alive after = Host::Count();
    std::fprintf(stderr, "left alive in the host: %d objects, %d strings, %d blocks\n",
                 after.Objects - before.Objects, after.Strings - before.Strings,
                 after.MemoryBlocks - before.MemoryBlocks);
    std::abort();
  }
  return 0;
}
