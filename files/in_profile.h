#pragma once
#include <map>
#include <string>

#include "image_file.h"

namespace picturezor::files {

/// How colours are carried over that the target can't show. The values are those of ICC.
enum class Intent { Perceptual, Relative, Saturation, Absolute };
const std::map<std::string, Intent>& Intents();

/// A colour profile to convert to.
struct TargetProfile {
  /// As it is written into files.
  Bytes Profile;
  Intent By = Intent::Perceptual;
};

/// By a name: srgb, adobe-rgb, gray, or that of a file with a profile of ICC. Throws Failure.
Bytes ProfileNamed(const std::string& name);

/// The pixels of a reader, converted row by row from its profile to another one, which Info() has then.
/// Without a profile gray and RGB count as sRGB. Throws Failure for CMYK without a profile, and for profiles
/// that don't fit together.
std::unique_ptr<ImageReader> InProfile(std::unique_ptr<ImageReader> reader, const std::filesystem::path& file,
                                       const TargetProfile& to);

}
