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

/// What the host tells of a picture while its description is open.
struct PictureDescription {
  /// The form that the pixels are given in.
  std::int32_t Kind;
  void* Data;
  std::int32_t Width, Height, Reserved[2];
};

/// Forms whose pixels can be reached: `Data` is a GWorld, or a record with a table of rows.
inline constexpr std::int32_t GWorldForm = 4, RowTableForm = 10;

/// Where the fields of the record behind a picture with a table of rows stand, in bytes. None is aligned.
struct RowRecord {
  static constexpr std::size_t Zero = 0, Width = 4, Height = 8, NotZero = 7224, Rows = 7228,
                               Size = Rows + sizeof(void*);
};

/// Where an instance of GWorldZOR holds its GWorld, in bytes from the object itself, and the byte 1 behind
/// it.
inline constexpr std::size_t GWorldAt = 24, GWorldMarkAt = GWorldAt + sizeof(void*);

/// The bounds of a GWorld.
struct QuickDrawBounds {
  std::int16_t Top, Left, Bottom, Right;
};

/// The address of a service by its name, or null.
using Resolver = void* (*)(const char* name);

/// The module's one exported function.
using PluginMain = void (*)(Resolver resolver);

}
