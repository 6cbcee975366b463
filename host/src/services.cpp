#include <algorithm>
#include <climits>
#include <cstring>
#include <filesystem>
#include <span>
#include <stdexcept>
#include <utility>

#include "host_strings.h"
#include "pictures.h"
#include "quickdraw.h"

// The services that the module asks for by name. Each has the C type that the module calls it by.

namespace picturezor::model {
namespace {

void RegisterPluginVersion(std::int32_t) {}
double REALGetRBVersion() { return TheRuntime().Version; }

void PluginRegisterClass(void* record) {
  Guarded(0, [&] {
    Register(static_cast<zor::ClassRecord*>(record));
    return 0;
  });
}

void* PluginNewInstance(const char* className) {
  const Class* of = IsHidden(className) ? nullptr : FindClass(className);
  if (!of) return nullptr;
  const bool exception = of->Name.ends_with("Exception");
  return Created([&] { return NewObject(*of, exception ? std::make_unique<ExceptionPayload>() : nullptr); });
}

void REALLockObject(void* object) { Lock(object); }
void REALUnlockObject(void* object) { Unlock(object); }

void* CallNewPicture(void* factory, std::int32_t width, std::int32_t height, std::int32_t format) {
  return Guarded<void*>(nullptr,
                        [&] { return HeldBy<FactoryPayload>(factory)->NewPicture(width, height, format); });
}

void* GetEventInstancePPC(void* object, std::uintptr_t eventWord) {
  const auto* factory = HeldBy<FactoryPayload>(object);
  return factory && factory->NewPicture && eventWord == 1 ? reinterpret_cast<void*>(CallNewPicture) : nullptr;
}

void* REALBuildString(const void* bytes, std::int32_t length) {
  if (length < 0) return nullptr;
  const auto* begin = static_cast<const std::uint8_t*>(bytes);
  return Created([&] { return NewString(Bytes(begin, begin + length), 0); });
}
void REALSetStringEncoding(void* string, std::uint32_t encoding) {
  if (string) static_cast<StringRecord*>(string)->Encoding = encoding;
}
void* REALConvertString(void* string, std::uint32_t encoding) {
  if (!string) return nullptr;
  return Created([&] { return Converted(*static_cast<StringRecord*>(string), encoding); });
}
void REALUnlockString(void* string) { UnlockString(static_cast<StringRecord*>(string)); }

void RuntimeRaiseException(void* exception) { Unlock(std::exchange(PendingHere().Raised, exception)); }

unsigned char REALSetPropValueString(void* object, const char* name, void* string) {
  auto* exception = HeldBy<ExceptionPayload>(object);
  if (!exception || std::strcmp(name, "Message") != 0) return 0;
  exception->Message = string ? TextOf(*static_cast<StringRecord*>(string)) : "";
  return 1;
}

void* newMemoryBlock(std::int32_t size) {
  if (size < 0) return nullptr;
  return Created([&] { return NewBlock(Bytes(std::size_t(size))); });
}
void* memoryBlockGetPtr(void* block) {
  const auto* payload = HeldBy<BlockPayload>(block);
  return payload ? payload->Start : nullptr;
}
void* PtrToMemoryBlock(void* address) {
  return Created([&] { return NewBlock(address); });
}

std::shared_ptr<const std::function<void()>> YieldHook() {
  Runtime& runtime = TheRuntime();
  const std::lock_guard lock(runtime.YieldMutex);
  return runtime.OnYield;
}

void REALYieldToRB() {
  Guarded(0, [] {
    // Held, since the hook, or another thread, may set another one.
    if (const auto hook = YieldHook()) (*hook)();
    return 0;
  });
}

/// The path in 4096 bytes with its end; false when it doesn't fit.
bool WriteReference(const std::string& path, void* reference) {
  constexpr std::size_t Size = 4096;
  if (path.size() >= Size) return false;
  std::memcpy(reference, path.c_str(), path.size() + 1);
  return true;
}

/// The name as a length and up to 255 UTF-16 units.
bool WriteName(const std::string& name, void* into) {
  std::u16string units;
  if (!ToUTF16(name, units) || units.empty() || units.size() > 255) return false;
  std::uint16_t record[256] = {std::uint16_t(units.size())};
  std::ranges::copy(units, record + 1);
  std::memcpy(into, record, sizeof record);
  return true;
}

unsigned char REALFSRefFromFolderItem(void* item, void* reference, void* nameOrNull) {
  return Guarded<unsigned char>(0, [&]() -> unsigned char {
    const auto* file = HeldBy<FilePayload>(item);
    if (!file || file->Path.empty()) return 0;
    const std::filesystem::path path = std::filesystem::absolute(file->Path);
    std::error_code error;
    if (!nameOrNull) return std::filesystem::exists(path, error) && WriteReference(path.string(), reference);
    const std::filesystem::path parent = path.parent_path();
    return std::filesystem::is_directory(parent, error) && WriteReference(parent.string(), reference) &&
           WriteName(path.filename().string(), nameOrNull);
  });
}

std::int32_t RuntimeUBound(void* array) {
  const auto* payload = HeldBy<ArrayPayload>(array);
  return payload ? std::int32_t(payload->Values.size()) - 1 : -1;
}
std::int32_t RuntimeDirectReadIntArray(void* array, std::int32_t index) {
  return Guarded(0, [&] {
    const auto* payload = HeldBy<ArrayPayload>(array);
    if (!payload) throw std::out_of_range("an element of nil was read");
    return payload->Values.at(std::size_t(index));
  });
}

void* ResolveSecond(const char* name) { return ServiceNamed(name); }

const Service Services[] = {
    {"ResolverPPC", AddressOf(ResolveSecond)},
    {"RegisterPluginVersion", AddressOf(RegisterPluginVersion)},
    {"REALGetRBVersion", AddressOf(REALGetRBVersion)},
    {"PluginRegisterClass", AddressOf(PluginRegisterClass)},
    {"PluginNewInstance", AddressOf(PluginNewInstance)},
    {"REALLockObject", AddressOf(REALLockObject)},
    {"REALUnlockObject", AddressOf(REALUnlockObject)},
    {"GetEventInstancePPC", AddressOf(GetEventInstancePPC)},
    {"REALBuildString", AddressOf(REALBuildString)},
    {"REALSetStringEncoding", AddressOf(REALSetStringEncoding)},
    {"REALConvertString", AddressOf(REALConvertString)},
    {"REALUnlockString", AddressOf(REALUnlockString)},
    {"RuntimeRaiseException", AddressOf(RuntimeRaiseException)},
    {"REALSetPropValueString", AddressOf(REALSetPropValueString)},
    {"newMemoryBlock", AddressOf(newMemoryBlock)},
    {"memoryBlockGetPtr", AddressOf(memoryBlockGetPtr)},
    {"PtrToMemoryBlock", AddressOf(PtrToMemoryBlock)},
    {"REALYieldToRB", AddressOf(REALYieldToRB)},
    {"REALFSRefFromFolderItem", AddressOf(REALFSRefFromFolderItem)},
    {"RuntimeUBound", AddressOf(RuntimeUBound)},
    {"RuntimeDirectReadIntArray", AddressOf(RuntimeDirectReadIntArray)},
};

}

void* ServiceNamed(const char* name) {
  if (IsHidden(name)) return nullptr;
  for (const std::span<const Service> services :
       {std::span<const Service>(Services), PictureServices(), quickdraw::Services()})
    for (const Service& service : services)
      if (!std::strcmp(service.Name, name)) return service.Address;
  return nullptr;
}

}
