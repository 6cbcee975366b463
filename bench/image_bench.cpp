#include "race.h"

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
  const struct {
    const char* Work;
    Format From, Into;
    int Bytes;
  } pairs[] = {{"RowInFormat RGB to BGRA", Format::RGB, Format::BGRA, 4},
               {"RowInFormat RGB to gray", Format::RGB, Format::G, 3},
               {"RowInFormat gray to RGB", Format::G, Format::RGB, 3}};
  for (const auto& pair : pairs)
    AddRace("image", pair.Work, {RowInFormat(pair.From, pair.Into), Memcpy(BytesOf(pair.Bytes))});
  return AddRace(
      "image", "DataStringInFormat RGB to BGRA",
      {{"PictureZOR",
        [] { return [picture = TestPicture(Format::RGB)] { picture.DataStringInFormat(Format::BGRA); }; }},
       Memcpy(BytesOf(4))});
}();

}
}
