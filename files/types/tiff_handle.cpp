#include "tiff_handle.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include "failure.h"

namespace picturezor::files {

namespace {

std::string Printed(const char* format, va_list arguments) {
  char text[512];
  std::vsnprintf(text, sizeof text, format, arguments);
  std::string line = text;
  std::ranges::replace(line, '\n', ' ');
  return line;
}

}

int TIFFHandle::OnError(TIFF*, void* user, const char*, const char* format, va_list arguments) {
  auto& self = *static_cast<TIFFHandle*>(user);
  if (!self.Report.empty()) return 1;
  self.SystemError = errno;
  self.Report = Printed(format, arguments);
  return 1;
}

int TIFFHandle::OnWarning(TIFF* file, void* user, const char* module, const char* format, va_list arguments) {
  auto& self = *static_cast<TIFFHandle*>(user);
  va_list copy;
  va_copy(copy, arguments);
  const std::string text = Printed(format, copy);
  va_end(copy);
  // An entry whose values lie beyond the end of the file is only left out otherwise.
  if (self.Strict || text.find("IO error") != std::string::npos)
    return OnError(file, user, module, format, arguments);
  return 1;
}

tmsize_t TIFFHandle::OnRead(thandle_t user, void* into, tmsize_t size) {
  auto& self = *static_cast<TIFFHandle*>(user);
  try {
    const std::size_t got = self.From->ReadAt(self.At, {static_cast<std::uint8_t*>(into), std::size_t(size)});
    self.At += std::int64_t(got);
    return tmsize_t(got);
  } catch (const Failure&) {
    return -1;
  }
}

toff_t TIFFHandle::OnSeek(thandle_t user, toff_t offset, int whence) {
  auto& self = *static_cast<TIFFHandle*>(user);
  const std::int64_t from = whence == SEEK_SET ? 0 : whence == SEEK_CUR ? self.At : self.From->Size();
  self.At = std::int64_t(std::uint64_t(from) + offset);
  return toff_t(self.At);
}

Handle<TIFFOpenOptions, TIFFOpenOptionsFree> TIFFHandle::Options() {
  Handle<TIFFOpenOptions, TIFFOpenOptionsFree> options(TIFFOpenOptionsAlloc());
  TIFFOpenOptionsSetErrorHandlerExtR(options.get(), OnError, this);
  TIFFOpenOptionsSetWarningHandlerExtR(options.get(), OnWarning, this);
  return options;
}

std::unique_ptr<TIFFHandle> TIFFHandle::Open(const Input& input, std::int64_t memoryLimit) {
  std::unique_ptr<TIFFHandle> handle(new TIFFHandle(input.Name()));
  handle->From = input;
  const auto options = handle->Options();
  // Directories and tables of strips need some room however small the limit is.
  TIFFOpenOptionsSetMaxSingleMemAlloc(options.get(), std::max<std::int64_t>(memoryLimit, 64 << 20));
  const auto write = [](thandle_t, void*, tmsize_t) -> tmsize_t { return -1; };
  const auto finish = [](thandle_t) { return 0; };
  const auto size = [](thandle_t self) { return toff_t(static_cast<TIFFHandle*>(self)->From->Size()); };
  // Not mapped: the pages would count as memory in use.
  handle->File = TIFFClientOpenExt(input.Name().c_str(), "rm", handle.get(), OnRead, write, OnSeek, finish,
                                   size, nullptr, nullptr, options.get());
  handle->Check(handle->File);
  return handle;
}

std::unique_ptr<TIFFHandle> TIFFHandle::Create(int descriptor, const std::filesystem::path& target, bool big,
                                               char order) {
  std::unique_ptr<TIFFHandle> handle(new TIFFHandle(target));
  handle->Writing = true;
  const int copy = fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
  if (copy < 0) throw Failure(target, std::strerror(errno));
  const auto options = handle->Options();
  errno = 0;
  handle->File =
      TIFFFdOpenExt(copy, target.c_str(), (std::string(big ? "w8" : "w") + order).c_str(), options.get());
  if (!handle->File) close(copy);
  handle->Check(handle->File);
  return handle;
}

std::unique_ptr<TIFFHandle> TIFFHandle::CreateInMemory(const std::filesystem::path& target, Bytes& written) {
  std::unique_ptr<TIFFHandle> handle(new TIFFHandle(target));
  handle->Writing = true;
  const auto write = [](thandle_t user, void* data, tmsize_t size) {
    auto& bytes = *static_cast<Bytes*>(user);
    const auto* start = static_cast<const std::uint8_t*>(data);
    bytes.insert(bytes.end(), start, start + size);
    return size;
  };
  const auto read = [](thandle_t, void*, tmsize_t) -> tmsize_t { return 0; };
  const auto seek = [](thandle_t, toff_t place, int from) -> toff_t {
    constexpr toff_t end = 64;
    return from == SEEK_END ? end : place;
  };
  const auto options = handle->Options();
  errno = 0;
  handle->File = TIFFClientOpenExt(
      target.c_str(), "w8m", &written, read, write, seek, [](thandle_t) { return 0; },
      [](thandle_t) -> toff_t { return 0; }, nullptr, nullptr, options.get());
  handle->Check(handle->File);
  return handle;
}

void TIFFHandle::Check(bool good) const {
  if (good && Report.empty()) return;
  if (Writing) throw Failure(Path, SystemError ? std::strerror(SystemError) : Report);
  throw Failure(Path, "corrupt TIFF: " + (Report.empty() ? "it can't be read" : Report));
}

void TIFFHandle::Close() {
  if (!File) return;
  errno = 0;
  TIFFClose(File);
  File = nullptr;
}

}
