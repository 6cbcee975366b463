#include "in_profile.h"

#include <lcms2.h>

#include <algorithm>

#include "failure.h"
#include "handle.h"

namespace picturezor::files {

namespace {

using Profile = Handle<void, cmsCloseProfile>;
using Transform = Handle<void, cmsDeleteTransform>;

constexpr std::int64_t MostProfileBytes = 64 << 20;

Handle<cmsToneCurve, cmsFreeToneCurve> CurveOfSRGB() {
  // From IEC 61966-2-1.
  const double parameters[] = {2.4, 1 / 1.055, 0.055 / 1.055, 1 / 12.92, 0.04045};
  return Handle<cmsToneCurve, cmsFreeToneCurve>(cmsBuildParametricToneCurve(nullptr, 4, parameters));
}

Profile GrayProfile() { return Profile(cmsCreateGrayProfile(cmsD50_xyY(), CurveOfSRGB().get())); }

Profile AdobeRGBProfile() {
  const cmsCIExyY white{0.3127, 0.3290, 1};
  const cmsCIExyYTRIPLE primaries{{0.64, 0.33, 1}, {0.21, 0.71, 1}, {0.15, 0.06, 1}};
  const Handle<cmsToneCurve, cmsFreeToneCurve> curve(cmsBuildGamma(nullptr, 563 / 256.0));
  cmsToneCurve* const curves[] = {curve.get(), curve.get(), curve.get()};
  return Profile(cmsCreateRGBProfile(&white, &primaries, curves));
}

Bytes BytesOf(const Profile& profile) {
  cmsUInt32Number size = 0;
  cmsSaveProfileToMem(profile.get(), nullptr, &size);
  Bytes bytes(size);
  if (size < 128 || !cmsSaveProfileToMem(profile.get(), bytes.data(), &size))
    throw Failure("not enough memory for a profile");
  // The moment at which it was made would make every file another one.
  constexpr std::uint8_t moment[12] = {0x07, 0xD0, 0, 1, 0, 1, 0, 0, 0, 0, 0, 0};
  std::ranges::copy(moment, bytes.begin() + 24);
  return bytes;
}

/// Gray, RGB or CMYK; Unknown for other colours.
Format ColoursOf(const Profile& profile) {
  switch (cmsGetColorSpace(profile.get())) {
    case cmsSigGrayData: return Format::G;
    case cmsSigRgbData: return Format::RGB;
    case cmsSigCmykData: return Format::CMYK;
    default: return Format::Unknown;
  }
}

cmsUInt32Number LayoutOf(Format format) {
  const Format colours = WithoutAlpha(format);
  const cmsUInt32Number space = colours == Format::G ? PT_GRAY : colours == Format::RGB ? PT_RGB : PT_CMYK;
  return COLORSPACE_SH(space) | CHANNELS_SH(cmsUInt32Number(ChannelsOf(colours))) |
         EXTRA_SH(cmsUInt32Number(HasAlpha(format))) | BYTES_SH(1);
}

class ProfileReader final : public ImageReader {
 public:
  ProfileReader(std::unique_ptr<ImageReader> reader, const std::filesystem::path& file,
                const TargetProfile& target)
      : Source(std::move(reader)) {
    const ImageInfo& stored = Source->Info();
    const Format colours = WithoutAlpha(stored.Pixels);
    Profile from;
    if (ProfileFits(stored.Profile, stored.Pixels))
      from.reset(cmsOpenProfileFromMem(stored.Profile.data(), cmsUInt32Number(stored.Profile.size())));
    else if (colours == Format::CMYK)
      throw Failure(file, "without a profile nobody knows what colours its inks have");
    else
      from = colours == Format::G ? GrayProfile() : Profile(cmsCreate_sRGBProfile());
    const Profile to(cmsOpenProfileFromMem(target.Profile.data(), cmsUInt32Number(target.Profile.size())));
    if (!from || !to) throw Failure(file, "corrupt: its profile can't be read");
    Pixels = ColoursOf(to);
    if (HasAlpha(stored.Pixels)) Pixels = WithAlpha(Pixels);
    cmsUInt32Number flags = cmsFLAGS_NOCACHE;
    if (HasAlpha(Pixels)) flags |= cmsFLAGS_COPY_ALPHA;
    if (target.By == Intent::Relative) flags |= cmsFLAGS_BLACKPOINTCOMPENSATION;
    Converting.reset(cmsCreateTransform(from.get(), LayoutOf(stored.Pixels), to.get(), LayoutOf(Pixels),
                                        cmsUInt32Number(target.By), flags));
    if (!Converting) throw Failure(file, "its colours can't be converted to the profile asked for");
    Line.resize(std::size_t(stored.Width) * std::size_t(ChannelsOf(stored.Pixels)));
    Describe();
    About.Profile = target.Profile;
  }

  void Reduce(std::int32_t leastWidth, std::int32_t leastHeight) override {
    Source->Reduce(leastWidth, leastHeight);
    Describe();
  }
  bool Select(const Rect& part) override {
    const bool can = Source->Select(part);
    Describe();
    return can;
  }
  bool StartsAnywhere() const override { return Source->StartsAnywhere(); }
  void ReadRow(std::uint8_t* row) override {
    Source->ReadRow(Line.data());
    cmsDoTransform(Converting.get(), Line.data(), row, cmsUInt32Number(About.Width));
  }
  void Finish() override { Source->Finish(); }

 private:
  void Describe() {
    Bytes profile = std::move(About.Profile);
    About = Source->Info();
    About.Pixels = Pixels;
    About.Profile = std::move(profile);
  }

  std::unique_ptr<ImageReader> Source;
  Transform Converting;
  Format Pixels = Format::Unknown;
  Bytes Line;
};

}

const std::map<std::string, Intent>& Intents() {
  static const std::map<std::string, Intent> all{{"perceptual", Intent::Perceptual},
                                                 {"relative", Intent::Relative},
                                                 {"saturation", Intent::Saturation},
                                                 {"absolute", Intent::Absolute}};
  return all;
}

Bytes ProfileNamed(const std::string& name) {
  if (name == "srgb") return BytesOf(Profile(cmsCreate_sRGBProfile()));
  if (name == "adobe-rgb") return BytesOf(AdobeRGBProfile());
  if (name == "gray") return BytesOf(GrayProfile());
  const Input file{std::filesystem::path(name)};
  const auto held = file.All(MostProfileBytes);
  const Profile profile(cmsOpenProfileFromMem(held.data(), cmsUInt32Number(held.size())));
  if (!profile || ColoursOf(profile) == Format::Unknown)
    throw Failure(name, "not a profile for gray, RGB or CMYK");
  return Bytes(held.begin(), held.end());
}

std::unique_ptr<ImageReader> InProfile(std::unique_ptr<ImageReader> reader, const std::filesystem::path& file,
                                       const TargetProfile& to) {
  return std::make_unique<ProfileReader>(std::move(reader), file, to);
}

}
