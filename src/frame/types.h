#pragma once
#include <cstdint>

#include "frame/records.h"

namespace zor {

// The host's types as arguments and results. A class is a pointer that only the host can look behind.
using Integer = std::int32_t;
using Int64 = std::int64_t;
using Double = double;
using Boolean = unsigned char;
using Color = std::int32_t;
struct HostString;
struct IntegerArray;
struct FolderItem;
struct HostPicture;
struct MemoryBlock;
struct PictureZOR;
struct PictureFactoryZOR;
struct Variant;

}
