#include "band_chain.h"

#include <algorithm>

#include "failure.h"

namespace picturezor::flow {

BandChain::BandChain(std::vector<const Operation*> chain, const Shape& source)
    : Chain(std::move(chain)), Shapes{source} {
  for (const Operation* work : Chain) {
    Needs.push_back(work->DependsOn(Shapes.back()));
    Shapes.push_back(work->Result(Shapes.back()));
  }
}

std::int64_t BandChain::Margin() const {
  std::int64_t rows = 0;
  for (const Dependence& needs : Needs) rows += 2 * std::int64_t{needs.Reach} + needs.Period - 1;
  return rows;
}

bool BandChain::KeepsSource() const {
  return std::ranges::all_of(Needs, [](const Dependence& needs) { return needs.KeepsSource; });
}

std::int64_t BandChain::BytesOfRow() const {
  std::int64_t most = Source().RowBytes();
  for (std::size_t i = 0; i < Chain.size(); ++i) {
    const std::int64_t from = Shapes[i].RowBytes(), to = Shapes[i + 1].RowBytes();
    most = std::max({most, from * Chain[i]->Pictures(), from + to});
  }
  return most;
}

std::vector<RowRange> BandChain::Ranges(RowRange result) const {
  std::vector<RowRange> ranges(Shapes.size());
  ranges.back() = result;
  for (std::size_t i = Chain.size(); i-- > 0;) {
    const Dependence& needs = Needs[i];
    const RowRange& wanted = ranges[i + 1];
    // Row 0 of the source is row -First of the result.
    const std::int64_t top = std::max<std::int64_t>(wanted.First - needs.Reach, -needs.First);
    const std::int64_t beyond = (top % needs.Period + needs.Period) % needs.Period;
    ranges[i] = {std::max<std::int64_t>(top - beyond + needs.First, 0),
                 std::min<std::int64_t>(wanted.End + needs.Reach + needs.First, Shapes[i].Height)};
  }
  return ranges;
}

Picture BandChain::Apply(Picture source, RowRange result, Workplace at) const {
  const std::vector<RowRange> ranges = Ranges(result);
  for (std::size_t i = 0; i < Chain.size(); ++i) {
    at.FirstRow = std::int32_t(ranges[i].First);
    source = Chain[i]->Apply(std::move(source), at);
    if (source.Height() != ranges[i].Count() || source.Width() != Shapes[i + 1].Width)
      throw files::Failure("a step gave a band of another size than it said");
    const std::int64_t top = ranges[i + 1].First - (ranges[i].First - Needs[i].First);
    if (top != 0 || ranges[i + 1].Count() != ranges[i].Count())
      source = source.ClipImage({0, std::int32_t(top), source.Width(), std::int32_t(ranges[i + 1].Count())});
  }
  return source;
}

}
