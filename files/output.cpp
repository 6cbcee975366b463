#include "output.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "failure.h"
#include "input.h"
#include "temporary_files.h"

namespace picturezor::files {

Output::~Output() {
  if (File >= 0) close(File);
}

OutputDescriptor::OutputDescriptor(int descriptor, const std::filesystem::path& target, bool inOrder,
                                   const std::filesystem::path& spool)
    : Output(target), Goal(descriptor), Direct(inOrder) {
  if (isatty(descriptor)) throw Failure(target, "a terminal, not a file or a pipe");
  File = Direct ? fcntl(descriptor, F_DUPFD_CLOEXEC, 0) : NamelessFile(spool);
  if (File < 0) throw Failure(target, std::strerror(errno));
}

void OutputDescriptor::Commit() {
  if (Direct) return;
  lseek(File, 0, SEEK_SET);
  Bytes buffer(1 << 16);
  for (ssize_t got; (got = read(File, buffer.data(), buffer.size())) != 0;) {
    if (got < 0) throw Failure(Name, std::strerror(errno));
    WriteAll(Goal, std::span(buffer).first(std::size_t(got)), Name);
  }
}

OutputBytes::OutputBytes(const std::filesystem::path& name) : Output(name) {
  File = memfd_create("image", MFD_CLOEXEC);
  if (File < 0) throw Failure(name, std::strerror(errno));
}

void OutputBytes::Commit() {
  lseek(File, 0, SEEK_SET);
  const Input written = Input::Descriptor(File, Name);
  Result.resize(std::size_t(written.Size()));
  written.ReadAt(0, Result);
  close(std::exchange(File, -1));
}

}
