#include "png_blocks.h"

#include <zlib.h>

#include <algorithm>
#include <cstring>
#include <new>

#include "png_rows.h"

namespace picturezor::files {

namespace {

constexpr std::size_t BlockBytes = 512 << 10, SampleBytes = 96 << 10, Window = 32 << 10;
constexpr int BlocksPerTry = 4, UsualLevel = 6;
/// Rows of this size leave no room for several blocks at a time.
constexpr std::size_t LargeRow = 16 << 20;

struct Deflate {
  z_stream Stream{};
  Deflate(int level, int strategy) {
    if (deflateInit2(&Stream, level, Z_DEFLATED, -15, 9, strategy) != Z_OK) throw std::bad_alloc();
  }
  Deflate(const Deflate&) = delete;
  ~Deflate() { deflateEnd(&Stream); }
};

Bytes DeflatedBy(int level, int strategy, const Bytes& data, const Bytes& past, bool last) {
  Deflate deflater(level, strategy);
  z_stream& stream = deflater.Stream;
  const std::size_t used = std::min(past.size(), Window);
  if (used > 0) deflateSetDictionary(&stream, past.data() + past.size() - used, uInt(used));
  // A flush adds a few bytes to the bound.
  Bytes packed(deflateBound(&stream, uLong(data.size())) + 16);
  stream.next_in = const_cast<Bytef*>(data.data());
  stream.avail_in = uInt(data.size());
  stream.next_out = packed.data();
  stream.avail_out = uInt(std::min<std::size_t>(packed.size(), UINT32_MAX));
  deflate(&stream, last ? Z_FINISH : Z_SYNC_FLUSH);
  packed.resize(stream.total_out);
  return packed;
}

}

PNGBlocks::PNGBlocks(std::size_t rowBytes, int step, std::int64_t rows, std::optional<int> level, int threads,
                     Sink sink)
    : RowBytes(rowBytes),
      // What fills a window, and one more for the filter.
      PastRows(Window / (rowBytes + 1) + 2),
      RowsPerBlock(std::max<std::size_t>(1, BlockBytes / rowBytes)),
      Step(step),
      Level(level.value_or(UsualLevel)),
      Height(rows),
      Into(std::move(sink)),
      MostWaiting(rowBytes < LargeRow ? 2 * std::size_t(ThreadsFor(threads)) : 1),
      Blocks(rowBytes < LargeRow ? ThreadsFor(threads) : 1, [this](Block& block, int) { Pack(block); }) {
  Start();
}

void PNGBlocks::Start() {
  const Block* before = Open.get();
  auto block = std::make_unique<Block>();
  block->First = !before;
  block->Tries = Number++ % BlocksPerTry == 0;
  if (before) {
    block->Before = before->Mine;
    const std::size_t stored = before->Above + before->Count;
    block->Above = std::min(PastRows, stored);
    block->FromTop = before->FromTop && block->Above == stored;
    block->Rows.assign(before->Rows.end() - std::ptrdiff_t(block->Above * RowBytes), before->Rows.end());
  } else {
    block->FromTop = true;
  }
  block->Mine = block->Tries ? std::make_shared<std::atomic<int>>(Unknown) : before->Mine;
  block->Rows.reserve((block->Above + RowsPerBlock) * RowBytes);
  if (Open) {
    Blocks.Put(std::move(Open));
    while (Blocks.Size() >= MostWaiting) GiveOldest();
  }
  Open = std::move(block);
}

void PNGBlocks::Add(const std::uint8_t* row) {
  if (Open->Count == RowsPerBlock) Start();
  Open->Rows.insert(Open->Rows.end(), row, row + RowBytes);
  ++Open->Count;
  if (++Begun < Height) return;
  Open->Last = true;
  Blocks.Put(std::move(Open));
  while (Blocks.Size() > 0) GiveOldest();
}

void PNGBlocks::GiveOldest() {
  const auto block = Blocks.Take();
  Sum = std::uint32_t(adler32_combine(Sum, block->Sum, z_off_t(block->Count * (RowBytes + 1))));
  if (block->First) block->Packed.insert(block->Packed.begin(), {0x78, 0x9C});
  if (block->Last)
    for (int shift = 24; shift >= 0; shift -= 8) block->Packed.push_back(std::uint8_t(Sum >> shift));
  Into(block->Packed);
}

void PNGBlocks::Pack(Block& block) const {
  if (block.Tries) {
    // Even if it fails: others wait for it.
    Way way = Drawing;
    const auto tell = [&] {
      *block.Mine = way;
      block.Mine->notify_all();
    };
    try {
      way = Choose(block);
    } catch (...) {
      tell();
      throw;
    }
    tell();
  }
  // The blocks before have begun, or this one hadn't.
  block.Mine->wait(Unknown);
  const int way = *block.Mine;
  const Bytes data = Filtered(block, block.Above, block.Count, way);
  Bytes past;
  if (block.Above > 0) {
    block.Before->wait(Unknown);
    const std::size_t first = block.FromTop ? 0 : 1;
    past = Filtered(block, first, block.Above - first, *block.Before);
  }
  block.Sum = std::uint32_t(adler32_z(1, data.data(), data.size()));
  block.Packed = Deflated(data, past, way, block.Last);
  if (!block.Last) block.Rows = {};
}

PNGBlocks::Way PNGBlocks::Choose(const Block& block) const {
  if (Level < 2) return Level == 0 ? Drawing : Photograph;
  const std::size_t count = std::min(block.Count, SampleBytes / RowBytes + 1);
  const std::size_t first = block.Above + (block.Count - count) / 2;
  // Repetitions are found in the rows above, too.
  const std::size_t past = std::min(first > 0 ? first - 1 : 0, PastRows);
  const auto size = [&](Way way) {
    return DeflatedBy(Level, way == Photograph ? Z_RLE : Z_DEFAULT_STRATEGY,
                      Filtered(block, first, count, way), Filtered(block, first - past, past, way), true)
        .size();
  };
  return size(Photograph) < size(Drawing) ? Photograph : Drawing;
}

Bytes PNGBlocks::Filtered(const Block& block, std::size_t first, std::size_t count, int way) const {
  Bytes out(count * (RowBytes + 1)), spare, zeros;
  if (way == Photograph) spare.resize(RowBytes + 1);
  if (first == 0) zeros.resize(RowBytes);
  for (std::size_t i = 0; i < count; ++i) {
    const std::uint8_t* row = block.Rows.data() + (first + i) * RowBytes;
    std::uint8_t* to = &out[i * (RowBytes + 1)];
    if (way == Photograph)
      FilterRow(row, first + i == 0 ? zeros.data() : row - RowBytes, to, spare.data(), RowBytes, Step);
    else
      std::memcpy(to + 1, row, RowBytes);
  }
  return out;
}

Bytes PNGBlocks::Deflated(const Bytes& data, const Bytes& past, int way, bool last) const {
  Bytes packed = DeflatedBy(Level, way == Photograph ? Z_RLE : Z_DEFAULT_STRATEGY, data, past, last);
  constexpr int patient = 7;
  if (way == Photograph && Level >= patient) {
    Bytes other = DeflatedBy(Level, Z_DEFAULT_STRATEGY, data, past, last);
    if (other.size() < packed.size()) packed = std::move(other);
  }
  return packed;
}

}
