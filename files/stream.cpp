#include "stream.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "failure.h"

namespace picturezor::files {

Stream OpenForReading(const std::filesystem::path& file) {
  // Without O_NONBLOCK a pipe would wait for its writer.
  const int descriptor = open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (descriptor < 0) throw Failure(file, std::strerror(errno));
  struct stat about {};
  Stream stream(fdopen(descriptor, "rb"));
  if (!stream || fstat(descriptor, &about) != 0) throw Failure(file, std::strerror(errno));
  if (S_ISDIR(about.st_mode)) throw Failure(file, "a directory, not an image");
  if (!S_ISREG(about.st_mode)) throw Failure(file, "not a regular file");
  return stream;
}

std::int64_t SizeOf(const Stream& stream) {
  struct stat about {};
  return fstat(fileno(stream.get()), &about) == 0 ? about.st_size : 0;
}

Stream StreamOn(int descriptor, const std::filesystem::path& target) {
  const int copy = fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
  Stream stream(copy < 0 ? nullptr : fdopen(copy, "wb"));
  if (!stream) throw Failure(target, std::strerror(errno));
  return stream;
}

void Flush(const Stream& stream, const std::filesystem::path& target) {
  if (std::fflush(stream.get()) != 0) throw Failure(target, std::strerror(errno));
}

}
