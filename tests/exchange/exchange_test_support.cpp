#include "exchange_test_support.h"

#include "support/in_child.h"

namespace picturezor {

void InHost(const Host::Options& options, const std::function<void()>& body) {
  InChild([&] {
    Host::Load(PICTUREZOR_MODULE, options);
    body();
    const Host::Alive left = Host::Count();
    EXPECT_EQ(left.Objects, 0);
    EXPECT_EQ(left.OpenDescriptions, 0);
    EXPECT_EQ(left.GWorlds, 0);
    EXPECT_EQ(left.PixelLocks, 0);
  });
}

void InHost(PictureForm form, const std::function<void()>& body) { InHost({.Pictures = form}, body); }

model::PicturePayload& Inside(const HostPicture& picture) {
  return *model::HeldBy<model::PicturePayload>(picture.Address());
}

HostPicture NoisePicture(int width, int height, PictureForm form, unsigned seed) {
  const HostPicture picture(width, height, form);
  picture.SetRGB(Noise(seed).Many(std::size_t(width * height * 3)));
  return picture;
}

void GiveMask(const HostPicture& picture, const HostPicture& mask) { Inside(picture).Mask = mask; }

std::vector<std::string> ServicesOf(const std::function<void()>& call) {
  std::vector<std::string> names;
  model::TheRuntime().OnPictureService = [&](const char* name) { names.push_back(name); };
  call();
  model::TheRuntime().OnPictureService = nullptr;
  return names;
}

}
