#include <filesystem>

#include "scale_peers.h"

// Scaling, beside what a user would pick instead for the same work: antialiased, two passes, 8 bits.

namespace picturezor::bench {
namespace {

constexpr Sizes AllSizes[] = {{"to a quarter", 4000, 3000, 1000, 750},
                              {"to three quarters", 4000, 3000, 3000, 2250},
                              {"up by 4", 1000, 750, 4000, 3000}};
/// Icons: what a call costs whatever the size.
constexpr Sizes SmallSizes[] = {{"24 x 24 to a half", 24, 24, 12, 12}, {"24 x 24 up by 2", 24, 24, 48, 48}};
constexpr std::pair<const char*, Kernel> Kernels[] = {
    {"triangle", Kernel::Triangle},  {"box", Kernel::Box},           {"Lanczos 3", Kernel::Lanczos3},
    {"Lanczos 8", Kernel::Lanczos8}, {"Mitchell", Kernel::Mitchell}, {"poly3", Kernel::Poly3},
    {"cubic", Kernel::Cubic}};
constexpr std::pair<const char*, Format> Formats[] = {
    {"RGB", Format::RGB}, {"RGBA", Format::RGBA}, {"gray", Format::G}};

Contender Ours(const char* name, Format format, Kernel kernel, const Sizes& sizes, int threads) {
  return {name, [=] {
            return [=, source = TestPicture(format, sizes.FromWidth, sizes.FromHeight),
                    dest = Picture(sizes.IntoWidth, sizes.IntoHeight, format)] {
              threads == 1 ? dest.Scale(source, {}, kernel, sizes.IntoWidth, sizes.IntoHeight)
                           : dest.ScaleMT(threads, source, {}, kernel, sizes.IntoWidth, sizes.IntoHeight);
            };
          }};
}

/// The same with both pictures in mapped files.
Contender Mapped(Kernel kernel, const Sizes& sizes) {
  return {"PictureZOR, mapped", [=] {
            const auto folder = std::filesystem::temp_directory_path();
            const Picture source = Picture::Mapped(folder / "picturezor-bench-source", sizes.FromWidth,
                                                   sizes.FromHeight, Format::RGB);
            const Picture dest = Picture::Mapped(folder / "picturezor-bench-dest", sizes.IntoWidth,
                                                 sizes.IntoHeight, Format::RGB);
            source.CopyPixels(TestPicture(Format::RGB, sizes.FromWidth, sizes.FromHeight));
            return [=] { dest.Scale(source, {}, kernel, sizes.IntoWidth, sizes.IntoHeight); };
          }};
}

const auto registered = [] {
  for (const Sizes& sizes : SmallSizes) {
    std::vector<Contender> contenders = ScalePeers(Format::RGB, Kernel::Lanczos3, sizes);
    contenders.insert(contenders.begin(), Ours("PictureZOR", Format::RGB, Kernel::Lanczos3, sizes, 1));
    AddRace("scale", std::string("RGB ") + sizes.Name + ", Lanczos 3", std::move(contenders),
            double(sizes.IntoWidth) * sizes.IntoHeight);
  }
  for (const auto& [formatName, format] : Formats)
    for (const Sizes& sizes : AllSizes)
      for (const auto& [kernelName, kernel] : Kernels) {
        std::vector<Contender> contenders{
            Ours("PictureZOR", format, kernel, sizes, 1),
            Ours("PictureZOR, 2 threads", format, kernel, sizes, 2),
            Memcpy(std::size_t(sizes.FromWidth) * sizes.FromHeight * BytesPerPixel(format))};
        if (format == Format::RGB && kernel == Kernel::Lanczos3) contenders.push_back(Mapped(kernel, sizes));
        for (Contender& peer : ScalePeers(format, kernel, sizes)) contenders.push_back(std::move(peer));
        AddRace("scale", std::string(formatName) + " " + sizes.Name + ", " + kernelName,
                std::move(contenders), double(sizes.IntoWidth) * sizes.IntoHeight);
      }
  return true;
}();

}
}
