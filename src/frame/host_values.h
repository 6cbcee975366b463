#pragma once
#include "frame/types.h"

namespace zor {

/// Raises a new exception of the named host class, or NilObjectException where the host doesn't have it, with
/// a message unless that is null. It takes effect when the method returns to the host: the caller returns
/// its failure value at once.
void RaiseHostException(const char* className, const char* message);

inline constexpr std::uint32_t EncodingUTF16 = 0x0100, EncodingASCII = 0x0600, EncodingUTF8 = 0x08000100,
                               EncodingUTF32 = 0x0C000100, EncodingBytes = 0xFFFF;

/// A host string of `length` bytes with a reference for the caller; null without bytes or memory.
/// UTF-16 and UTF-32 reach the host as UTF-8, a UTF-32 unit above 0xFFFF as its low 16 bits; all other bytes
/// are tagged with their encoding and kept.
HostString* BuildHostString(const void* bytes, std::int32_t length, std::uint32_t encoding);

/// The bytes of a host string, in place; null when it has none.
const unsigned char* BytesOf(const HostString* string);

/// A new block with a copy of the bytes and a reference for the caller; null without bytes or memory.
MemoryBlock* MemoryBlockFromBytes(const void* bytes, std::int32_t size);

/// The path of a file that may not exist yet, as `calloc`ed UTF-8 that the caller frees. Null for a nil item,
/// one without a name, or one that the host can't place.
char* FolderItemToPath(FolderItem* item);

}
