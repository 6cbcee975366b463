#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <list>
#include <map>
#include <span>
#include <sstream>
#include <string>
#include <vector>

#include "host_strings.h"
#include "image/picture_data.h"
#include "picturezor/host_picture.h"
#include "support/every_store.h"
#include "support/every_target.h"
#include "support/row_call.h"

// A line for each row of the class and kernel or dither matrix: what comes out of calls with seeded
// arguments, down to the padding of the rows, as one number for each format, and a last one for very tall and
// very wide pictures. They are the same on every machine and for every instruction set. Without an argument
// the lines are printed; with the name of a file they are compared to its lines, with a number N behind it
// only every N-th number.

/// The one thing that differs from system to system: the numbers of the C library.
static std::uint32_t RandomState;
extern "C" [[gnu::visibility("default")]] int rand() {
  RandomState = RandomState * 1103515245 + 12345;
  return int(RandomState >> 1);
}

namespace picturezor {
namespace {

using model::MethodEntry;
using model::Parameter;

/// The size of the pictures of a call.
struct Shape {
  int Width, Height;
  bool Mapped = false;
  bool IsExtreme() const { return Width > 1000 || Height > 1000; }
};
// On either side of the vectors' widths.
constexpr Shape Ordinary[] = {{77, 7}, {5, 9}, {33, 8}, {130, 3}, {16, 12}, {64, 5}};
constexpr Shape Extreme[] = {{1, 5000}, {5000, 1}, {3, 70000}, {2, 1200, true}, {1200, 5, true}};
/// No picture of a host has more on a side.
constexpr int Largest = 32767;
constexpr Format ExtremeFormats[] = {Format::G, Format::BGRA, Format::CMYK, Format::AG, Format::RGB};

class Checksum {
 public:
  void Add(const void* bytes, std::size_t count) {
    for (const auto* at = static_cast<const std::uint8_t*>(bytes); count > 0; ++at, --count)
      State = (State ^ *at) * 1099511628211u;
  }
  void Add(std::int64_t number) {
    for (int shift = 0; shift < 64; shift += 8) {
      const auto byte = std::uint8_t(std::uint64_t(number) >> shift);
      Add(&byte, 1);
    }
  }
  void Add(const std::string& text) { Add(text.data(), text.size()); }
  void Add(const HostPicture& picture) {
    Add(picture ? 1 : 0);
    if (!picture) return;
    const Bytes pixels = picture.RGB();
    Add(pixels.data(), pixels.size());
    Add(picture.Mask());
  }
  void Add(const Picture& picture) {
    Add(picture ? 1 : 0);
    if (!picture || !picture.Valid()) return;
    zor::PictureData& data = DataOf(picture);
    if (data.IsMapping || Shape{data.Width, data.Height}.IsExtreme()) return AddPixels(data);
    for (const char* name : {"Width", "Height", "PixelSize", "RowSize", "RowOffset", "ImageFormat"})
      Add(picture.IntegerProperty(name));
    for (int y = 0; y < picture.Height(); ++y) {
      const Bytes row = picture.Row(y);
      Add(row.data(), row.size());
    }
  }
  /// Without the padding: in a file it fills pages, which differ, and of many rows it would take most of the
  /// time.
  void AddPixels(zor::PictureData& data) {
    for (const int number : {data.Width, data.Height, data.PixelSize, data.RowOffset, data.ImageFormat})
      Add(number);
    for (int y = 0; Usable(data) && data.Width > 0 && y < data.Height; ++y)
      Add(data.RowGetter(&data, y) + data.LeftEdge, std::size_t(data.Width) * std::size_t(data.PixelSize));
  }
  std::uint32_t Folded() const { return std::uint32_t(State ^ State >> 32); }

