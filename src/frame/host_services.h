#pragma once
#include <atomic>

#include "frame/declaration.h"
#include "frame/records.h"
#include "frame/types.h"

namespace zor {

/// The address of a service of the host; null when the host doesn't know the name, or before load.
void* Resolve(const char* name);

/// From now on services are asked for through `resolver`, or not at all when it is null.
void SetResolver(Resolver resolver);

/// A service of the host, called like a function. Its address is looked up at the first call and kept; while
/// the name doesn't resolve a call gives 0 and the next one tries again. For host threads only, any of them.
template <Text Name, class Signature>
struct Service;

template <Text Name, class Result, class... Arguments>
struct Service<Name, Result(Arguments...)> {
  Result operator()(Arguments... arguments) const {
    static constinit std::atomic<Result (*)(Arguments...)> slot = nullptr;
    auto* service = slot.load(std::memory_order_relaxed);
    if (!service) {
      service = reinterpret_cast<Result (*)(Arguments...)>(Resolve(Name.Characters));
      slot.store(service, std::memory_order_relaxed);
    }
    return service ? service(arguments...) : Result();
  }
};

inline constexpr Service<"RegisterPluginVersion", void(std::int32_t)> RegisterPluginVersion;
inline constexpr Service<"REALGetRBVersion", double()> REALGetRBVersion;
inline constexpr Service<"PluginRegisterClass", void(void*)> PluginRegisterClass;
inline constexpr Service<"PluginNewInstance", void*(const char*)> PluginNewInstance;
inline constexpr Service<"REALLockObject", void(void*)> REALLockObject;
inline constexpr Service<"REALUnlockObject", void(void*)> REALUnlockObject;
inline constexpr Service<"GetEventInstancePPC", void*(void*, Word)> GetEventInstancePPC;
inline constexpr Service<"REALBuildString", HostString*(const void*, std::int32_t)> REALBuildString;
inline constexpr Service<"REALSetStringEncoding", void(HostString*, std::uint32_t)> REALSetStringEncoding;
inline constexpr Service<"REALConvertString", HostString*(HostString*, std::uint32_t)> REALConvertString;
inline constexpr Service<"REALUnlockString", void(HostString*)> REALUnlockString;
inline constexpr Service<"RuntimeRaiseException", void(void*)> RuntimeRaiseException;
inline constexpr Service<"REALSetPropValueString", unsigned char(void*, const char*, HostString*)>
    REALSetPropValueString;
inline constexpr Service<"REALGetPropValueInt", unsigned char(void*, const char*, std::int32_t*)>
    REALGetPropValueInt;
inline constexpr Service<"newMemoryBlock", MemoryBlock*(std::int32_t)> newMemoryBlock;
inline constexpr Service<"memoryBlockGetPtr", void*(MemoryBlock*)> memoryBlockGetPtr;
inline constexpr Service<"PtrToMemoryBlock", MemoryBlock*(void*)> PtrToMemoryBlock;
inline constexpr Service<"REALYieldToRB", void()> REALYieldToRB;
inline constexpr Service<"REALFSRefFromFolderItem", unsigned char(FolderItem*, void*, void*)>
    REALFSRefFromFolderItem;
inline constexpr Service<"RuntimeUBound", std::int32_t(IntegerArray*)> RuntimeUBound;
inline constexpr Service<"RuntimeDirectReadIntArray", std::int32_t(IntegerArray*, std::int32_t)>
    RuntimeDirectReadIntArray;

inline constexpr Service<"lockPictureDescription", void(HostPicture*, PictureDescription*)>
    lockPictureDescription;
inline constexpr Service<"REALLockPictureDescription",
                         unsigned char(HostPicture*, PictureDescription*, std::int32_t)>
    REALLockPictureDescription;
inline constexpr Service<"unlockPictureDescription", void(HostPicture*)> unlockPictureDescription;
inline constexpr Service<"newPicture", HostPicture*(std::int32_t, std::int32_t, std::int32_t)> newPicture;
inline constexpr Service<"REALPictureClearCache", void(HostPicture*)> REALPictureClearCache;
inline constexpr Service<"pluginPictureGraphicsGetter", void*(HostPicture*)> pluginPictureGraphicsGetter;
inline constexpr Service<"REALGetPictureMask",
                         HostPicture*(HostPicture*, std::int32_t, std::int32_t, std::int32_t)>
    REALGetPictureMask;
inline constexpr Service<"REALLoadObjectMethod", void*(void*, const char*)> REALLoadObjectMethod;

// QuickDraw, where the host has one.
inline constexpr Service<"GetGWorldPixMap", void*(void*)> GetGWorldPixMap;
inline constexpr Service<"GetPortPixMap", void*(void*)> GetPortPixMap;
inline constexpr Service<"GetPixDepth", std::int32_t(void*)> GetPixDepth;
inline constexpr Service<"LockPixels", unsigned char(void*)> LockPixels;
inline constexpr Service<"UnlockPixels", void(void*)> UnlockPixels;
inline constexpr Service<"GetPixBaseAddr", void*(void*)> GetPixBaseAddr;
inline constexpr Service<"GetPixRowBytes", std::int32_t(void*)> GetPixRowBytes;
inline constexpr Service<"NewGWorld", std::int32_t(void**, std::int32_t, const QuickDrawBounds*, void*, void*,
                                                   std::uint32_t)>
    NewGWorld;
inline constexpr Service<"DisposeGWorld", void(void*)> DisposeGWorld;
inline constexpr Service<"GetCTable", void*(std::int32_t)> GetCTable;

}
