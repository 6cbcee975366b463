#include "pictures.h"

#include <algorithm>
#include <cstring>

// Pictures of the host, and the services that the module asks about them.

namespace picturezor::model {
namespace {

using quickdraw::Asked;

constexpr std::int32_t MostPixels = 32767;

struct Shape {
  std::int32_t Depth, RowBytes;
};

Shape ShapeOf(std::int32_t width, PictureForm form) {
  if (form == PictureForm::GWorld24) return {24, width * 3 + 5};
  if (form == PictureForm::GWorld16) return {16, width * 2 + 2};
  return {32, form == PictureForm::Rows ? width * 4 : (width * 4 + 15) / 16 * 16};
}

/// What the module calls the form.
std::int32_t KindOf(PictureForm form) {
  switch (form) {
    case PictureForm::GWorld32:
    case PictureForm::GWorld24:
    case PictureForm::GWorld16: return zor::GWorldForm;
    case PictureForm::Form1: return 1;
    case PictureForm::Form2: return 2;
    case PictureForm::Form3: return 3;
    case PictureForm::Rows: return zor::RowTableForm;
    case PictureForm::None: break;
  }
  return 0;
}

template <class T>
void Put(std::vector<std::uint8_t>& record, std::size_t at, T value) {
  std::memcpy(record.data() + at, &value, sizeof value);
}

void Describe(PicturePayload& picture, zor::PictureDescription* out) {
  const quickdraw::PixMap& map = picture.World.Map;
  const std::int32_t kind = KindOf(picture.Form);
  void* data = kind == zor::GWorldForm     ? static_cast<void*>(&picture.World)
               : kind == zor::RowTableForm ? picture.Record.data()
                                           : nullptr;
  *out = {kind, data, map.Width, map.Height, {-1, -1}};
  ++TheRuntime().Alive.OpenDescriptions;
}

void lockPictureDescription(void* picture, void* out) {
  if (auto* held = HeldBy<PicturePayload>(picture); Asked("lockPictureDescription") && held)
    Describe(*held, static_cast<zor::PictureDescription*>(out));
}

unsigned char REALLockPictureDescription(void* picture, void* out, std::int32_t form) {
  auto* held = HeldBy<PicturePayload>(picture);
  if (!Asked("REALLockPictureDescription") || !held || form == zor::GWorldForm || KindOf(held->Form) != form)
    return 0;
  Describe(*held, static_cast<zor::PictureDescription*>(out));
  return 1;
}

void unlockPictureDescription(void* picture) {
  if (Asked("unlockPictureDescription") && HeldBy<PicturePayload>(picture))
    --TheRuntime().Alive.OpenDescriptions;
}

void* newPicture(std::int32_t width, std::int32_t height, std::int32_t depth) {
  if (!Asked("newPicture") || depth != 32) return nullptr;
  const Runtime& runtime = TheRuntime();
  return Created([&] {
    return NewPicture(width - runtime.MissingColumns, height - runtime.MissingRows, runtime.Pictures);
  });
}

void REALPictureClearCache(void* picture) {
  if (auto* held = HeldBy<PicturePayload>(picture); Asked("REALPictureClearCache") && held)
    ++held->CacheClears;
}

void* pluginPictureGraphicsGetter(void* picture) {
  if (!Asked("pluginPictureGraphicsGetter") || !HeldBy<PicturePayload>(picture)) return nullptr;
  return Created([&] {
    auto payload = std::make_unique<GraphicsPayload>();
    payload->Target = Object::Share(picture);
    return NewObject(ClassNamed("Graphics"), std::move(payload));
  });
}

void* REALGetPictureMask(void* picture, std::int32_t create, std::int32_t, std::int32_t) {
  auto* held = HeldBy<PicturePayload>(picture);
  if (!Asked("REALGetPictureMask") || !held) return nullptr;
  if (held->Mask || !create) return MaskOf(*held, false);
  return Created([&] { return MaskOf(*held, true); });
}

void DrawPicture(void* graphics, void* image, std::int32_t x, std::int32_t y, std::int32_t w, std::int32_t h,
                 std::int32_t sx, std::int32_t sy, std::int32_t sw, std::int32_t sh) {
  auto* on = HeldBy<GraphicsPayload>(graphics);
  auto* target = on ? HeldBy<PicturePayload>(on->Target.Address()) : nullptr;
  auto* source = HeldBy<PicturePayload>(image);
  if (Asked("DrawPicture") && target && source) Draw(*target, *source, {x, y, w, h, sx, sy, sw, sh});
}

void* REALLoadObjectMethod(void* object, const char* declaration) {
  if (!Asked("REALLoadObjectMethod") || IsHidden("DrawPicture") || !HeldBy<GraphicsPayload>(object))
    return nullptr;
  return Guarded<void*>(nullptr, [&]() -> void* {
    const Declaration asked = ParseDeclaration(declaration);
    const bool known = asked.Name == "DrawPicture" && asked.Parameters.size() == 9 &&
                       asked.Parameters[0].Type == "picture" && asked.Result.empty();
    return known ? AddressOf(DrawPicture) : nullptr;
  });
}

unsigned char REALGetPropValueInt(void* object, const char* name, std::int32_t* out) {
  const auto* held = HeldBy<PicturePayload>(object);
  const bool width = !std::strcmp(name, "Width");
  if (!Asked("REALGetPropValueInt") || !held || (!width && std::strcmp(name, "Height") != 0)) return 0;
  *out = width ? held->World.Map.Width : held->World.Map.Height;
  return 1;
}

/// The line of the source that line `at` of `count` shows; negative for none.
std::int64_t Nearest(std::int64_t at, std::int32_t count, std::int32_t first, std::int32_t sourceCount,
                     std::int32_t size) {
  const std::int64_t line = first + at * sourceCount / count;
  return line < size ? line : -1;
}

}

PicturePayload::PicturePayload(std::int32_t width, std::int32_t height, PictureForm form)
    : Form(form),
      World(width, height, ShapeOf(width, form).Depth, ShapeOf(width, form).Depth / 8,
            ShapeOf(width, form).RowBytes) {
  for (std::int32_t y = 0; y < height; ++y)
    Rows.push_back(World.Map.Row(form == PictureForm::Rows ? height - 1 - y : y));
  for (std::int32_t x = 0; x < width; ++x) Set(x, 0, {255, 255, 255});
  const std::size_t rowBytes = std::size_t(width) * std::size_t(World.Map.PixelBytes);
  for (std::int32_t y = 1; y < height; ++y) std::memcpy(PixelAt(0, y), PixelAt(0, 0), rowBytes);
  if (form != PictureForm::Rows) return;
  Record.resize(zor::RowRecord::Size);
  Put(Record, zor::RowRecord::Width, width);
  Put(Record, zor::RowRecord::Height, height);
  Put(Record, zor::RowRecord::NotZero, std::int32_t{1});
  Put(Record, zor::RowRecord::Rows, Rows.data());
}

void Draw(PicturePayload& target, PicturePayload& source, const Drawing& d) {
  const quickdraw::PixMap &to = target.World.Map, &from = source.World.Map;
  // Without a size the source is taken whole.
  const std::int32_t sourceWidth = d.SourceWidth == -10000 ? from.Width : d.SourceWidth;
  const std::int32_t sourceHeight = d.SourceHeight == -10000 ? from.Height : d.SourceHeight;
  if (d.Width < 1 || d.Height < 1 || sourceWidth < 1 || sourceHeight < 1) return;
  const auto firstOf = [](std::int32_t at) { return at < 0 ? -std::int64_t{at} : 0; };
  const auto endOf = [](std::int32_t at, std::int32_t count, std::int32_t size) {
    return std::min<std::int64_t>(count, std::int64_t{size} - at);
  };
  const std::int64_t firstColumn = firstOf(d.X), endColumn = endOf(d.X, d.Width, to.Width);
  for (std::int64_t j = firstOf(d.Y); j < endOf(d.Y, d.Height, to.Height); ++j) {
    const std::int64_t y = Nearest(j, d.Height, d.SourceY, sourceHeight, from.Height);
    if (y < 0) continue;
    if (to.Depth == from.Depth && d.Width == sourceWidth) {
      // Not scaled along the row: a run of pixels.
      const std::int64_t first = std::max<std::int64_t>(firstColumn, -std::int64_t{d.SourceX});
      const std::int64_t count = std::min(endColumn, std::int64_t{from.Width} - d.SourceX) - first;
      if (count > 0)
        std::memmove(target.PixelAt(std::int32_t(d.X + first), std::int32_t(d.Y + j)),
                     source.PixelAt(std::int32_t(d.SourceX + first), std::int32_t(y)),
                     std::size_t(count * to.PixelBytes));
      continue;
    }
    for (std::int64_t i = firstColumn; i < endColumn; ++i)
      if (const std::int64_t x = Nearest(i, d.Width, d.SourceX, sourceWidth, from.Width); x >= 0)
        target.Set(std::int32_t(d.X + i), std::int32_t(d.Y + j),
                   source.Get(std::int32_t(x), std::int32_t(y)));
  }
}

void* NewPicture(std::int32_t width, std::int32_t height, PictureForm form) {
  if (width < 1 || width > MostPixels || height < 1 || height > MostPixels) return nullptr;
  return NewObject(ClassNamed("Picture"), std::make_unique<PicturePayload>(width, height, form));
}

void* MaskOf(PicturePayload& picture, bool create) {
  const quickdraw::PixMap& map = picture.World.Map;
  if (!picture.Mask && create) picture.Mask = Object::Adopt(NewPicture(map.Width, map.Height, picture.Form));
  Lock(picture.Mask.Address());
  return picture.Mask.Address();
}

std::span<const Service> PictureServices() {
  static const Service services[] = {
      {"lockPictureDescription", AddressOf(lockPictureDescription)},
      {"REALLockPictureDescription", AddressOf(REALLockPictureDescription)},
      {"unlockPictureDescription", AddressOf(unlockPictureDescription)},
      {"newPicture", AddressOf(newPicture)},
      {"REALPictureClearCache", AddressOf(REALPictureClearCache)},
      {"pluginPictureGraphicsGetter", AddressOf(pluginPictureGraphicsGetter)},
      {"REALGetPictureMask", AddressOf(REALGetPictureMask)},
      {"REALLoadObjectMethod", AddressOf(REALLoadObjectMethod)},
      {"REALGetPropValueInt", AddressOf(REALGetPropValueInt)},
  };
  return services;
}

}
