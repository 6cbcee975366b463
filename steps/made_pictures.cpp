#include "made_pictures.h"

namespace picturezor::steps {

PictureFactory FactoryFor(const files::StoreOptions& stores) {
  return PictureFactory([stores](std::int32_t width, std::int32_t height, Format format) {
    const Picture made = files::MakePictures(stores, {{width, height, format}})[0];
    made.SetFactory(FactoryFor(stores));
    return made;
  });
}

}
