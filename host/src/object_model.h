#pragma once
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <new>
#include <span>
#include <string>
#include <string_view>
#include <typeinfo>
#include <utility>
#include <vector>

#include "declaration.h"
#include "frame/records.h"
#include "picturezor/host.h"
#include "picturezor/object.h"

namespace picturezor::model {

/// A method as registered, its declaration taken apart.
struct MethodEntry {
  const zor::MethodRecord* Record;
  Declaration Of;
  std::string LowerName;
};

struct PropertyEntry {
  const zor::PropertyRecord* Record;
  std::string Name, Type;
  std::string LowerName, LowerType;
};

struct Class {
  std::string Name;
  std::size_t DataSize = 0;
  void (*Destructor)(void* object) = nullptr;
  const zor::ClassRecord* Record = nullptr;
  std::vector<MethodEntry> Methods{}, SharedMethods{};
  std::vector<PropertyEntry> Properties{};
  std::map<std::string, std::int64_t> Constants{};  // by lower-case name
  /// Objects of the class. Written by all threads, so it keeps off what they only read.
  alignas(64) mutable std::atomic<int> Alive = 0;
};

/// What an object of one of the host's own classes holds beside its instance data.
struct Payload {
  virtual ~Payload() = default;
};

struct ObjectHeader {
  const Class* Of;
  std::atomic<int> References;
  std::unique_ptr<Payload> Holds;
};

/// Where an object's instance data begins; what the host writes into `InstanceOffsetSlot`. Not zero, so that
/// a module which forgets it is found out.
inline constexpr std::size_t InstanceOffset = 64;
static_assert(sizeof(ObjectHeader) <= InstanceOffset);

inline ObjectHeader& HeaderOf(void* object) { return *static_cast<ObjectHeader*>(object); }
inline std::uint8_t* InstanceOf(void* object) { return static_cast<std::uint8_t*>(object) + InstanceOffset; }

/// What an object holds if that is just a T.
template <class T>
T* HeldBy(void* object) {
  Payload* const held = object ? HeaderOf(object).Holds.get() : nullptr;
  return held && typeid(*held) == typeid(T) ? static_cast<T*>(held) : nullptr;
}

/// What is alive beside the objects of classes.
struct AliveCounts {
  std::atomic<int> Strings = 0, OpenDescriptions = 0, GWorlds = 0, PixelLocks = 0;
};

/// All that lives behind the services. The settings are made while one thread is here, the hook at any time.
struct Runtime {
  std::map<std::string, Class, std::less<>> Classes;  // by lower-case name
  std::vector<std::string> Hidden;
  std::shared_ptr<const std::function<void()>> OnYield;
  std::mutex YieldMutex;
  double Version = 0;
  PictureForm Pictures = PictureForm::GWorld32;
  int BytesOfDepth24 = 3;
  /// What new pictures lack of the width that was asked for, and of the height.
  int MissingColumns = 0, MissingRows = 0;
  /// Told the name of each service of pictures and QuickDraw that is called.
  std::function<void(const char* service)> OnPictureService;
  std::atomic<int> CreationsLeft = -1;
  AliveCounts Alive;
};

Runtime& TheRuntime();

/// What comes out of a thread's call in hand once the module returns: an exception that the module raised, or
/// one that C++ code called by the module threw.
struct Pending {
  void* Raised = nullptr;
  std::exception_ptr Thrown;
};

Pending& PendingHere();

std::string Lower(std::string_view text);
const Class* FindClass(std::string_view name);
/// Throws ModuleError for an unknown name.
const Class& ClassNamed(std::string_view name);
void Register(zor::ClassRecord* record);

/// Whether something may be created now; false once the creations that a test allows are used up.
bool MayCreate();

/// A new object with one reference and zeroed instance data.
void* NewObject(const Class& of, std::unique_ptr<Payload> holds = nullptr);
void Lock(void* object);
void Unlock(void* object);

/// Zeroed memory of the system's, in whole pages.
struct Pages {
  std::uint8_t* Start = nullptr;
  std::size_t Size;
  explicit Pages(std::size_t size);
  Pages(Pages&& other) noexcept : Start(std::exchange(other.Start, nullptr)), Size(other.Size) {}
  ~Pages();
};

struct BlockPayload : Payload {
  Bytes Own;
  Pages OwnPages{0};
  std::uint8_t* Start;
  std::size_t Size;
  std::shared_ptr<void> Owner;
  explicit BlockPayload(Bytes bytes) : Own(std::move(bytes)), Start(Own.data()), Size(Own.size()) {}
  explicit BlockPayload(Pages pages)
      : OwnPages(std::move(pages)), Start(OwnPages.Start), Size(OwnPages.Size) {}
  /// Over memory of the module, whose size isn't known.
  explicit BlockPayload(void* start) : Start(static_cast<std::uint8_t*>(start)), Size(0) {}
  /// Over somebody's memory, which `owner` keeps.
  BlockPayload(std::span<std::uint8_t> memory, std::shared_ptr<void> owner)
      : Start(memory.data()), Size(memory.size()), Owner(std::move(owner)) {}
};
/// A new block, of bytes or over an address.
template <class... Of>
void* NewBlock(Of&&... of) {
  static const Class& blocks = ClassNamed("MemoryBlock");
  return NewObject(blocks, std::make_unique<BlockPayload>(std::forward<Of>(of)...));
}

struct FilePayload : Payload {
  std::string Path;
};
struct ArrayPayload : Payload {
  std::vector<std::int32_t> Values;
};
struct ExceptionPayload : Payload {
  std::string Message;
};
struct FactoryPayload : Payload {
  std::function<void*(std::int32_t, std::int32_t, std::int32_t)> NewPicture;
};

/// Runs C++ code that the module has called; the first exception is kept for the call in hand, and the module
/// gets the failure value.
template <class Result, class Body>
Result Guarded(Result failure, Body&& body) {
  try {
    return body();
  } catch (...) {
    if (!PendingHere().Thrown) PendingHere().Thrown = std::current_exception();
    return failure;
  }
}

/// Makes something for the module; null when there isn't the memory for it, or a test allows no more.
template <class Make>
void* Created(Make&& make) {
  if (!MayCreate()) return nullptr;
  try {
    return make();
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}

bool IsHidden(std::string_view name);

/// Throws what the module raised, or what code called by it threw, during this thread's call that has just
/// returned.
void ThrowPending();

struct Service {
  const char* Name;
  void* Address;
};

template <class Function>
void* AddressOf(Function* function) {
  return reinterpret_cast<void*>(function);
}

/// The address of a service by its name, or null.
void* ServiceNamed(const char* name);

}
