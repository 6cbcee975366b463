#include <picturezor/image_files.h>

#include <exception>
#include <iostream>

// Halves an image: outside IN OUT.

int main(int, char** arguments) {
  using namespace picturezor;
  try {
    Host::Load();
    const Picture image = LoadImage(arguments[1]);
    const Picture half(image.Width() / 2, image.Height() / 2, image.ImageFormat());
    if (!half.Scale(image, {}, Kernel::Box, half.Width(), half.Height())) return 1;
    SaveImage(arguments[2], half);
    std::cout << half.Width() << " x " << half.Height() << "\n";
    LoadImage("no such file.png");
  } catch (const ModuleError& error) {
    std::cerr << "no module: " << error.what() << "\n";
    return 2;
  } catch (const std::exception& error) {
    std::cout << error.what() << "\n";
  }
}
