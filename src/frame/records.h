#pragma once
#include <cstddef>
#include <cstdint>

// What the module and its host see of each other in memory. The one header that host/ shares with src/.

namespace zor {

/// The unit of the records: as wide as a pointer.
using Word = std::uintptr_t;

/// A `Getter` or `Setter` with this value: the host reads or writes the field itself.
inline constexpr Word DirectField = ~Word{0};

inline constexpr Word RecordVersion = 9;

/// A method of a class, or a shared method. Without a `Setter` there is no assignment form.
struct MethodRecord {
  Word Function, Setter;
  const char* Declaration;
  Word Flags;
};

struct PropertyRecord {
  Word Group;
  const char *Name, *Type;
  Word Flags, Getter, Setter, FieldOffset;
  Word Reserved[3];
};

/// In the table as built, the bare name and the number; load writes the declaration over the name.
struct ConstantRecord {
  const char* Declaration;
  Word Reserved, Value;
};

/// The host fills `EventWord`; it is handed back to `GetEventInstancePPC`.
struct EventRecord {
  const char* Declaration;
  Word EventWord;
};

struct ClassRecord {
  Word Version;
  const char *ClassName, *SuperName;
  /// Bytes of instance data of each object; they lie at the object's address plus `InstanceOffsetSlot`,
  /// which the host fills.
  Word DataSize, InstanceOffsetSlot;
  Word ConstructorFunction, DestructorFunction;
  PropertyRecord* Properties;
  Word PropertyCount;
  MethodRecord* Methods;
  Word MethodCount;
  EventRecord* Events;
  Word EventCount;
  Word EventInstances, EventInstanceCount;
  Word Reserved[3];
  ConstantRecord* Constants;
  Word ConstantCount;
  Word ClassFlags;
  PropertyRecord* SharedProperties;
  Word SharedPropertyCount;
  MethodRecord* SharedMethods;
  Word SharedMethodCount;
};

// The records are runs of words without gaps, whatever the width of a word.
static_assert(sizeof(Word) == sizeof(void*));
static_assert(sizeof(MethodRecord) == 4 * sizeof(Word));
static_assert(sizeof(PropertyRecord) == 10 * sizeof(Word));
static_assert(offsetof(PropertyRecord, FieldOffset) == 6 * sizeof(Word));
static_assert(sizeof(ConstantRecord) == 3 * sizeof(Word));
static_assert(sizeof(EventRecord) == 2 * sizeof(Word));
static_assert(sizeof(ClassRecord) == 25 * sizeof(Word));
static_assert(offsetof(ClassRecord, InstanceOffsetSlot) == 4 * sizeof(Word));
static_assert(offsetof(ClassRecord, Properties) == 7 * sizeof(Word));
static_assert(offsetof(ClassRecord, Events) == 11 * sizeof(Word));
static_assert(offsetof(ClassRecord, Constants) == 18 * sizeof(Word));
static_assert(offsetof(ClassRecord, ClassFlags) == 20 * sizeof(Word));
static_assert(offsetof(ClassRecord, SharedMethods) == 23 * sizeof(Word));

/// The address of a service by its name, or null.
using Resolver = void* (*)(const char* name);

/// The module's one exported function.
using PluginMain = void (*)(Resolver resolver);

}
