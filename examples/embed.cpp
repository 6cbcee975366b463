#include <picturezor/picture.h>

#include <cstdlib>
#include <exception>
#include <iostream>

// A gradient of 640 x 480, its middle turned upside down and read back in gray.

int main(int count, char** arguments) {
  using namespace picturezor;
  try {
    Host::Load(count > 1 ? arguments[1] : "build/release/PictureZOR.so");

    const Picture picture(640, 480, Format::RGB);
    Bytes row(640 * 3);
    for (int y = 0; y < 480; ++y) {
      for (int x = 0; x < 640; ++x) {
        row[std::size_t(x) * 3 + 0] = std::uint8_t(x * 255 / 639);  // red from left to right
        row[std::size_t(x) * 3 + 1] = std::uint8_t(y * 255 / 479);  // green from top to bottom
        row[std::size_t(x) * 3 + 2] = 128;
      }
      picture.SetRowInFormat(y, Format::RGB, row);
    }

    // Views copy nothing: what is written to them is written to the picture.
    const Picture middle = picture.ClipImage({160, 120, 320, 240}).MirroredView();
    middle.BlueChannel().SetRowInFormat(0, Format::G, Bytes(320, 255));

    const Bytes gray = middle.RowInFormat(239, Format::G), lowest = picture.RowInFormat(359, Format::RGB);
    std::cout << "gray at the top left of the middle: " << int(gray[0]) << "\n"
              << "blue along its lowest row: " << int(lowest[160 * 3 + 2]) << "\n";
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return EXIT_FAILURE;
  }
}
