#include "picturezor/image_files.h"

#include "failure.h"
#include "image_file.h"
#include "pictures.h"
#include "temporary_files.h"

namespace picturezor {

using namespace files;

namespace {

Picture Load(const Input& input) {
  const StoreOptions stores{Store::Auto, DefaultMemoryLimit(), DefaultTempDirectory()};
  const auto reader = OpenImage(input, {.MemoryLimit = stores.MemoryLimit});
  const ImageInfo upright = Upright(reader->Info());
  Picture picture = MakePictures(stores, {{upright.Width, upright.Height, upright.Pixels}})[0];
  Silence silent;
  ReadInto(picture, *reader, silent);
  return picture;
}

void Save(Output& output, const FileType& type, const Picture& picture) {
  const std::filesystem::path& file = output.Target();
  if (!HasColours(picture)) throw Failure(file, "the picture has no colours");
  ImageInfo info;
  info.Width = picture.Width();
  info.Height = picture.Height();
  info.Pixels = StorableFormat(file, type, FileFormatOf(picture));
  RequireStorableSize(file, type, info.Width, info.Height);
  const auto writer = type.Create(output.Descriptor(), file, info, {});
  Silence silent;
  WriteFrom(picture, *writer, info.Pixels, silent);
  writer->Finish();
  output.Commit();
}

}

Picture LoadImage(const std::filesystem::path& file) { return Load(file); }

Picture DecodeImage(std::span<const std::uint8_t> bytes, const std::string& name) {
  return Load(Input::Memory(bytes, name));
}

HostPicture LoadHostPicture(const std::filesystem::path& file) {
  HostPicture picture = LoadImage(file).CopyPictureWithMask();
  if (!picture) throw Failure(file, "the host has no picture for it; one is 32767 pixels on a side at most");
  return picture;
}

void SaveImage(const std::filesystem::path& file, const Picture& picture) {
  if (!picture.Valid()) throw Failure(file, "there is no picture to write");
  const FileType& type = TypeByExtension(file);
  OutputFile output(file);
  Save(output, type, picture);
}

Bytes EncodeImage(const std::string& type, const Picture& picture) {
  if (!picture.Valid()) throw Failure("there is no picture to write");
  OutputBytes output(type);
  Save(output, TypeByName(type), picture);
  return std::move(output.Result);
}

void SaveImage(const std::filesystem::path& file, const HostPicture& picture) {
  if (!picture) throw Failure(file, "there is no picture to write");
  const Picture image(picture.Width(), picture.Height(), picture.Mask() ? Format::RGBA : Format::RGB);
  image.DrawMaskedPictureRGB(picture);
  SaveImage(file, image);
}

}
