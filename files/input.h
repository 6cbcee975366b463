#pragma once
#include <cstdint>
#include <filesystem>
#include <memory>
#include <span>

#include "picturezor/object.h"
#include "stream.h"

namespace picturezor::files {

/// Where the bytes of an image come from: a file, memory, or a descriptor. Copies share what they are of. All
/// failures are thrown as Failure with the input's name.
class Input {
 public:
  /// A regular file, which is opened.
  Input(const std::filesystem::path& file);
  /// Bytes that stay as long as any copy of the input. `name` stands for them in failures.
  static Input Memory(std::span<const std::uint8_t> bytes, const std::filesystem::path& name);
  /// What an open descriptor gives from its position on. It stays the caller's.
  static Input Descriptor(int descriptor, const std::filesystem::path& name);

  const std::filesystem::path& Name() const { return Of->Name; }
  /// Where it is a file that was opened by its name: that name. Empty elsewhere.
  std::filesystem::path Path() const { return Of->ByName ? Of->Name : std::filesystem::path(); }
  /// False where the bytes come once, in their order, as through a pipe. Then `Open` may be called once, and
  /// `ReadAt` reaches no further than `Start` did.
  bool Seekable() const { return Of->Size != UnknownSize; }
  /// Far beyond all sizes where it isn't known.
  std::int64_t Size() const { return Of->Size; }
  /// The first bytes, as many of them as there are.
  Bytes Start(std::size_t most) const;
  /// A stream of its own, from the first byte on.
  Stream Open() const;
  /// Fewer bytes than asked for only where the input ends.
  std::size_t ReadAt(std::int64_t at, std::span<std::uint8_t> into) const;
  /// The same input, but that ReadAt gives these bytes at their place.
  Input With(std::int64_t at, Bytes bytes) const;
  /// All bytes at once, kept as long as the input, where they aren't more than `memoryLimit`.
  std::span<const std::uint8_t> All(std::int64_t memoryLimit) const;
  /// The same bytes where any of them can be reached: in a nameless file in `directory` where they came
  /// through a pipe.
  Input Spooled(const std::filesystem::path& directory) const;

 private:
  static constexpr std::int64_t UnknownSize = INT64_MAX;

  struct Source {
    explicit Source(const std::filesystem::path& name) : Name(name) {}
    Source(const Source&) = delete;
    ~Source();
    std::size_t ReadAt(std::int64_t at, std::span<std::uint8_t> into) const;
    /// The next bytes of a pipe.
    std::size_t Read(std::span<std::uint8_t> into);
    void Fill(std::size_t size);

    std::filesystem::path Name;
    std::int64_t Size = UnknownSize;
    /// Where the input begins in the file.
    std::int64_t First = 0;
    int File = -1;
    bool ByName = false;
    std::span<const std::uint8_t> Held;
    /// Of a pipe the first bytes, of a file all that were asked for at once.
    Bytes Kept;
  };
  struct Position;

  explicit Input(std::shared_ptr<Source> source) : Of(std::move(source)) {}

  std::shared_ptr<Source> Of;
  std::int64_t OthersAt = 0;
  Bytes Others;
};

}
