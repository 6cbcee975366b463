#include "tiff_pages.h"

#include <algorithm>
#include <cmath>
#include <vector>

#include "failure.h"
#include "tiff_handle.h"

namespace picturezor::files {

namespace {

struct Place {
  std::uint64_t Directory = 0;
  Extent Size;
};

struct Page {
  Place Whole;
  /// Largest first.
  std::vector<Place> Smaller;
};

Place PlaceOf(const TIFFHandle& file) {
  const auto edge = [&](ttag_t tag) {
    return std::int32_t(std::min<std::uint32_t>(file.Get<std::uint32_t>(tag, 0), INT32_MAX));
  };
  return {TIFFCurrentDirOffset(file), {edge(TIFFTAG_IMAGEWIDTH), edge(TIFFTAG_IMAGELENGTH)}};
}

bool Is(const TIFFHandle& file, std::uint32_t kind) {
  return file.Get<std::uint32_t>(TIFFTAG_SUBFILETYPE, 0) & kind;
}

/// Whether one is the other made smaller, and not a thumbnail with bars or a part.
bool IsSmallerCopy(const Extent& small, const Extent& whole) {
  if (small.Width < 1 || small.Height < 1 || small.Width >= whole.Width) return false;
  const double proportion = double(small.Width) * whole.Height / (double(small.Height) * whole.Width);
  return std::abs(proportion - 1) < 0.01 + 1.0 / std::min(small.Width, small.Height);
}

/// What can't be read behind the first page ends the list.
std::vector<Page> PagesOf(const Input& input, std::int64_t memoryLimit) {
  constexpr std::size_t most = 65535;
  const auto file = TIFFHandle::Open(input, memoryLimit);
  std::vector<Page> pages;
  std::vector<std::pair<std::size_t, std::uint64_t>> below;
  do {
    const Place place = PlaceOf(*file);
    if (!pages.empty() && Is(*file, FILETYPE_MASK)) continue;
    if (!pages.empty() && Is(*file, FILETYPE_REDUCEDIMAGE)) {
      if (IsSmallerCopy(place.Size, pages.back().Whole.Size)) pages.back().Smaller.push_back(place);
      continue;
    }
    std::uint16_t count = 0;
    const std::uint64_t* places = nullptr;
    if (TIFFGetField(*file, TIFFTAG_SUBIFD, &count, &places))
      for (int i = 0; i < count; ++i) below.emplace_back(pages.size(), places[i]);
    pages.push_back({place, {}});
  } while (pages.size() < most && TIFFReadDirectory(*file));
  for (const auto& [page, directory] : below) {
    if (!TIFFSetSubDirectory(*file, directory) || !Is(*file, FILETYPE_REDUCEDIMAGE)) continue;
    if (const Place place = PlaceOf(*file); IsSmallerCopy(place.Size, pages[page].Whole.Size))
      pages[page].Smaller.push_back(place);
  }
  for (Page& page : pages)
    std::ranges::stable_sort(page.Smaller, std::greater(),
                             [](const Place& place) { return place.Size.Width; });
  return pages;
}

/// The same file with another directory as its first.
Input BeginningWith(const Input& input, std::uint64_t directory) {
  Bytes header = input.Start(4);
  const bool bigEndian = header[0] == 'M', big = header[bigEndian ? 3 : 2] == 43;
  const int size = big ? 8 : 4;
  Bytes place;
  for (int i = 0; i < size; ++i)
    place.push_back(std::uint8_t(directory >> 8 * (bigEndian ? size - 1 - i : i)));
  return input.With(size, std::move(place));
}

class PageReader final : public ImageReader {
 public:
  PageReader(const Input& input, Page page, int pages, TIFFOpener open)
      : From(input), Of(std::move(page)), Open(std::move(open)) {
    Reading = Open(BeginningWith(From, Of.Whole.Directory));
    About = Reading->Info();
    About.Pages = pages;
    for (const Place& place : Of.Smaller) About.Levels.push_back(place.Size);
  }

  void Reduce(std::int32_t leastWidth, std::int32_t leastHeight) override {
    for (auto place = Of.Smaller.rbegin(); place != Of.Smaller.rend(); ++place) {
      if (place->Size.Width < leastWidth || place->Size.Height < leastHeight) continue;
      auto smaller = Open(BeginningWith(From, place->Directory));
      if (smaller->Info().Pixels != About.Pixels) continue;
      Reading = std::move(smaller);
      return TakeSize();
    }
  }

  bool Select(const Rect& part) override {
    const bool can = Reading->Select(part);
    TakeSize();
    return can;
  }
  bool StartsAnywhere() const override { return Reading->StartsAnywhere(); }
  void ReadRow(std::uint8_t* row) override { Reading->ReadRow(row); }
  void ReadRows(std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count) override {
    Reading->ReadRows(rows, stride, count);
  }
  void Finish() override { Reading->Finish(); }

 private:
  void TakeSize() {
    About.Width = Reading->Info().Width;
    About.Height = Reading->Info().Height;
  }

  Input From;
  Page Of;
  TIFFOpener Open;
  std::unique_ptr<ImageReader> Reading;
};

}

std::unique_ptr<ImageReader> OpenTIFFPage(const Input& input, const ReadOptions& options, TIFFOpener open) {
  std::vector<Page> pages = PagesOf(input, options.MemoryLimit);
  RequirePage(input, options, int(pages.size()));
  Page& page = pages[std::size_t(options.Page)];
  if (pages.size() == 1 && page.Smaller.empty()) return open(input);
  return std::make_unique<PageReader>(input, std::move(page), int(pages.size()), std::move(open));
}

}
