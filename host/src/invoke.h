#pragma once
#include <array>
#include <cstring>
#include <span>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

#include "host_strings.h"
#include "object_model.h"
#include "picturezor/picture.h"

// How C++ calls a row of a class: the row is found by name and argument types, and its function is called
// through a pointer of just that C type.

namespace picturezor::model {

/// What stands for a C++ type in a declaration and in a call.
template <class T>
struct Passed;

#define PICTUREZOR_PASSED(Type, CType, Name, Value)                     \
  template <>                                                           \
  struct Passed<Type> {                                                 \
    using C = CType;                                                    \
    static constexpr const char* TypeName = Name;                       \
    static C From([[maybe_unused]] Type const& value) { return Value; } \
  };
PICTUREZOR_PASSED(bool, unsigned char, "boolean", value ? 1 : 0)
PICTUREZOR_PASSED(std::int32_t, std::int32_t, "integer", value)
PICTUREZOR_PASSED(std::int64_t, std::int64_t, "int64", value)
PICTUREZOR_PASSED(double, double, "double", value)
PICTUREZOR_PASSED(Color, std::int32_t, "color", value.Packed())
PICTUREZOR_PASSED(Picture, void*, "picturezor", value.Address())
PICTUREZOR_PASSED(HostPicture, void*, "picture", value.Address())
PICTUREZOR_PASSED(GWorld, void*, "variant", value.Address())
PICTUREZOR_PASSED(PictureFactory, void*, "picturefactoryzor", value.Address())
PICTUREZOR_PASSED(MemoryBlock, void*, "memoryblock", value.Address())
PICTUREZOR_PASSED(FolderItem, void*, "folderitem", value.Address())
PICTUREZOR_PASSED(IntegerArray, void*, "integer()", value.Address())
PICTUREZOR_PASSED(StringRecord*, void*, "string", value)
#undef PICTUREZOR_PASSED

/// What the module gives back: its C type, and the C++ value made of it. References are taken over.
template <class T>
struct Given {
  using C = typename Passed<T>::C;
  static T Make(C value) {
    if constexpr (std::is_same_v<C, void*> && !std::is_pointer_v<T>)
      return T(Object::Adopt(value));
    else
      return T(value);
  }
};

/// The types that C++ types are declared as.
template <class... A>
inline constexpr std::array<const char*, sizeof...(A)> TypesOf{Passed<A>::TypeName...};
using TypeList = std::span<const char* const>;

/// A row found for a call, and those of its parameters whose arguments weren't given.
struct Found {
  const MethodEntry* Entry;
  std::span<const Parameter> Missing;
};

/// The row with this name that takes arguments of these types, as a compiler would choose it: one that takes
/// just these first, then one whose further arguments are optional. Throws ModuleError when there is none.
Found FindMethod(const std::vector<MethodEntry>& rows, std::string_view name, TypeList types);

/// The same for a method of an object, remembered by each thread. `types` is one of `TypesOf`. Throws
/// ModuleError for nil, too.
const Found& FindMethod(const Object& self, std::string_view name, TypeList types);

template <class R, class... C>
R CallPointer(std::uintptr_t function, C... arguments) {
  return reinterpret_cast<R (*)(C...)>(function)(arguments...);
}

/// Calls with `Count` further arguments of type T behind the given ones: the defaults.
template <class R, class T, std::size_t... I, class... C>
R CallFilled(const Found& found, std::index_sequence<I...>, C... arguments) {
  const auto value = [&](std::size_t i) {
    if constexpr (std::is_pointer_v<T>)
      return T(nullptr);
    else
      return T(found.Missing[i].Default);
  };
  return CallPointer<R>(found.Entry->Record->Function, arguments..., value(I)...);
}

template <class R, class T, std::size_t Count = 1, class... C>
R CallWithDefaults(const Found& found, C... arguments) {
  constexpr std::size_t Most = 9;
  if (found.Missing.size() == Count)
    return CallFilled<R, T>(found, std::make_index_sequence<Count>{}, arguments...);
  if constexpr (Count < Most) return CallWithDefaults<R, T, Count + 1>(found, arguments...);
  throw ModuleError("too many arguments left out");
}

/// Calls the row with all its arguments given.
template <class R, class... C>
R CallFound(const Found& found, C... arguments) {
  if (!found.Missing.empty()) throw ModuleError(found.Entry->Of.Name + ": arguments left out");
  return CallPointer<R>(found.Entry->Record->Function, arguments...);
}

/// Calls the row, its missing arguments filled in; those of one row are all of one type.
template <class R, class... C>
R CallFoundFilled(const Found& found, C... arguments) {
  if (found.Missing.empty()) return CallFound<R>(found, arguments...);
  const TypeName& type = found.Missing.front().Type;
  if (type == "integer") return CallWithDefaults<R, std::int32_t>(found, arguments...);
  if (type == "boolean") return CallWithDefaults<R, unsigned char>(found, arguments...);
  return CallWithDefaults<R, void*>(found, arguments...);
}

template <class R>
struct ResultC {
  using Type = typename Given<R>::C;
};
template <>
struct ResultC<void> {
  using Type = void;
};

/// Runs a call, throws what the module raised in it, and hands on its value.
template <class R, class Call>
R Finish(Call&& call) {
  if constexpr (std::is_void_v<R>) {
    call();
    ThrowPending();
  } else {
    R value = Given<R>::Make(call());
    ThrowPending();
    return value;
  }
}

/// Calls a method on an object, every argument given.
template <class R, class... A>
R Invoke(const Object& self, std::string_view name, const A&... arguments) {
  const Found& found = FindMethod(self, name, TypesOf<A...>);
  return Finish<R>([&] {
    return CallFound<typename ResultC<R>::Type>(found, self.Address(), Passed<A>::From(arguments)...);
  });
}

/// The same with trailing optional arguments left out.
template <class R, class... A>
R InvokeShort(const Object& self, std::string_view name, const A&... arguments) {
  const Found& found = FindMethod(self, name, TypesOf<A...>);
  return Finish<R>([&] {
    return CallFoundFilled<typename ResultC<R>::Type>(found, self.Address(), Passed<A>::From(arguments)...);
  });
}

/// Calls the assignment form of a method; the last argument is the value.
template <class Value, class... A>
void Assign(const Object& self, std::string_view name, const Value& value, const A&... arguments) {
  const Found& found = FindMethod(self, name, TypesOf<A...>);
  const std::uintptr_t setter = found.Entry->Record->Setter;
  if (!setter || found.Entry->Of.Result != Passed<Value>::TypeName)
    throw ModuleError(std::string(name) + " takes no such assignment");
  CallPointer<void>(setter, self.Address(), Passed<A>::From(arguments)..., Passed<Value>::From(value));
  ThrowPending();
}

template <class R, class... A>
R InvokeShared(std::string_view className, std::string_view name, const A&... arguments) {
  const Found found = FindMethod(ClassNamed(className).SharedMethods, name, TypesOf<A...>);
  return Finish<R>(
      [&] { return CallFound<typename ResultC<R>::Type>(found, Passed<A>::From(arguments)...); });
}

/// The row of a property. Throws ModuleError for an unknown name or another type.
const zor::PropertyRecord& FindProperty(const Object& self, std::string_view name, std::string_view type);

/// Reads a property, in the instance data or through its getter. An object read in the instance data gets a
/// reference of its own.
template <class T>
T Get(const Object& self, std::string_view name) {
  using C = typename Given<T>::C;
  const zor::PropertyRecord& row = FindProperty(self, name, Passed<T>::TypeName);
  if (row.Getter != zor::DirectField)
    return Finish<T>([&] { return CallPointer<C>(row.Getter, self.Address(), zor::Word{0}); });
  C value;
  std::memcpy(&value, InstanceOf(self.Address()) + row.FieldOffset, sizeof value);
  if constexpr (std::is_same_v<C, void*>) Lock(value);
  return Given<T>::Make(value);
}

/// Writes a property. The host keeps a reference to an object that it writes into the instance data, and
/// drops the one to the object that stood there; the last one goes with the object written to.
template <class T>
void Set(const Object& self, std::string_view name, const T& value) {
  using C = typename Passed<T>::C;
  const zor::PropertyRecord& row = FindProperty(self, name, Passed<T>::TypeName);
  if (row.Setter == 0) throw ModuleError(std::string(name) + " can't be written");
  if (row.Setter != zor::DirectField) {
    CallPointer<void>(row.Setter, self.Address(), zor::Word{0}, Passed<T>::From(value));
    return ThrowPending();
  }
  std::uint8_t* field = InstanceOf(self.Address()) + row.FieldOffset;
  const C written = Passed<T>::From(value);
  if constexpr (std::is_same_v<C, void*>) {
    void* former;
    std::memcpy(&former, field, sizeof former);
    Lock(written);
    std::memcpy(field, &written, sizeof written);
    Unlock(former);
  } else {
    std::memcpy(field, &written, sizeof written);
  }
}

}
