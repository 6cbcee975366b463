#include <benchmark/benchmark.h>
#include <dlfcn.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <map>
#include <memory>
#include <string_view>
#include <utility>

#include "picturezor/host.h"
#include "race.h"

// Runs the races and prints a table a component: medians, and ours as a multiple of each other's.

namespace picturezor::bench {
namespace {

struct Race {
  std::string Component, Work;
  std::vector<std::string> Names;
  double Pixels;
};

std::vector<Race>& Races() {
  static std::vector<Race> races;
  return races;
}

std::map<std::string, std::string>& Peers() {
  static std::map<std::string, std::string> peers;
  return peers;
}

std::string Key(const std::string& component, const std::string& work, const std::string& name) {
  return component + "/" + work + "/" + name;
}

/// Keeps every timing, in milliseconds; the other reporter shows that it goes on.
class Collector : public benchmark::ConsoleReporter {
 public:
  Collector() : ConsoleReporter(OO_None) {
    SetOutputStream(&std::cerr);
    SetErrorStream(&std::cerr);
  }
  void ReportRuns(const std::vector<Run>& runs) override {
    for (const Run& run : runs)
      if (run.run_type == Run::RT_Iteration && !run.error_occurred)
        Timings[run.run_name.function_name].push_back(run.GetAdjustedRealTime());
    ConsoleReporter::ReportRuns(runs);
  }
  /// The median of a contender; negative where it didn't run.
  double Median(const std::string& key) {
    std::vector<double>& times = Timings[key];
    if (times.empty()) return -1;
    std::ranges::nth_element(times, times.begin() + std::ptrdiff_t(times.size() / 2));
    return times[times.size() / 2];
  }

