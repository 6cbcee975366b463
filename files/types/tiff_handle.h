#pragma once
#include <tiffio.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>

#include "handle.h"
#include "input.h"
#include "picturezor/picture.h"

namespace picturezor::files {

/// An open TIFF with what libtiff has to say of it, which becomes Failures.
class TIFFHandle {
 public:
  /// Allocations of libtiff above `memoryLimit` fail.
  static std::unique_ptr<TIFFHandle> Open(const Input& input, std::int64_t memoryLimit);
  /// Into an open file, whose descriptor stays the caller's; `order` of the bytes is 'l' or 'b'.
  static std::unique_ptr<TIFFHandle> Create(int descriptor, const std::filesystem::path& target, bool big,
                                            char order);
  /// What would be written to a file is appended to `written`, whatever the place.
  static std::unique_ptr<TIFFHandle> CreateInMemory(const std::filesystem::path& target, Bytes& written);
  TIFFHandle(const TIFFHandle&) = delete;
  ~TIFFHandle() { Close(); }

  operator TIFF*() const { return File; }
  /// Throws what libtiff reported, if it reported anything or `good` is false. Warnings count as failures
  /// where they tell of missing or damaged data.
  void Check(bool good = true) const;
  /// From now on every warning counts: libtiff makes up for damaged pixels.
  void ReadingPixels() { Strict = true; }
  void Close();

  template <class T>
  T Get(ttag_t tag, T otherwise) const {
    T value = otherwise;
    return TIFFGetFieldDefaulted(File, tag, &value) ? value : otherwise;
  }
  template <class... T>
  void Set(ttag_t tag, T... values) {
    Check(TIFFSetField(File, tag, values...));
  }

 private:
  explicit TIFFHandle(std::filesystem::path path) : Path(std::move(path)) {}
  /// With what libtiff says going to this object.
  Handle<TIFFOpenOptions, TIFFOpenOptionsFree> Options();
  static tmsize_t OnRead(thandle_t self, void* into, tmsize_t size);
  static toff_t OnSeek(thandle_t self, toff_t offset, int whence);
  static int OnError(TIFF*, void* self, const char*, const char* format, va_list arguments);
  static int OnWarning(TIFF*, void* self, const char* module, const char* format, va_list arguments);

  std::filesystem::path Path;
  std::optional<Input> From;
  std::int64_t At = 0;
  TIFF* File = nullptr;
  bool Strict = false, Writing = false;
  std::string Report;
  int SystemError = 0;
};

}
