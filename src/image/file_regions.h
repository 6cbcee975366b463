#pragma once
#include "image/picture_data.h"

namespace zor {

// A window is a part of a region, which is what is really mapped. Regions are somewhat larger than windows
// and stay while the window moves within them: a move costs a system call, and every page that comes back a
// fault. They begin and end at the pages of 2 MiB that the system can map at once, where it has the file in
// such.

/// Bytes first .. end - 1 of a file in the address space.
struct FileRegion {
  Sample* Start;
  std::int64_t First, End;
};

/// What a picture has mapped of its file: the region with its window, and the one before that, or one that
/// was asked for beside it.
struct FileRegions {
  FileRegion Window, Other;
};

/// The address of bytes first .. end - 1 of the file, of which nothing moves before the next call; null when
/// they can't be mapped. They become the window, and what the window was before stays if there is room;
/// `above` bytes in front of them are likely to be asked for next.
Sample* WindowBytes(PictureData& data, std::int64_t first, std::int64_t end, std::int64_t above);

/// The same beside the window, which stays. For no more than `MostBytesBeside`.
Sample* BytesBeside(PictureData& data, std::int64_t first, std::int64_t end);

/// 0 where addresses are scarce, or the window is the whole file.
std::int64_t MostBytesBeside(const PictureData& data);

/// Unmaps everything.
void DropRegions(PictureData& data);

}
