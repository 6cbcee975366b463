#include "spool.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

#include "failure.h"

namespace picturezor::flow {

Spool::Spool(const files::PictureSize& size, const files::StoreOptions& options)
    : Options(options), File(-1) {
  const std::int64_t bytes = size.RowBytes() * size.Height;
  if (bytes <= options.MemoryLimit) {
    File = memfd_create("picturezor", MFD_CLOEXEC);
    if (File < 0) Fail();
    return;
  }
  files::RequireRoom(options.TempDirectory, bytes, size);
  File = files::NamelessFile(options.TempDirectory);
}

Spool::~Spool() {
  if (File >= 0) close(File);
}

void Spool::Fail() const {
  throw files::Failure(Options.TempDirectory, std::string("a temporary file: ") + std::strerror(errno));
}

void Spool::Write(std::int64_t at, std::span<const std::uint8_t> bytes) {
  while (!bytes.empty()) {
    const ssize_t done = pwrite(File, bytes.data(), bytes.size(), off_t(at));
    if (done < 0 && errno != EINTR) Fail();
    bytes = bytes.subspan(std::size_t(std::max<ssize_t>(done, 0)));
    at += std::max<ssize_t>(done, 0);
  }
}

void Spool::Read(std::int64_t at, std::size_t bytes, std::int64_t count, std::uint8_t* into,
                 std::ptrdiff_t stride) const {
  std::array<iovec, 512> runs;
  while (count > 0) {
    const auto together = std::min<std::int64_t>(count, runs.size());
    for (std::int64_t i = 0; i < together; ++i) runs[std::size_t(i)] = {into + i * stride, bytes};
    const auto wanted = std::int64_t(bytes) * together;
    ssize_t done;
    do done = preadv(File, runs.data(), int(together), off_t(at));
    while (done < 0 && errno == EINTR);
    if (done < 0) Fail();
    // What was cut off is read again, run by run.
    const std::int64_t whole = done == wanted ? together : std::int64_t(done) / std::int64_t(bytes);
    if (whole == 0) throw files::Failure(Options.TempDirectory, "a temporary file was cut off");
    at += whole * std::int64_t(bytes);
    into += whole * stride;
    count -= whole;
  }
}

void Spool::GiveBack(std::int64_t first, std::int64_t end) {
  constexpr std::int64_t block = 4096;
  first = (first + block - 1) / block * block;
  end = end / block * block;
  // Where the file system has no holes the end of the file frees it.
  if (first < end && fallocate(File, FALLOC_FL_PUNCH_HOLE | FALLOC_FL_KEEP_SIZE, first, end - first) != 0)
    errno = 0;
}

}
