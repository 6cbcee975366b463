#pragma once
#include "frame/declaration.h"
#include "frame/records.h"

namespace zor {

/// The records of the two classes, filled at load by the two functions below and then kept by the host.
extern ClassRecord PictureClass, FactoryClass;

/// Write the records anew, so that a second load in one process starts from clean tables.
void WritePictureClass();
void WriteFactoryClass();

inline constexpr Text NewPictureEvent =
    "NewPictureZOR(Width as integer, Height as integer, ImageFormat as integer) as PictureZOR";
using NewPictureHandler = HandlerOf<NewPictureEvent, PictureFactoryZOR*>;

}
