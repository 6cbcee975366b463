#pragma once
#include "pictures.h"

namespace picturezor::steps {

/// For a picture whose methods make new ones, and for those: they live where `stores` says.
PictureFactory FactoryFor(const files::StoreOptions& stores);

}
