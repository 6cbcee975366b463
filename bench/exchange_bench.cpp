#include "race.h"

// To and from pictures of the host. What is timed includes the host's making of the picture.

namespace picturezor::bench {
namespace {

HostPicture TestHostPicture() { return TestPicture(Format::RGB).CopyPicture(); }

HostPicture MaskedHostPicture() {
  const HostPicture picture = TestHostPicture();
  picture.MakeMask().SetRGB(TestPicture(Format::BGR).DataStringInFormat(Format::RGB));
  return picture;
}

template <class Work>
Contender Ours(Format format, Work work) {
  return {"PictureZOR", [=] { return [=, picture = TestPicture(format)] { work(picture); }; }};
}

const auto registered = [] {
  for (const auto& [name, format] : {std::pair{"CopyPicture of RGB", Format::RGB},
                                     {"CopyPicture of BGRA", Format::BGRA},
                                     {"CopyPicture of gray", Format::G},
                                     {"CopyPicture of CMYK", Format::CMYK}})
    AddRace("exchange", name,
            {Ours(format, [](const Picture& picture) { picture.CopyPicture(); }), Memcpy(BytesOf(4))});
  AddRace("exchange", "CopyGWorld of BGRA",
          {Ours(Format::BGRA, [](const Picture& picture) { picture.CopyGWorld(); }), Memcpy(BytesOf(4))});
  for (const auto& [name, format] :
       {std::pair{"DrawPictureRGB into RGB", Format::RGB}, {"DrawPictureRGB into BGRA", Format::BGRA}})
    AddRace("exchange", name,
            {{"PictureZOR",
              [format] {
                return [picture = TestPicture(format), host = TestHostPicture()] {
                  picture.DrawPictureRGB(host);
                };
              }},
             Memcpy(BytesOf(4))});
  AddRace("exchange", "DrawMaskedPictureRGB into BGRA",
          {{"PictureZOR",
            [] {
              return [picture = TestPicture(Format::BGRA), host = MaskedHostPicture()] {
                picture.DrawMaskedPictureRGB(host);
              };
            }},
           Memcpy(BytesOf(4))});
  return AddRace("exchange", "DrawMaskedPictureApplyMaskRGB into RGB",
                 {{"PictureZOR",
                   [] {
                     return [picture = TestPicture(Format::RGB), host = MaskedHostPicture()] {
                       picture.DrawMaskedPictureApplyMaskRGB(host);
                     };
                   }},
                  Memcpy(BytesOf(4))});
}();

}
}
