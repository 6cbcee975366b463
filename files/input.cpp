#include "input.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "failure.h"
#include "image_file.h"
#include "temporary_files.h"

namespace picturezor::files {

namespace {

constexpr std::size_t BufferBytes = 64 << 10;

/// Reads until `into` is full or there is no more.
template <class Call>
std::size_t ReadAll(std::span<std::uint8_t> into, const std::filesystem::path& name, Call call) {
  std::size_t done = 0;
  while (done < into.size()) {
    const ssize_t got = call(into.subspan(done), done);
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) throw Failure(name, std::strerror(errno));
    if (got == 0) break;
    done += std::size_t(got);
  }
  return done;
}

}

/// How far a stream has come.
struct Input::Position {
  std::shared_ptr<Source> Of;
  std::int64_t At = 0;

  static ssize_t Read(void* cookie, char* into, std::size_t size) {
    auto& self = *static_cast<Position*>(cookie);
    const std::span room(reinterpret_cast<std::uint8_t*>(into), size);
    try {
      const std::size_t got =
          self.Of->Size == UnknownSize ? self.Of->Read(room) : self.Of->ReadAt(self.At, room);
      self.At += std::int64_t(got);
      return ssize_t(got);
    } catch (const Failure&) {
      return -1;
    }
  }

  static int Seek(void* cookie, off64_t* offset, int whence) {
    auto& self = *static_cast<Position*>(cookie);
    if (self.Of->Size == UnknownSize) return -1;
    const std::int64_t from = whence == SEEK_SET ? 0 : whence == SEEK_CUR ? self.At : self.Of->Size;
    if (*offset < -from) return -1;
    *offset = self.At = from + *offset;
    return 0;
  }

  static int Close(void* cookie) {
    delete static_cast<Position*>(cookie);
    return 0;
  }
};

Input::Source::~Source() {
  if (File >= 0) close(File);
}

std::size_t Input::Source::ReadAt(std::int64_t at, std::span<std::uint8_t> into) const {
  if (at < 0) return 0;
  if (File < 0 || Size == UnknownSize) {
    const std::span<const std::uint8_t> held = File < 0 ? Held : Kept;
    const auto start = std::size_t(std::min<std::int64_t>(at, std::int64_t(held.size())));
    const std::size_t count = std::min(into.size(), held.size() - start);
    if (count) std::memcpy(into.data(), held.data() + start, count);
    return count;
  }
  return ReadAll(into, Name, [&](std::span<std::uint8_t> room, std::size_t done) {
    return pread(File, room.data(), room.size(), off_t(First + at + std::int64_t(done)));
  });
}

std::size_t Input::Source::Read(std::span<std::uint8_t> into) {
  const std::size_t kept = std::min(into.size(), Kept.size());
  std::copy_n(Kept.begin(), kept, into.begin());
  Kept.erase(Kept.begin(), Kept.begin() + std::ptrdiff_t(kept));
  if (kept) return kept;
  // What has come is handed on, however little.
  ssize_t got = -1;
  do got = read(File, into.data(), into.size());
  while (got < 0 && errno == EINTR);
  if (got < 0) throw Failure(Name, std::strerror(errno));
  return std::size_t(got);
}

void Input::Source::Fill(std::size_t size) {
  const std::size_t before = Kept.size();
  if (before >= size) return;
  Kept.resize(size);
  const std::size_t got = ReadAll(
      std::span(Kept).subspan(before), Name,
      [&](std::span<std::uint8_t> room, std::size_t) { return read(File, room.data(), room.size()); });
  Kept.resize(before + got);
}

Input::Input(const std::filesystem::path& file) : Of(std::make_shared<Source>(file)) {
  // Without O_NONBLOCK a pipe would wait for its writer.
  Of->File = open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  struct stat about {};
  if (Of->File < 0 || fstat(Of->File, &about) != 0) throw Failure(file, std::strerror(errno));
  if (S_ISDIR(about.st_mode)) throw Failure(file, "a directory, not an image");
  if (!S_ISREG(about.st_mode)) throw Failure(file, "not a regular file");
  Of->Size = about.st_size;
  Of->ByName = true;
}

Input Input::Memory(std::span<const std::uint8_t> bytes, const std::filesystem::path& name) {
  auto source = std::make_shared<Source>(name);
  source->Held = bytes;
  source->Size = std::int64_t(bytes.size());
  return Input(std::move(source));
}

Input Input::Descriptor(int descriptor, const std::filesystem::path& name) {
  auto source = std::make_shared<Source>(name);
  source->File = fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
  struct stat about {};
  if (source->File < 0 || fstat(source->File, &about) != 0) throw Failure(name, std::strerror(errno));
  if (S_ISDIR(about.st_mode)) throw Failure(name, "a directory, not an image");
  const off_t at = S_ISREG(about.st_mode) ? lseek(source->File, 0, SEEK_CUR) : -1;
  if (at >= 0) {
    source->First = at;
    source->Size = std::max<std::int64_t>(0, about.st_size - at);
  }
  return Input(std::move(source));
}

std::size_t Input::ReadAt(std::int64_t at, std::span<std::uint8_t> into) const {
  const std::size_t got = Of->ReadAt(at, into);
  for (std::size_t i = 0; i < Others.size(); ++i)
    if (const std::int64_t place = OthersAt + std::int64_t(i) - at; place >= 0 && place < std::int64_t(got))
      into[std::size_t(place)] = Others[i];
  return got;
}

Input Input::With(std::int64_t at, Bytes bytes) const {
  Input other = *this;
  other.OthersAt = at;
  other.Others = std::move(bytes);
  return other;
}

Bytes Input::Start(std::size_t most) const {
  if (!Seekable()) Of->Fill(most);
  Bytes start(most);
  start.resize(ReadAt(0, start));
  return start;
}

Stream Input::Open() const {
  auto position = std::make_unique<Position>(Position{Of});
  Stream stream(fopencookie(
      position.get(), "rb",
      {.read = Position::Read, .write = nullptr, .seek = Position::Seek, .close = Position::Close}));
  if (!stream) throw Failure(Name(), std::strerror(errno));
  // It is the stream's from here on.
  static_cast<void>(position.release());
  std::setvbuf(stream.get(), nullptr, _IOFBF, BufferBytes);
  return stream;
}

std::span<const std::uint8_t> Input::All(std::int64_t memoryLimit) const {
  if (Of->File < 0) return Of->Held;
  RequireWithinLimit(Name(), Size(), memoryLimit, "a file of this size");
  if (Of->Kept.empty()) {
    Of->Kept.resize(std::size_t(Size()));
    Of->Kept.resize(ReadAt(0, Of->Kept));
  }
  return Of->Kept;
}

Input Input::Spooled(const std::filesystem::path& directory) const {
  if (Seekable()) return *this;
  auto source = std::make_shared<Source>(Name());
  source->File = NamelessFile(directory);
  Bytes buffer(BufferBytes);
  std::int64_t size = 0;
  for (std::size_t got; (got = Of->Read(buffer)) > 0; size += std::int64_t(got))
    WriteAll(source->File, std::span(buffer).first(got), directory);
  source->Size = size;
  return Input(std::move(source));
}

}
