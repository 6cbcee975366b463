#include <picturezor/image_files.h>

#include <cstdlib>
#include <exception>
#include <iostream>

// A badge drawn over a lake by its mask, and the place cut out as a picture of the host.

int main(int count, char** arguments) {
  using namespace picturezor;
  try {
    Host::Load(count > 1 ? arguments[1] : "build/release/PictureZOR.so");
    const std::string folder = count > 2 ? arguments[2] : "examples";

    const Picture lake = LoadImage(folder + "/lake.jpg");
    const HostPicture badge = LoadHostPicture(folder + "/badge.png");
    // The mask is white where the badge covers.
    lake.DrawMaskedPictureApplyMaskRGB(badge, 60, 60, true);

    const HostPicture place = lake.CopyPicture({60, 60, badge.Width(), badge.Height()});
    if (count > 3) SaveImage(arguments[3], place);

    const int middle = badge.Width() / 2;
    std::cout << "in the middle: "
              << (place.Pixel(middle, middle) == badge.Pixel(middle, middle) ? "badge" : "lake")
              << "\nin the corner: " << (place.Pixel(0, 0) == badge.Pixel(0, 0) ? "badge" : "lake") << "\n";
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return EXIT_FAILURE;
  }
}
