#pragma once
#include <type_traits>

#include "frame/method.h"

namespace zor {

/// A property row as the roof declares it.
struct PropertyRow {
  void (*Write)(PropertyRecord&);
};

constexpr Word PropertyFlags = 6, PicturePropertyFlags = 0x40002;

enum class Access { ReadOnly, ReadWrite };

/// What the host calls the type of a field or of a getter's result.
template <class T>
constexpr const char* TypeName() {
  if constexpr (std::is_same_v<T, std::int32_t>)
    return "Integer";
  else if constexpr (std::is_same_v<T, std::int64_t>)
    return "Int64";
  else if constexpr (std::is_same_v<T, bool> || std::is_same_v<T, Boolean>)
    return "Boolean";
  else if constexpr (std::is_same_v<T, HostString*>)
    return "String";
  else if constexpr (std::is_same_v<T, HostPicture*>)
    return "Picture";
  else if constexpr (std::is_same_v<T, MemoryBlock*>)
    return "Memoryblock";
  else if constexpr (std::is_same_v<T, PictureZOR*>)
    return "PictureZOR";
  else if constexpr (std::is_same_v<T, PictureFactoryZOR*>)
    return "PictureFactoryZOR";
}

/// The bytes from the start of a record to one of its fields.
template <class Record, class T>
Word OffsetOf(T Record::*field) {
  static const Record record{};
  return Word(reinterpret_cast<const char*>(&(record.*field)) - reinterpret_cast<const char*>(&record));
}

template <class Record, class T>
T TypeOf(T Record::*);

template <class T>
using SetterFunction = void(PictureZOR* self, Word, T value);

/// A property that the host reads in the instance data itself. With ReadWrite it writes it there too, or
/// calls Setter where one is given.
template <Text Name, auto Field, Access Of = Access::ReadOnly, Word Flags = PropertyFlags,
          auto Setter = nullptr>
constexpr PropertyRow FieldProperty{[](PropertyRecord& record) {
  using T = decltype(TypeOf(Field));
  Word setter = Of == Access::ReadOnly ? 0 : DirectField;
  // By its type: with -fsanitize=undefined g++ 12 takes no function's address for a constant.
  if constexpr (!std::is_null_pointer_v<decltype(Setter)>)
    setter = reinterpret_cast<Word>(OnObject<SetterFunction<T>>::template Call<Setter>);
  record = {0, Name.Characters, TypeName<T>(), Flags, DirectField, setter, OffsetOf(Field), {}};
}};

/// A read-only property that a function gives.
template <Text Name, auto Getter, Word Flags = PropertyFlags>
constexpr PropertyRow GetterProperty{[](PropertyRecord& record) {
  using T = decltype(Getter(nullptr, Word{}));
  const auto getter = OnObject<T(PictureZOR*, Word)>::template Call<Getter>;
  record = {0, Name.Characters, TypeName<T>(), Flags, reinterpret_cast<Word>(getter), 0, 0, {}};
}};

}
