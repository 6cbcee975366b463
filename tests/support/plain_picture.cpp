#include "support/plain_picture.h"

namespace picturezor {

PlainPicture::PlainPicture(const Picture& picture)
    : Width(picture.Width()), Height(picture.Height()), Layout(LettersOf(picture)), Pixels(Packed(picture)) {}

std::string PlainPicture::Colours() const {
  return Family() == 'g' ? "g" : Family() == 'R' ? "RGB" : Family() == 'C' ? "CMYK" : "";
}

int PlainPicture::Gray(int x, int y) const {
  return Has('g') ? At(x, y, 'g') : (At(x, y, 'R') * 77 + At(x, y, 'G') * 151 + At(x, y, 'B') * 28) >> 8;
}

Rect AnyRect(Noise& noise, int width, int height) {
  const auto size = [&](int most) {
    return noise.Between(0, 3) ? noise.Between(1, most) : noise.Between(-most, 0);
  };
  return {noise.Between(-3, width), noise.Between(-3, height), size(width + 3), size(height + 3)};
}

}
