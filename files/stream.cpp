#include "stream.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "failure.h"

namespace picturezor::files {

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
