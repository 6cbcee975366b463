#pragma once
#include <functional>
#include <string>
#include <vector>

#include "picturezor/picture.h"

namespace picturezor::bench {

/// 4000 x 3000, the size of most work here.
inline constexpr int Width = 4000, Height = 3000;

/// One of those who do the same work. `Prepare` makes what it works on; what that gives is timed, many times.
struct Contender {
  std::string Name;
  std::function<std::function<void()>()> Prepare;
};

/// Lets contenders do one piece of work side by side. The first is ours; a copy of the same bytes by `memcpy`
/// is a contender like the others. To be called before `main`: `const auto registered = AddRace(...)`.
/// `pixels` is how many the work makes.
bool AddRace(const std::string& component, const std::string& work, std::vector<Contender> contenders,
             double pixels = double(Width) * Height);

/// Tells which version of a peer is in the race.
bool NamePeer(const std::string& name, const std::string& version);

/// Which instruction sets the contenders may use that can be told: 0 for what every processor has, 1 for
/// AVX2, 2 for AVX-512, 3 for all that there are.
int InstructionSets();

/// A picture of soft shapes and some noise, every plane its own; the same each time.
Picture TestPicture(Format format, int width = Width, int height = Height);

/// A `memcpy` of so many bytes.
Contender Memcpy(std::size_t bytes);
inline constexpr std::size_t BytesOf(int pixelSize) { return std::size_t(Width) * Height * pixelSize; }

}
