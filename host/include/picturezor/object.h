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

using Bytes = std::vector<std::uint8_t>;

/// A reference to an object of the host; empty is nil. Copies refer to the same object.
class Object {
 public:
  Object() = default;
  Object(const Object& other);
  Object(Object&& other) noexcept : At(std::exchange(other.At, nullptr)) {}
  Object& operator=(Object other) noexcept {
    std::swap(At, other.At);
    return *this;
  }
  ~Object();

  explicit operator bool() const { return At != nullptr; }
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
  MemoryBlock() = default;
  explicit MemoryBlock(Object object) : Object(std::move(object)) {}
  /// A zeroed block.
  explicit MemoryBlock(std::size_t size);
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
  std::uint8_t* Start() const;
  /// Tells how many bytes from the start may be used.
  void Limit(std::size_t size);
};

/// A file by its path, there or not.
class FolderItem : public Object {
 public:
  FolderItem() = default;
  explicit FolderItem(const std::filesystem::path& path);
};

/// An array of integers.
class IntegerArray : public Object {
 public:
  IntegerArray() = default;
  explicit IntegerArray(std::vector<std::int32_t> values);
};

}
