#include "file_types.h"

#include <algorithm>

#include "failure.h"
#include "temporary_files.h"

namespace picturezor::files {

std::span<const FileType* const> FileTypes() {
  // clang-format off
  static constexpr const FileType* all[] = {
#ifdef PICTUREZOR_SLIDE
      &SlideType,
#endif
      &PNGType,
      &JPEGType,
      &TIFFType,
#ifdef PICTUREZOR_WEBP
      &WebPType,
#endif
#ifdef PICTUREZOR_JPEG_XL
      &JPEGXLType,
#endif
#ifdef PICTUREZOR_HEIF
      &AVIFType,
      &HEICType,
#endif
#ifdef PICTUREZOR_JPEG_2000
      &JPEG2000Type,
#endif
      &PNMType,
  };
  // clang-format on
  return all;
}

namespace {

std::string Listed(const std::vector<std::string>& words) {
  std::string text;
  for (std::size_t i = 0; i < words.size(); ++i)
    text += (i == 0 ? "" : i + 1 == words.size() ? " or " : ", ") + words[i];
  return text;
}

/// Null where no type has the ending, and then all that there are.
const FileType* TypeOfEnding(std::string extension, std::vector<std::string>& endings) {
  std::ranges::transform(extension, extension.begin(),
                         [](unsigned char c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; });
  for (const FileType* type : FileTypes())
    for (const std::string_view ending : type->Extensions) {
      if (!type->Create) continue;
      if (extension == ending) return type;
      endings.emplace_back(ending);
    }
  return nullptr;
}

}

std::unique_ptr<ImageReader> OpenImage(const Input& input, const ReadOptions& options) {
  const Bytes start = input.Start(64);
  if (start.empty()) throw Failure(input.Name(), "the file is empty");
  std::vector<std::string> names;
  for (const FileType* type : FileTypes()) {
    if (type->Begins(start) && (!type->Is || type->Is(input))) {
      if (options.Page > 0 && !type->Several)
        throw Failure(input.Name(), "only the first picture of a file can be read");
      const auto reachable = [&] {
        return input.Spooled(options.TempDirectory.empty() ? DefaultTempDirectory() : options.TempDirectory);
      };
      const bool asItIs = type->InOrder || input.Seekable();
      std::unique_ptr<ImageReader> reader = type->Open(asItIs ? input : reachable(), options);
      reader->About.Type = type;
      return reader;
    }
    if (!type->Is) names.emplace_back(type->Name);
  }
  throw Failure(input.Name(), "not a " + Listed(names) + " image");
}

const FileType& TypeByExtension(const std::filesystem::path& file) {
  std::vector<std::string> endings;
  if (const FileType* type = TypeOfEnding(file.extension().string(), endings)) return *type;
  throw UsageFailure(file, "the name must end in " + Listed(endings));
}

const FileType& TypeByName(const std::string& name) {
  std::vector<std::string> endings;
  if (const FileType* type = TypeOfEnding('.' + name, endings)) return *type;
  for (std::string& ending : endings) ending.erase(0, 1);
  throw UsageFailure("--type: " + name + " isn't " + Listed(endings));
}

}
