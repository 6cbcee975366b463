#pragma once
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace picturezor {

/// Samples, rows and files as bytes.
using Bytes = std::vector<std::uint8_t>;

/// A reference to an object of the host; empty is nil. Copies refer to the same object.
class Object {
 public:
  /// Nil.
  Object() = default;
  /// One more reference to the same object.
  Object(const Object& other);
  /// Leaves `other` nil.
  Object(Object&& other) noexcept : At(std::exchange(other.At, nullptr)) {}
  /// Lets go of the object that was referred to.
  Object& operator=(Object other) noexcept {
    std::swap(At, other.At);
    return *this;
  }
  ~Object();

  /// False for nil.
  explicit operator bool() const { return At != nullptr; }
  /// Whether both refer to the same object.
  bool operator==(const Object& other) const { return At == other.At; }

  /// The address that the module sees.
  void* Address() const { return At; }
  /// Takes over a reference that the module handed out.
  static Object Adopt(void* address);
  /// One more reference to an object that somebody else holds.
  static Object Share(void* address);
  /// The references to the object; 0 for nil.
  int References() const;

 private:
  void* At = nullptr;
};

/// A block of memory of the host.
class MemoryBlock : public Object {
 public:
  /// Nil.
  MemoryBlock() = default;
  /// The block that an object of the host is.
  explicit MemoryBlock(Object object) : Object(std::move(object)) {}
  /// A zeroed block of so many bytes. Throws std::bad_alloc.
  explicit MemoryBlock(std::size_t size);
  /// A copy of these bytes.
  explicit MemoryBlock(std::span<const std::uint8_t> bytes);
  /// Over somebody else's memory, which outlives it, or which `owner` keeps until nothing uses the block any
  /// more; it is let go of on whatever thread that is.
  static MemoryBlock Over(std::span<std::uint8_t> memory, std::shared_ptr<void> owner = {});
  /// A zeroed block of any size, which takes memory where it is touched, a page at a time. Throws
  /// std::bad_alloc for what is plainly more than there is.
  static MemoryBlock OfPages(std::size_t size);

  /// The bytes of the block. One over memory of the module knows no size of its own: 0 unless `Limit` has
  /// told it.
  std::span<std::uint8_t> Data() const;
  /// The first byte; null for nil.
  std::uint8_t* Start() const;
  /// Tells how many bytes from the start may be used; not checked.
  void Limit(std::size_t size);
};

/// A file by its path, there or not.
class FolderItem : public Object {
 public:
  /// Nil.
  FolderItem() = default;
  /// The file of this path; a relative one counts from the working directory of now.
  explicit FolderItem(const std::filesystem::path& path);
};

/// An array of integers.
class IntegerArray : public Object {
 public:
  /// Nil.
  IntegerArray() = default;
  /// An array of these.
  explicit IntegerArray(std::vector<std::int32_t> values);
};

}
