#include "quickdraw.h"

#include <cstring>

namespace picturezor::model::quickdraw {
namespace {

constexpr std::int32_t Done = 0, BadParameter = -50, NoMemory = -108;

constexpr std::int32_t GrayRamp = 40;
/// Nobody looks into a colour table: 8 bits are gray here.
const std::int32_t TheGrayRamp = GrayRamp;

void* PixMapOf(const char* service, void* gworld) {
  return Asked(service) && gworld ? &static_cast<GWorld*>(gworld)->Map : nullptr;
}
void* GetGWorldPixMap(void* gworld) { return PixMapOf("GetGWorldPixMap", gworld); }
void* GetPortPixMap(void* port) { return PixMapOf("GetPortPixMap", port); }

std::int32_t GetPixDepth(void* pixMap) {
  return Asked("GetPixDepth") ? static_cast<PixMap*>(pixMap)->Depth : 0;
}

unsigned char LockPixels(void* pixMap) {
  if (!Asked("LockPixels")) return 0;
  ++static_cast<PixMap*>(pixMap)->Locks;
  ++TheRuntime().Alive.PixelLocks;
  return 1;
}
void UnlockPixels(void* pixMap) {
  Asked("UnlockPixels");
  --static_cast<PixMap*>(pixMap)->Locks;
  --TheRuntime().Alive.PixelLocks;
}

void* GetPixBaseAddr(void* pixMap) {
  return Asked("GetPixBaseAddr") ? static_cast<PixMap*>(pixMap)->Pixels.data() : nullptr;
}
std::int32_t GetPixRowBytes(void* pixMap) {
  return Asked("GetPixRowBytes") ? static_cast<PixMap*>(pixMap)->RowBytes : 0;
}

std::int32_t NewGWorld(void** gworld, std::int32_t depth, const zor::QuickDrawBounds* bounds,
                       void* colourTable, void*, std::uint32_t) {
  if (!Asked("NewGWorld")) return NoMemory;
  const std::int32_t width = bounds->Right - bounds->Left, height = bounds->Bottom - bounds->Top;
  const bool known = depth == 16 || depth == 24 || depth == 32 || (depth == 8 && colourTable == &TheGrayRamp);
  if (!known || width < 1 || height < 1) return BadParameter;
  const std::int32_t pixelBytes = depth == 24 ? TheRuntime().BytesOfDepth24 : depth / 8;
  // Pixels of 3 bytes are told by their rows, which have no room for 4.
  const std::int32_t rowBytes = pixelBytes == 3 ? width * 3 : (width * pixelBytes + 15) / 16 * 16;
  *gworld = Created([&] { return new GWorld(width, height, depth, pixelBytes, rowBytes); });
  return *gworld ? Done : NoMemory;
}

void DisposeGWorld(void* gworld) {
  Asked("DisposeGWorld");
  delete static_cast<GWorld*>(gworld);
}

void* GetCTable(std::int32_t id) {
  return Asked("GetCTable") && id == GrayRamp ? const_cast<std::int32_t*>(&TheGrayRamp) : nullptr;
}

constexpr std::uint8_t Widened(int fiveBits) { return std::uint8_t(fiveBits << 3 | fiveBits >> 2); }

}

PixMap::PixMap(std::int32_t width, std::int32_t height, std::int32_t depth, std::int32_t pixelBytes,
               std::int32_t rowBytes)
    : Width(width),
      Height(height),
      Depth(depth),
      PixelBytes(pixelBytes),
      RowBytes(rowBytes),
      Pixels(std::size_t(rowBytes) * std::size_t(height)) {}

GWorld::~GWorld() {
  --TheRuntime().Alive.GWorlds;
  TheRuntime().Alive.PixelLocks -= Map.Locks;
}

Color ReadPixel(const std::uint8_t* p, std::int32_t depth, std::int32_t pixelBytes) {
  if (depth == 8) return {p[0], p[0], p[0]};
  if (depth == 16) {
    const int bits = p[0] << 8 | p[1];
    return {Widened(bits >> 10 & 31), Widened(bits >> 5 & 31), Widened(bits & 31)};
  }
  const std::uint8_t* rgb = p + pixelBytes - 3;
  return {rgb[0], rgb[1], rgb[2]};
}

void WritePixel(std::uint8_t* p, std::int32_t depth, std::int32_t pixelBytes, Color color) {
  if (depth == 16) {
    const int bits = (color.Red >> 3) << 10 | (color.Green >> 3) << 5 | color.Blue >> 3;
    p[0] = std::uint8_t(bits >> 8);
    p[1] = std::uint8_t(bits);
    return;
  }
  std::uint8_t* rgb = p + pixelBytes - 3;
  rgb[0] = color.Red;
  rgb[1] = color.Green;
  rgb[2] = color.Blue;
}

GWorld* OfInstance(void* instance) {
  GWorld* gworld;
  std::memcpy(&gworld, static_cast<const char*>(instance) + zor::GWorldAt, sizeof gworld);
  return gworld;
}

void DisposeOfInstance(void* instance) {
  // The byte behind the GWorld says that the instance owns it.
  if (static_cast<const char*>(instance)[zor::GWorldMarkAt] == 1) delete OfInstance(instance);
}

bool Asked(const char* service) {
  if (const auto& hook = TheRuntime().OnPictureService) hook(service);
  return !IsHidden(service);
}

std::span<const Service> Services() {
  static const Service services[] = {
      {"GetGWorldPixMap", AddressOf(GetGWorldPixMap)}, {"GetPortPixMap", AddressOf(GetPortPixMap)},
      {"GetPixDepth", AddressOf(GetPixDepth)},         {"LockPixels", AddressOf(LockPixels)},
      {"UnlockPixels", AddressOf(UnlockPixels)},       {"GetPixBaseAddr", AddressOf(GetPixBaseAddr)},
      {"GetPixRowBytes", AddressOf(GetPixRowBytes)},   {"NewGWorld", AddressOf(NewGWorld)},
      {"DisposeGWorld", AddressOf(DisposeGWorld)},     {"GetCTable", AddressOf(GetCTable)},
  };
  return services;
}

}
