#include "support/row_arguments.h"

#include <algorithm>
#include <limits>
#include <map>

namespace picturezor {
namespace {

using model::MethodEntry;
using model::Parameter;

/// Room for all rows of the small pictures, in every format.
constexpr std::size_t BlockSize = 1 << 16;

constexpr std::int32_t Most = std::numeric_limits<std::int32_t>::max(),
                       Least = std::numeric_limits<std::int32_t>::min();

Value Of(const Object& object) { return {.Address = object.Address()}; }

}

Picture UnbuiltPicture() { return Picture(Object::Adopt(model::NewObject(model::ClassNamed("PictureZOR")))); }

RowArguments::RowArguments(StoredPicture::Kind kind, Format format)
    : First(kind, Width, Height, format),
      Second(kind, Width, Height, format),
      Dot(1, 1, PictureForm::GWorld32),
      Block(BlockSize),
      EmptyBlock(std::size_t{0}),
      Numbers(std::vector<std::int32_t>(256, 77)),
      NoNumbers(std::vector<std::int32_t>{}),
      FewNumbers({1, -2, 3}),
      ExtremeNumbers([] {
        std::vector<std::int32_t> values(256, Most);
        for (std::size_t i = 0; i < values.size(); i += 2) values[i] = Least;
        return values;
      }()),
      File(Path.Path()),
      NoFile(Path.Path() / "in" / "no" / "folder"),
      Folder(Path.Path().parent_path()),
      Factory([](std::int32_t width, std::int32_t height, Format of) { return Picture(width, height, of); }),
      EmptyFactory(PictureFactory::Handler{}),
      Text(model::NewString(Bytes(BlockSize, 'x'), model::UTF8)),
      EmptyText(model::NewString({}, model::UTF8)) {
  for (const PictureForm form : {PictureForm::GWorld32, PictureForm::GWorld24, PictureForm::GWorld16,
                                 PictureForm::Form2, PictureForm::None}) {
    Hosts.emplace_back(Width, Height, form);
    Hosts.back().MakeMask();
  }
  Hosts.emplace_back(1, 1);
  const Picture closed(Width, Height, format);
  closed.Close();
  Odd = {UnbuiltPicture(),
         closed,
         Picture(Width, Height, Format::Scaling4),
         Picture(1, 1, format),
         Self().ClipImage({Width, Height, 3, 3}),
         Self().MirroredView(),
         Picture(Width, Height, Format::CMYKA),
         Picture(Width, Height, Format::BGRA).GreenChannel()};
}

RowArguments::~RowArguments() {
  model::UnlockString(Text);
  model::UnlockString(EmptyText);
}

Value RowArguments::Ordinary(const MethodEntry& row, const Parameter& parameter) const {
  static const std::map<std::string, std::int64_t> known = {
      {"width", Width}, {"height", Height}, {"destwidth", Width},   {"destheight", Height}, {"w", Width},
      {"h", Height},    {"mode", 3},        {"imageformat", 2},     {"theimageformat", 2},  {"threads", 2},
      {"destx", 0},     {"desty", 0},       {"sourcex", 0},         {"sourcey", 0},         {"x", 0},
      {"y", 0},         {"rowsize", 64},    {"matrixdimension", 3}, {"levels", 4},          {"index", 0},
      {"alpha", 128}};
  const model::TypeName& type = parameter.Type;
  if (type == "integer" || type == "boolean" || type == "color") {
    const auto found = known.find(model::Lower(parameter.Name));
    return {.Whole = found == known.end() ? 1 : found->second};
  }
  if (type == "double") return {.Real = row.LowerName == "rotate" ? 30.0 : 1.5};
  if (type == "picturezor") return Of(Second.Get());
  if (type == "picture") return Of(Hosts[0]);
  if (type == "memoryblock") return Of(Block);
  if (type == "integer()") return Of(Numbers);
  if (type == "folderitem") return Of(File);
  if (type == "picturefactoryzor") return Of(Factory);
  if (type == "string") return {.Address = Text};
  return {};
}

std::vector<Value> RowArguments::Ordinary(const MethodEntry& row) const {
  std::vector<Value> arguments;
  for (const Parameter& parameter : row.Of.Parameters) arguments.push_back(Ordinary(row, parameter));
  return arguments;
}

Value RowArguments::Assigned(const MethodEntry& row) const { return Ordinary(row, {"value", row.Of.Result}); }

std::vector<Value> RowArguments::Hostile(const model::TypeName& type) const {
  if (type == "boolean") return {{.Whole = 0}, {.Whole = 1}, {.Whole = 2}, {.Whole = 255}};
  if (type == "integer" || type == "color")
    return {{.Whole = 0}, {.Whole = -1}, {.Whole = Most}, {.Whole = Least}};
  if (type == "double") {
    using Limits = std::numeric_limits<double>;
    std::vector<Value> values;
    for (const double value :
         {0.0, -0.0, -1.0, 1e-300, 1e300, -1e300, Limits::infinity(), -Limits::infinity(),
          Limits::quiet_NaN(), Limits::denorm_min(), Limits::max(), 2147483648.0, -2147483649.0})
      values.push_back({.Real = value});
    return values;
  }
  std::vector<Value> values(1);
  if (type == "picturezor") {
    values.push_back(Of(Self()));
    for (const Picture& picture : Odd) values.push_back(Of(picture));
  }
  if (type == "picture") {
    for (const HostPicture& picture : Hosts) values.push_back(Of(picture));
    values.push_back(Of(Dot));
  }
  if (type == "memoryblock") values.push_back(Of(EmptyBlock));
  if (type == "string") values.push_back({.Address = EmptyText});
  if (type == "integer()")
    for (const IntegerArray* array : {&NoNumbers, &FewNumbers, &ExtremeNumbers}) values.push_back(Of(*array));
  if (type == "folderitem")
    for (const FolderItem* item : {&NoFile, &Folder}) values.push_back(Of(*item));
  if (type == "picturefactoryzor") values.push_back(Of(EmptyFactory));
  return values;
}

bool KeepsPromises(const MethodEntry& row, const std::vector<Value>& arguments) {
  const auto& parameters = row.Of.Parameters;
  if (row.LowerName != "constructor" || parameters.empty() || parameters[0].Type != "memoryblock")
    return true;
  const auto* block = model::HeldBy<model::BlockPayload>(arguments[0].Address);
  const std::int64_t width = arguments[1].Whole, height = arguments[2].Whole, rowSize = arguments[4].Whole;
  if (!block || width < 1 || height < 1 || rowSize < 0) return true;
  const std::int64_t pixels = width * BytesPerPixel(Format(arguments[3].Whole));
  const double bytes = double(rowSize) * double(height - 1) + double(std::max(rowSize, pixels));
  return bytes <= double(block->Size);
}

}
