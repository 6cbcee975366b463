#pragma once
#include "image_file.h"

namespace picturezor::files {

/// The code of a type whose libraries take so long to load that they wait until somebody needs them: it
/// stands in a module, a file of its own. The members are those of FileType.
struct TypeCode {
  /// Of the library that it was built with, which has to be this one.
  const char* Version;
  bool (*Is)(const Input& input);
  decltype(FileType::Open) Open;
  decltype(FileType::Create) Create;
};

/// The code of a type out of types/`module`.so beside the module of the class, which is loaded once. Throws
/// Failure where it can't be.
const TypeCode& CodeOf(const char* module, const char* type);

/// What a module calls it.
#define PICTUREZOR_TYPE_CODE(type) \
  extern "C" [[gnu::visibility("default")]] const TypeCode PictureZORType##type

}
