#include <cstdlib>
#include <random>

#include "image/targets.h"
#include "scale/quotients.h"
#include "scale/slot_loops.h"
#include "support/every_target.h"

namespace picturezor {
namespace {

using zor::Contribution, zor::ContributionEntry, zor::ContributionTable, zor::Sample, zor::SlotLine,
    zor::SlotLoops;
using Random = std::mt19937;

int Below(Random& random, int end) { return int(random() % unsigned(end)); }

/// Weights that a table never has, next to those that it has.
std::vector<ContributionEntry> RandomEntries(Random& random) {
  if (Below(random, 2) == 0) {
    const int output = 1 + Below(random, 300), source = 1 + Below(random, 300);
    const ContributionTable table(output, source, double(output) / source,
                                  zor::ScaleKernel(1 + Below(random, 7)), nullptr);
    const Contribution& line = table[Below(random, output)];
    return {line.Entries, line.Entries + line.Count};
  }
  std::vector<ContributionEntry> entries;
  const int kind = Below(random, 4), count = 1 + Below(random, 40);
  std::int32_t pixel = 0;
  for (int i = 0; i < count; ++i) {
    const double noise = double(random()) / double(1U << 31) - 1.0;
    const double weight = kind == 0   ? noise + 0.7
                          : kind == 1 ? (Below(random, 4000) - 700) / 4096.0
                          : kind == 2 ? (i == count / 2 ? 20.0 : noise)
                                      : 1.0 + noise * 0x1p-20;
    entries.push_back({float(weight), pixel});
    pixel += Below(random, 8) == 0 ? 2 : 1;
  }
  return entries;
}

Sample RandomSample(Random& random, int texture, int line) {
  switch (texture) {
    case 0: return Sample(random());
    case 1: return Sample(100 + Below(random, 2));
    case 2: return Below(random, 2) == 0 ? 0 : 255;
    case 3: return line % 2 == 0 ? 90 : 160;
    default: return Sample(texture);
  }
}

/// Makes random sums of random lines; how many samples that were, and how many weren't the plain form's.
std::pair<std::int64_t, std::int64_t> TrySums(const SlotLoops& loops, Random& random) {
  const std::vector<ContributionEntry> entries = RandomEntries(random);
  double sum = 0.0;
  for (const ContributionEntry& entry : entries) sum += double(entry.Weight);
  const std::int32_t first = Below(random, 2);
  const Contribution line{entries.data(), std::int32_t(entries.size()), first, float(sum), 0};
  SlotLine made{};
  made.Count = line.Count == 0 ? 0 : line.Last() / zor::LinesInSlot + 1;
  std::vector<SlotLine::Digits> digits(std::size_t(made.Count) + 1);
  zor::MakeDigits(line, digits.data(), made);

  const std::ptrdiff_t width = loops.Width, units = 1 + Below(random, SlotLoops::MostUnits);
  const std::ptrdiff_t samples = units * width - Below(random, int(width));
  const int texture = Below(random, 260);
  std::vector<std::vector<Sample>> rows(std::size_t(made.Count) * 2);
  for (std::size_t r = 0; r < rows.size(); ++r)
    for (std::ptrdiff_t x = 0; x < units * width; ++x)
      rows[r].push_back(RandomSample(random, texture < 200 ? texture % 4 : texture - 5, int(r)));
  std::vector<std::vector<Sample>> slots(std::size_t(made.Count));
  std::vector<const Sample*> places;
  for (std::size_t s = 0; s < slots.size(); ++s) {
    slots[s].resize(std::size_t(units * width * SlotLoops::SampleBytes));
    loops.Widen(rows[2 * s].data(), rows[2 * s + 1].data(), units, slots[s].data());
    places.push_back(slots[s].data());
  }
  std::vector<Sample> into(std::size_t(samples) + 1, Sample(77));
  loops.Sum({&made, &line, places.data(), 0, units, samples, into.data()});
  std::int64_t wrong = into[std::size_t(samples)] == 77 ? 0 : 1;
  for (std::size_t x = 0; x < std::size_t(samples); ++x) {
    double exact = 0.0;
    for (std::int32_t i = 0; i < line.Count; ++i)
      exact += double(entries[std::size_t(i)].Weight) * rows[std::size_t(line.PixelAt(i))][x];
    wrong += into[x] == zor::ExactQuotient(exact, line.Sum) ? 0 : 1;
  }
  return {samples, wrong};
}

// Catches bounds that are too narrow. scripts/long_sums asks for many more samples.
TEST(Sums, AreThePlainFormsOnEveryTarget) {
  const char* asked = std::getenv("PICTUREZOR_SUMS");
  const std::int64_t wanted = asked ? std::atoll(asked) : 200000;
  ForEveryTarget([&] {
    const SlotLoops& loops = zor::LoopsFor(TargetOfModule());
    std::int64_t made = 0;
    for (unsigned seed = 1; made < wanted; ++seed) {
      Random random(seed);
      const auto [samples, wrong] = TrySums(loops, random);
      ASSERT_EQ(wrong, 0) << "seed " << seed;
      made += samples;
    }
  });
}

}
}