 private:
  std::map<std::string, std::vector<double>> Timings;
};

constexpr const char* InstructionSetNames[] = {"plain", "avx2", "avx512", "all"};
constexpr const char* InstructionSetTitles[] = {"What every processor has", "AVX2", "AVX-512 without VBMI",
                                                "All that the machine has"};
int instructionSets = 3;

/// Takes --instruction_sets=NAME out of the arguments. False for an unknown name.
bool TakeInstructionSets(std::vector<char*>& arguments) {
  constexpr std::string_view option = "--instruction_sets=";
  const auto given =
      std::ranges::find_if(arguments, [&](const char* a) { return std::string_view(a).starts_with(option); });
  if (given == arguments.end()) return true;
  const auto name = std::ranges::find(InstructionSetNames, std::string_view(*given).substr(option.size()));
  if (name == std::end(InstructionSetNames)) return false;
  instructionSets = int(name - InstructionSetNames);
  arguments.erase(given);
  return true;
}

/// Loads the module as the tests have it, which can be told. False where the machine has less than what it is
/// told.
bool LoadModule() {
  Host::Load(PICTUREZOR_MODULE);
  void* module = dlopen(PICTUREZOR_MODULE, RTLD_NOW | RTLD_NOLOAD);
  auto* target = static_cast<int*>(dlsym(module, "_ZN3zor13CurrentTargetE"));
  const int most = *target;
  *target = std::min(most, instructionSets);
  return instructionSets == 3 || most > instructionSets;
}

std::string Processor() {
  std::ifstream file("/proc/cpuinfo");
  for (std::string line; std::getline(file, line);)
    if (line.starts_with("model name")) return line.substr(line.find(':') + 2);
  return "an unknown processor";
}

void PrintComponent(const std::string& component, Collector& times) {
  std::vector<std::string> names;
  for (const Race& race : Races())
    if (race.Component == component && times.Median(Key(component, race.Work, race.Names[0])) >= 0)
      for (const std::string& name : race.Names)
        if (std::ranges::find(names, name) == names.end()) names.push_back(name);
  if (names.empty()) return;
  std::printf("\n### %s\n\n| | ns a pixel |", component.c_str());
  for (const std::string& name : names) std::printf(" %s |", name.c_str());
  std::printf("\n|---|--:|");
  for (std::size_t i = 0; i < names.size(); ++i) std::printf("--:|");
  std::printf("\n");
  for (const Race& race : Races()) {
    if (race.Component != component) continue;
    const double ours = times.Median(Key(component, race.Work, race.Names[0]));
    if (ours < 0) continue;
    std::printf("| %s | %.3g |", race.Work.c_str(), ours * 1e6 / race.Pixels);
    for (const std::string& name : names) {
      const double time = times.Median(Key(component, race.Work, name));
      if (time < 0)
        std::printf(" |");
      else if (name == race.Names[0])
        std::printf(" **%.3g** |", time);
      else
        std::printf(" %.3g (%.2f) |", time, ours / time);
    }
    std::printf("\n");
  }
}

void PrintTables(Collector& times) {
  std::printf("## %s\n\nMachine: %s. Compiler: %s.", InstructionSetTitles[instructionSets],
              Processor().c_str(), PICTUREZOR_COMPILER);
  const char* between = " Peers: ";
  for (const auto& [name, version] : Peers())
    std::printf("%s%s %s", std::exchange(between, ", "), name.c_str(), version.c_str());
  std::printf(
      "\n\nMilliseconds, medians; in parentheses PictureZOR's time divided by the other's. A pixel is one of "
      "the result.\n");
  std::vector<std::string> components;
  for (const Race& race : Races())
    if (std::ranges::find(components, race.Component) == components.end())
      components.push_back(race.Component);
  std::ranges::sort(components);
  for (const std::string& component : components) PrintComponent(component, times);
}

}

int InstructionSets() { return instructionSets; }

bool AddRace(const std::string& component, const std::string& work, std::vector<Contender> contenders,
             double pixels) {
  Race race{component, work, {}, pixels};
  for (Contender& contender : contenders) {
    race.Names.push_back(contender.Name);
    const auto run = [prepare = std::move(contender.Prepare)](benchmark::State& state) {
      const auto work = prepare();
      work();
      for ([[maybe_unused]] auto _ : state) work();
    };
    benchmark::RegisterBenchmark(Key(component, work, contender.Name).c_str(), run)
        ->Unit(benchmark::kMillisecond)
        ->UseRealTime();
  }
  Races().push_back(std::move(race));
  return true;
}

bool NamePeer(const std::string& name, const std::string& version) {
  Peers()[name] = version;
  return true;
}

Picture TestPicture(Format format, int width, int height) {
  const Picture picture(width, height, format);
  const int pixelSize = BytesPerPixel(format);
  Bytes row(std::size_t(picture.RowSize()));
  std::uint32_t noise = 1;
  for (int y = 0; y < height; ++y) {
    for (int x = 0; x < width; ++x)
      for (int c = 0; c < pixelSize; ++c) {
        noise = noise * 1664525 + 1013904223;
        const int shape = (x * (3 + c) / 16 ^ y * (5 - c) / 16) & 127;
        row[std::size_t(x * pixelSize + c)] = std::uint8_t(shape + (noise >> 26) + (x + y) / 64);
      }
    picture.SetRow(y, row);
  }
  return picture;
}

Contender Memcpy(std::size_t bytes) {
  return {"memcpy", [bytes] {
            auto from = std::make_shared<Bytes>(bytes, 1), into = std::make_shared<Bytes>(bytes, 2);
            return [from, into] {
              std::memcpy(into->data(), from->data(), into->size());
              benchmark::ClobberMemory();
            };
          }};
}

}

int main(int count, char** arguments) {
  // Repetitions in random order, so that a machine that slows down slows all contenders.
  std::vector<char*> all{arguments[0]};
  for (const char* given : {"--benchmark_enable_random_interleaving=true", "--benchmark_repetitions=5",
                            "--benchmark_min_time=0.05"})
    all.push_back(const_cast<char*>(given));
  all.insert(all.end(), arguments + 1, arguments + count);
  if (!picturezor::bench::TakeInstructionSets(all)) {
    std::fprintf(stderr, "--instruction_sets=plain, avx2, avx512 or all\n");
    return 1;
  }
  int allCount = int(all.size());
  benchmark::Initialize(&allCount, all.data());
  if (benchmark::ReportUnrecognizedArguments(allCount, all.data())) return 1;
  if (!picturezor::bench::LoadModule()) {
    std::fprintf(stderr, "this machine has no more than that, or less: see --instruction_sets=all\n");
    return 1;
  }
  picturezor::bench::Collector collector;
  benchmark::RunSpecifiedBenchmarks(&collector);
  picturezor::bench::PrintTables(collector);
}
