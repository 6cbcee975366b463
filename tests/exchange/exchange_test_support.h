#pragma once
#include <functional>
#include <string>
#include <vector>

#include "pictures.h"
#include "support/every_store.h"

namespace picturezor {

/// Runs the body in a process of its own, whose host holds its pictures in a form. In the end nothing may be
/// alive, open, or locked there.
void InHost(const Host::Options& options, const std::function<void()>& body);
void InHost(PictureForm form, const std::function<void()>& body);

/// What the host holds of a picture.
model::PicturePayload& Inside(const HostPicture& picture);

/// A picture of noise, and the same for its mask, which may have another form.
HostPicture NoisePicture(int width, int height, PictureForm form, unsigned seed);
void GiveMask(const HostPicture& picture, const HostPicture& mask);

/// The services of pictures and QuickDraw that a call asks for.
std::vector<std::string> ServicesOf(const std::function<void()>& call);

}