 private:
  std::uint64_t State = 14695981039346656037u;
};

Picture Filled(int width, int height, Format format, Noise& noise) {
  const Picture picture(width, height, format);
  for (int y = 0; y < height; ++y) picture.SetRow(y, noise.Many(std::size_t(picture.RowSize())));
  return picture;
}

/// Pictures of a call, with the files that some of them are in.
class Pictures {
 public:
  Picture Make(const Shape& shape, Format format, Noise& noise) {
    if (!shape.IsExtreme()) return Filled(shape.Width, shape.Height, format, noise);
    const Picture picture =
        shape.Mapped ? Picture::Mapped(Files.emplace_back().Path(), shape.Width, shape.Height, format, 1)
                     : Picture(shape.Width, shape.Height, format);
    if (shape.Mapped) MakeWindowSmall(picture);
    zor::PictureData& data = DataOf(picture);
    std::uint32_t state = noise.Byte();
    for (int y = 0; y < data.Height; ++y) {
      zor::Sample* row = data.RowGetter(&data, y);
      for (int i = 0; i < data.Width * data.PixelSize; ++i) {
        state = state * 1664525 + 1013904223;
        row[i] = zor::Sample(state >> 24);
      }
    }
    return picture;
  }

 private:
  std::list<TemporaryFile> Files;
};

HostPicture Shown(int width, int height, Noise& noise) {
  const HostPicture picture(width, height);
  picture.SetRGB(noise.Many(std::size_t(width * height * 3)));
  return picture;
}

/// What is tried of an integer, by the name of its parameter.
Value Number(const std::string& name, const Shape& of, bool constructs, Noise& noise) {
  // Few rows of many are as telling as many of few.
  const bool few = of.IsExtreme() && (constructs || noise.Between(0, 1));
  const int width = few ? std::min(of.Width, 12) : of.Width,
            height = few ? std::min(of.Height, 12) : of.Height;
  const int wide = of.IsExtreme() ? std::max(width, 90) : 90,
            high = of.IsExtreme() ? std::max(height, 12) : 12;
  struct {
    const char* Name;
    int First, Last;
  } const ranges[] = {{"width", 1, width},
                      {"height", 1, height},
                      {"destwidth", -9, wide},
                      {"destheight", -4, high},
                      {"w", -9, wide},
                      {"h", -4, high},
                      {"x", -9, 20},
                      {"y", -4, 8},
                      {"destx", -9, 20},
                      {"desty", -4, 8},
                      {"sourcex", -9, 20},
                      {"sourcey", -4, 8},
                      {"index", 0, 5},
                      {"imageformat", 0, 41},
                      {"theimageformat", 0, 41},
                      {"threads", 0, 4},
                      {"iterations", 0, 4},
                      {"range", 0, 7},
                      {"matrixdimension", 1, 7},
                      {"rowsize", 0, 400}};
  for (const auto& range : ranges)
    if (name == range.Name) return {.Whole = noise.Between(range.First, range.Last)};
  return {.Whole = noise.Between(-9, 300)};
}

double Real(const std::string& name, const Shape& of, Noise& noise) {
  // Far from a right angle the result would be as wide as it is high.
  if (name == "angle" && of.IsExtreme()) return noise.Between(0, 3) * 90 + noise.Between(-16, 16) / 16.0;
  if (name == "angle") return noise.Between(-7200, 7200) / 16.0;
  if (name == "radius") return noise.Between(-8, 80) / 16.0;
  return noise.Between(-32, 96) / 16.0;
}

/// One call with arguments of a seed, and all that it leaves behind.
void AddCall(Checksum& sum, const MethodEntry& row, Format format, int chosen, const Shape& shape,
             int variant) {
  Noise noise(unsigned(chosen * int(std::size(Ordinary)) + variant));
  RandomState = unsigned(variant);
  const int width = shape.Width, height = shape.Height;
  Pictures make;
  const Picture self = make.Make(shape, format, noise);
  const bool constructs = row.LowerName == "constructor";
  const Picture made(Object::Adopt(model::NewObject(model::ClassNamed("PictureZOR"))));
  std::vector<Picture> pictures;
  std::vector<Object> others;
  std::vector<Value> arguments;
  for (const Parameter& parameter : row.Of.Parameters) {
    const std::string name = model::Lower(parameter.Name);
    Value value;
    if (parameter.Type == "picturezor") {
      Picture picture;
      if (name == "dest" && variant % 3 == 1)
        picture = self;
      else if (name == "mask" && variant % 3 != 2)
        picture = make.Make(shape, Format::G, noise);
      else if (name == "image" || name == "source" || name == "origpixels" || name == "other" ||
               variant % 3 == 2)
        picture = make.Make({width + variant / 3, height + variant / 3, shape.Mapped},
                            variant % 2 ? Format(noise.Between(1, 13)) : format, noise);
      pictures.push_back(picture);
      value.Address = picture.Address();
    } else if (parameter.Type == "integer()") {
      std::vector<std::int32_t> numbers(variant % 2 ? 256 : 49);
      for (std::int32_t& number : numbers) number = noise.Between(-99, 300);
      others.push_back(IntegerArray(numbers));
      value.Address = others.back().Address();
    } else if (parameter.Type == "picture") {
      const HostPicture shown = Shown(std::min(width, Largest), std::min(height, Largest), noise);
      if (variant % 3) shown.MakeMask().SetRGB(noise.Many(std::size_t(shown.Width() * shown.Height() * 3)));
      others.push_back(shown);
      value.Address = shown.Address();
    } else if (parameter.Type == "memoryblock") {
      others.push_back(MemoryBlock(noise.Many(1 << 14)));
      value.Address = others.back().Address();
    } else if (parameter.Type == "double") {
      value.Real = Real(name, shape, noise);
    } else if (parameter.Type == "boolean") {
      value.Whole = noise.Between(0, 1);
    } else {
      value = name == "mode" || name == "matrix" ? Value{.Whole = chosen}
                                                 : Number(name, shape, constructs, noise);
    }
    arguments.push_back(value);
  }
  const Outcome outcome = CallRow(row, constructs ? made.Address() : self.Address(), arguments);
  sum.Add(outcome.Raised);
  sum.Add(outcome.Result.Whole);
  const model::TypeName& type = row.Of.Result;
  if (type == "picturezor") {
    sum.Add(Picture(Object::Adopt(outcome.Result.Address)));
  } else if (type == "string") {
    if (const auto* text = static_cast<model::StringRecord*>(outcome.Result.Address))
      sum.Add(model::TextOf(*text));
    GiveBack(type, outcome.Result);
  } else if (type == "picture") {
    sum.Add(HostPicture(Object::Adopt(outcome.Result.Address)));
  } else if (type == "variant") {
    const GWorld world(Object::Adopt(outcome.Result.Address));
    for (int y = 0; world && y < world.Height(); ++y) {
      const Bytes bytes = world.Row(y);
      sum.Add(bytes.data(), bytes.size());
    }
  } else if (type == "memoryblock") {
    const MemoryBlock block(Object::Adopt(outcome.Result.Address));
    // A stored row of a file fills pages.
    if (!shape.Mapped) sum.Add(block.Data().data(), block.Data().size());
  } else {
    GiveBack(type, outcome.Result);
  }
  if (row.Record->Setter) {
    Bytes bytes = noise.Many(shape.IsExtreme() ? 1 << 21 : 1 << 13);
    if (type == "string") {
      const Value text{.Address = model::NewString(bytes, model::UTF8)};
      sum.Add(AssignRow(row, self.Address(), arguments, text).Raised);
      GiveBack(type, text);
    } else {
      const MemoryBlock block(bytes);
      sum.Add(AssignRow(row, self.Address(), arguments, {.Address = block.Address()}).Raised);
    }
  }
  sum.Add(constructs ? made : self);
  for (const Picture& picture : pictures) sum.Add(picture);
}

/// Name and types, since names are overloaded.
std::string KeyOf(const MethodEntry& row) {
  std::string key = row.Of.Name + "(";
  for (const Parameter& parameter : row.Of.Parameters)
    key += parameter.Type == "integer()" ? 'a' : parameter.Type == "picture" ? 'h' : parameter.Type[0];
  return key + ")";
}

/// The choices of the parameter that names a kernel or a matrix; {0} without one.
std::vector<int> ChoicesOf(const MethodEntry& row) {
  int count = 0;
  for (const Parameter& parameter : row.Of.Parameters) {
    if (parameter.Type == "integer" && model::Lower(parameter.Name) == "mode") count = 7;
    if (parameter.Type == "integer" && model::Lower(parameter.Name) == "matrix") count = 10;
  }
  std::vector<int> choices;
  for (int choice = count ? 1 : 0; choice <= count; ++choice) choices.push_back(choice);
  return choices;
}

/// Rows of a mapped file start a page apart, and pages differ.
bool DependsOnTheMachine(const MethodEntry& row) {
  return std::ranges::any_of(row.Of.Parameters,
                             [](const Parameter& parameter) { return parameter.Type == "folderitem"; });
}

/// Turned by a degree 70000 rows are more than a thousand columns.
bool TakesTooLong(const MethodEntry& row, const Shape& shape) {
  return row.LowerName == "rotate" && shape.Height > 10000;
}

/// Calls body(line, format, sum) for every n-th sum in the order of the file; the format is 0 for extreme
/// pictures.
template <class Body>
void ForSums(int every, Body&& body) {
  int number = 0;
  std::size_t extremes = 0;
  for (const MethodEntry& row : model::ClassNamed("PictureZOR").Methods) {
    if (DependsOnTheMachine(row)) continue;
    for (const int chosen : ChoicesOf(row)) {
      const std::string line = KeyOf(row) + " " + std::to_string(chosen);
      const auto add = [&](Format format, Format named, std::span<const Shape> shapes) {
        if (number++ % every != 0) return;
        Checksum sum;
        for (std::size_t i = 0; i < shapes.size(); ++i)
          if (!TakesTooLong(row, shapes[i])) AddCall(sum, row, format, chosen, shapes[i], int(i));
        body(line, int(named), sum.Folded());
      };
      for (const Format format : EveryFormat()) add(format, format, Ordinary);
      add(ExtremeFormats[extremes++ % std::size(ExtremeFormats)], Format::Unknown, Extreme);
    }
  }
}

void Print() {
  ForSums(1, [](const std::string& line, int format, std::uint32_t sum) {
    if (format == 1) std::fputs(line.c_str(), stdout);
    std::printf(" %08x", unsigned(sum));
    if (format == 0) std::puts("");
  });
}

/// The sums of a file by their lines and formats.
std::map<std::pair<std::string, int>, std::uint32_t> Read(const char* file) {
  std::map<std::pair<std::string, int>, std::uint32_t> sums;
  std::ifstream in(file);
  for (std::string text; std::getline(in, text);) {
    std::istringstream words(text);
    std::string name, chosen;
    words >> name >> chosen >> std::hex;
    std::vector<Format> formats = EveryFormat();
    formats.push_back(Format::Unknown);
    std::uint32_t sum;
    for (std::size_t i = 0; i < formats.size() && words >> sum; ++i)
      sums[{name + " " + chosen, int(formats[i])}] = sum;
  }
  return sums;
}

int Compare(const char* file, int every) {
  const auto wanted = Read(file);
  std::size_t failures = 0, compared = 0;
  const zor::Target best = TargetOfModule();
  for (int target = 0; target <= int(best); ++target) {
    TargetOfModule() = zor::Target(target);
    std::size_t known = 0;
    ForSums(every, [&](const std::string& line, int format, std::uint32_t sum) {
      ++compared;
      const auto found = wanted.find({line, format});
      known += found != wanted.end();
      if (found != wanted.end() && found->second == sum) return;
      if (++failures <= 40)
        std::cout << "target " << target << ": " << line << ", "
                  << (format ? "format " + std::to_string(format) : "extreme pictures") << "\n";
    });
    // A row that is gone shows by what is left over.
    if (every == 1 && known != wanted.size()) {
      ++failures;
      std::cout << wanted.size() - known << " sums of the file are of no row\n";
    }
  }
  std::cout << compared << " sums compared for " << int(best) + 1 << " instruction sets, " << failures
            << " differ\n";
  if (failures) std::cout << "Where results were meant to change: scripts/checksums writes the file anew.\n";
  return failures > 0 || compared == 0;
}

}
}

int main(int count, char** arguments) {
  using namespace picturezor;
  Host::Load(PICTUREZOR_MODULE);
  if (count > 1) return Compare(arguments[1], count > 2 ? std::max(std::atoi(arguments[2]), 1) : 1);
  Print();
}
