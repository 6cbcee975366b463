#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <map>
#include <string>
#include <vector>

#include "host_strings.h"
#include "picturezor/host_picture.h"
#include "support/every_store.h"
#include "support/every_target.h"
#include "support/row_call.h"

// A line for each row of the class, format and kernel or dither matrix: what comes out of calls with seeded
// arguments, down to the padding of the rows, as one number. It is the same on every machine and for every
// instruction set. Without an argument the lines are printed; with the name of a file they are compared to
// its lines, with a number N behind it only every N-th one of them.

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

constexpr int Variants = 6;

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
    for (const char* name : {"Width", "Height", "PixelSize", "RowSize", "RowOffset", "ImageFormat"})
      Add(picture.IntegerProperty(name));
    for (int y = 0; y < picture.Height(); ++y) {
      const Bytes row = picture.Row(y);
      Add(row.data(), row.size());
    }
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

HostPicture Shown(int width, int height, Noise& noise) {
  const HostPicture picture(width, height);
  picture.SetRGB(noise.Many(std::size_t(width * height * 3)));
  return picture;
}

/// What is tried of an integer, by the name of its parameter.
Value Number(const std::string& name, const Picture& self, Noise& noise) {
  struct {
    const char* Name;
    int First, Last;
  } const ranges[] = {{"width", 1, self.Width()},
                      {"height", 1, self.Height()},
                      {"destwidth", -9, 90},
                      {"destheight", -4, 12},
                      {"w", -9, 90},
                      {"h", -4, 12},
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

double Real(const std::string& name, Noise& noise) {
  if (name == "angle") return noise.Between(-7200, 7200) / 16.0;
  if (name == "radius") return noise.Between(-8, 80) / 16.0;
  return noise.Between(-32, 96) / 16.0;
}

/// One call with arguments of a seed, and all that it leaves behind.
void AddCall(Checksum& sum, const MethodEntry& row, Format format, int chosen, int variant) {
  Noise noise(unsigned(chosen * Variants + variant));
  RandomState = unsigned(variant);
  // On either side of the vectors' widths.
  constexpr int widths[Variants] = {77, 5, 33, 130, 16, 64}, heights[Variants] = {7, 9, 8, 3, 12, 5};
  const int width = widths[variant], height = heights[variant];
  const Picture self = Filled(width, height, format, noise);
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
        picture = Filled(width, height, Format::G, noise);
      else if (name == "image" || name == "source" || name == "origpixels" || name == "other" ||
               variant % 3 == 2)
        picture = Filled(width + variant / 3, height + variant / 3,
                         variant % 2 ? Format(noise.Between(1, 13)) : format, noise);
      pictures.push_back(picture);
      value.Address = picture.Address();
    } else if (parameter.Type == "integer()") {
      std::vector<std::int32_t> numbers(variant % 2 ? 256 : 49);
      for (std::int32_t& number : numbers) number = noise.Between(-99, 300);
      others.push_back(IntegerArray(numbers));
      value.Address = others.back().Address();
    } else if (parameter.Type == "picture") {
      const HostPicture shown = Shown(width, height, noise);
      if (variant % 3) shown.MakeMask().SetRGB(noise.Many(std::size_t(width * height * 3)));
      others.push_back(shown);
      value.Address = shown.Address();
    } else if (parameter.Type == "memoryblock") {
      others.push_back(MemoryBlock(noise.Many(1 << 14)));
      value.Address = others.back().Address();
    } else if (parameter.Type == "double") {
      value.Real = Real(name, noise);
    } else if (parameter.Type == "boolean") {
      value.Whole = noise.Between(0, 1);
    } else {
      value = name == "mode" || name == "matrix" ? Value{.Whole = chosen} : Number(name, self, noise);
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
    sum.Add(block.Data().data(), block.Data().size());
  } else {
    GiveBack(type, outcome.Result);
  }
  if (row.Record->Setter) {
    Bytes bytes = noise.Many(1 << 13);
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

/// Every n-th line.
std::vector<std::string> Lines(int every = 1) {
  std::vector<std::string> lines;
  int number = 0;
  for (const MethodEntry& row : model::ClassNamed("PictureZOR").Methods) {
    if (DependsOnTheMachine(row)) continue;
    for (const int chosen : ChoicesOf(row))
      for (const Format format : EveryFormat()) {
        if (number++ % every != 0) continue;
        Checksum sum;
        for (int variant = 0; variant < Variants; ++variant) AddCall(sum, row, format, chosen, variant);
        char line[120];
        std::snprintf(line, sizeof line, "%s %d %d %08x", KeyOf(row).c_str(), chosen, int(format),
                      unsigned(sum.Folded()));
        lines.push_back(line);
      }
  }
  return lines;
}

std::string KeyOf(const std::string& line) { return line.substr(0, line.rfind(' ')); }

int Compare(const char* file, int every) {
  std::map<std::string, std::string> wanted;
  std::ifstream in(file);
  for (std::string line; std::getline(in, line);) wanted[KeyOf(line)] = line;
  int failures = 0;
  std::size_t compared = 0;
  const zor::Target best = TargetOfModule();
  for (int target = 0; target <= int(best); ++target) {
    TargetOfModule() = zor::Target(target);
    const std::vector<std::string> lines = Lines(every);
    compared += lines.size();
    // A row that is gone shows by the lines that are left over.
    if (every == 1 && lines.size() != wanted.size()) {
      ++failures;
      std::cout << lines.size() << " lines, " << wanted.size() << " in the file\n";
    }
    for (const std::string& line : lines) {
      const auto found = wanted.find(KeyOf(line));
      if (found != wanted.end() && found->second == line) continue;
      if (++failures <= 40) std::cout << "target " << target << ": " << line << "\n";
    }
  }
  std::cout << compared << " lines compared for " << int(best) + 1 << " instruction sets, " << failures
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
  for (const std::string& line : Lines()) std::cout << line << "\n";
}
