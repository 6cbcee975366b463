#include "picturezor/object.h"

#include <sys/mman.h>

#include "object_model.h"

namespace picturezor {

using namespace model;

Pages::Pages(std::size_t size) : Size(size) {
  if (size == 0) return;
  void* start = mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (start == MAP_FAILED) throw std::bad_alloc();
  Start = static_cast<std::uint8_t*>(start);
#ifdef MADV_HUGEPAGE
  // Filling many small pages takes several times as long; where there are no large ones, small ones do.
  madvise(start, size, MADV_HUGEPAGE);
#endif
}

Pages::~Pages() {
  if (Start) munmap(Start, Size);
}

Object::Object(const Object& other) : At(other.At) { Lock(At); }

Object::~Object() { Unlock(At); }

Object Object::Adopt(void* address) {
  Object object;
  object.At = address;
  return object;
}

Object Object::Share(void* address) {
  Lock(address);
  return Adopt(address);
}

int Object::References() const { return At ? HeaderOf(At).References.load() : 0; }

MemoryBlock::MemoryBlock(std::size_t size) : Object(Adopt(NewBlock(Bytes(size)))) {}

MemoryBlock::MemoryBlock(std::span<const std::uint8_t> bytes)
    : Object(Adopt(NewBlock(Bytes(bytes.begin(), bytes.end())))) {}

MemoryBlock MemoryBlock::Over(std::span<std::uint8_t> memory, std::shared_ptr<void> owner) {
  return MemoryBlock(Object(Adopt(NewBlock(memory, std::move(owner)))));
}

MemoryBlock MemoryBlock::OfPages(std::size_t size) {
  return MemoryBlock(Object::Adopt(NewBlock(Pages(size))));
}

std::span<std::uint8_t> MemoryBlock::Data() const {
  const auto* payload = HeldBy<BlockPayload>(Address());
  return payload ? std::span(payload->Start, payload->Size) : std::span<std::uint8_t>();
}

std::uint8_t* MemoryBlock::Start() const { return Data().data(); }

void MemoryBlock::Limit(std::size_t size) {
  if (auto* payload = HeldBy<BlockPayload>(Address())) payload->Size = size;
}

FolderItem::FolderItem(const std::filesystem::path& path) {
  auto payload = std::make_unique<FilePayload>();
  payload->Path = std::filesystem::absolute(path).string();
  static_cast<Object&>(*this) = Adopt(NewObject(ClassNamed("FolderItem"), std::move(payload)));
}

IntegerArray::IntegerArray(std::vector<std::int32_t> values) {
  auto payload = std::make_unique<ArrayPayload>();
  payload->Values = std::move(values);
  static_cast<Object&>(*this) = Adopt(NewObject(ClassNamed("IntegerArray"), std::move(payload)));
}

}
