#include <algorithm>

#include "peers.h"

// Rows and whole pictures as bytes.

namespace picturezor::bench {
namespace {

Contender RowInFormat(Format from, Format into) {
  return {"PictureZOR", [=] {
            return [picture = TestPicture(from), into] {
              for (int y = 0; y < Height; ++y) picture.RowInFormat(y, into);
            };
          }};
}

const auto registered = [] {
  for (const auto& [name, from, into] : ConversionsOfCvtColor) {
    std::vector<Contender> contenders{RowInFormat(from, into)};
    for (const bool byRows : {false, true}) AddCvtColor(contenders, from, into, byRows);
    contenders.push_back(Memcpy(BytesOf(std::max(BytesPerPixel(from), BytesPerPixel(into)))));
    AddRace("image", std::string("RowInFormat ") + name, std::move(contenders));
  }
  return AddRace(
      "image", "DataStringInFormat RGB to BGRA",
      {{"PictureZOR",
        [] { return [picture = TestPicture(Format::RGB)] { picture.DataStringInFormat(Format::BGRA); }; }},
       Memcpy(BytesOf(4))});
}();

}
}
