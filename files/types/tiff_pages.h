#pragma once
#include <functional>
#include <memory>

#include "image_file.h"

namespace picturezor::files {

/// Reads the first picture of a TIFF file.
using TIFFOpener = std::function<std::unique_ptr<ImageReader>(const Input& input)>;

/// Reads the page that the options choose, and lets it begin smaller where the file holds smaller copies of
/// it: those that are marked as such behind it, or below it. `open` gets an input that begins with the
/// picture that is meant.
std::unique_ptr<ImageReader> OpenTIFFPage(const Input& input, const ReadOptions& options, TIFFOpener open);

}
