#include "support/row_call.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

#include "host_strings.h"

namespace picturezor {
namespace {

using B = unsigned char;
using I = std::int32_t;
using L = std::int64_t;
using D = double;
using P = void*;
using V = void;

template <class T>
constexpr char Letter = std::is_same_v<T, B>   ? 'B'
                        : std::is_same_v<T, I> ? 'I'
                        : std::is_same_v<T, L> ? 'L'
                        : std::is_same_v<T, D> ? 'D'
                        : std::is_same_v<T, P> ? 'P'
                                               : 'V';

char LetterOf(const model::TypeName& type) {
  if (type.empty()) return 'V';
  if (type == "boolean") return 'B';
  if (type == "integer" || type == "color") return 'I';
  if (type == "int64") return 'L';
  if (type == "double") return 'D';
  return 'P';
}

template <class T>
T As(const Value& value) {
  if constexpr (std::is_same_v<T, D>)
    return value.Real;
  else if constexpr (std::is_same_v<T, P>)
    return value.Address;
  else
    return T(value.Whole);
}

template <class T>
Value Made(T value) {
  if constexpr (std::is_same_v<T, D>)
    return {.Real = value};
  else if constexpr (std::is_same_v<T, P>)
    return {.Address = value};
  else
    return {.Whole = value};
}

/// A C type of a function, and how one is called.
struct Shape {
  std::string Letters;
  Value (*Call)(std::uintptr_t function, const std::vector<Value>& arguments);
};

template <class R, class... A, std::size_t... Index>
Value CallAs(R (*function)(A...), const std::vector<Value>& arguments, std::index_sequence<Index...>) {
  if constexpr (std::is_void_v<R>) {
    function(As<A>(arguments[Index])...);
    return {};
  } else {
    return Made(function(As<A>(arguments[Index])...));
  }
}

template <class R, class... A>
Shape Of(R (*)(A...)) {
  return {{Letter<R>, Letter<A>...}, [](std::uintptr_t function, const std::vector<Value>& arguments) {
            return CallAs(reinterpret_cast<R (*)(A...)>(function), arguments,
                          std::index_sequence_for<A...>());
          }};
}

template <class... Functions>
std::vector<Shape> ShapesOf() {
  return {Of(static_cast<Functions*>(nullptr))...};
}

// clang-format off
const std::vector<Shape> Shapes = ShapesOf<
    V(P), P(P), B(P), B(P, P), L(P, P), V(P, P), P(P, P),
    V(P, I), P(P, I), V(P, I, I), P(P, I, I), V(P, I, P), V(P, I, I, P), P(P, I, I, B), V(P, I, I, B, P),
    V(P, I, I, I), P(P, I, I, I), V(P, I, I, I, I), B(P, I, I, I, I), P(P, I, I, I, I),
    V(P, I, I, I, I, I), V(P, I, I, I, I, I, I), V(P, I, I, I, I, I, I, I), V(P, I, I, I, I, I, I, I, I),
    V(P, I, I, I, I, P), V(P, P, I, I, I, I), V(P, P, B), V(P, P, I, I), V(P, P, I, I, B), V(P, P, I, I, I, I, B),
    V(P, P, I, I, I, I, I, I), V(P, P, I, I, I, I, I, I, B),
    P(P, P, I), P(P, P, I, I), P(P, P, P), P(P, P, P, P), P(P, P, P, P, P), P(P, P, P, P, P, P),
    P(P, P, I, P), P(P, P, I, P, I), P(P, P, I, P, I, D),
    P(P, P, D), P(P, P, D, D), P(P, P, D, D, D), P(P, P, D, D, D, D), P(P, P, D, B, B), P(P, P, D, I, B, B),
    P(P, P, D, D, D, I, I), B(P, P, D, I), P(P, D, I, I, I, I, I, I, I, I, I),
    B(P, P, I, I), B(P, P, P, I, I, I), B(P, I, P, P, I, I, I), B(P, P, I, I, I, I), B(P, P, I, I, I, I, I, I),
    B(P, P, P, I, I, I, I, I, I, B), B(P, P, P, I, I, I, I, I, I, B, I), B(P, P, P, I, I, I, I, I, I, B, I, I),
    B(P, P, B, P, I, I, I, I, I, I, B), B(P, P, B, P, I, I, I, I, I, I, B, I),
    B(P, P, B, P, I, I, I, I, I, I, B, I, I),
    P(I, I, I), L(I, I, I), B(I, I, I)>();
// clang-format on

const Shape* Find(const std::string& letters) {
  const auto found = std::ranges::find(Shapes, letters, &Shape::Letters);
  return found == Shapes.end() ? nullptr : &*found;
}

std::string ArgumentLetters(const model::MethodEntry& row, bool onObject) {
  std::string letters(onObject ? "P" : "");
  for (const model::Parameter& parameter : row.Of.Parameters) letters += LetterOf(parameter.Type);
  return letters;
}

Outcome CallShape(const std::string& letters, std::uintptr_t function, const std::vector<Value>& arguments) {
  const Shape* shape = Find(letters);
  if (!shape) throw std::logic_error(letters + " is no shape in row_call.cpp");
  Outcome outcome{shape->Call(function, arguments), ""};
  try {
    model::ThrowPending();
  } catch (const HostException& exception) {
    outcome.Raised = exception.ClassName();
  } catch (const std::exception& exception) {
    outcome.Raised = exception.what();
  }
  return outcome;
}

}

bool CanCall(const model::MethodEntry& row) {
  const std::string arguments = ArgumentLetters(row, true), result(1, LetterOf(row.Of.Result));
  // Whether it is a shared one can't be seen, so either will do.
  const bool calls = Find(result + arguments) || Find(result + arguments.substr(1));
  return calls && (!row.Record->Setter || Find("V" + arguments + result));
}

Outcome CallRow(const model::MethodEntry& row, void* object, std::vector<Value> arguments) {
  arguments.insert(arguments.begin(), Value{.Address = object});
  return CallShape(LetterOf(row.Of.Result) + ArgumentLetters(row, true), row.Record->Function, arguments);
}

Outcome CallShared(const model::MethodEntry& row, const std::vector<Value>& arguments) {
  return CallShape(LetterOf(row.Of.Result) + ArgumentLetters(row, false), row.Record->Function, arguments);
}

Outcome AssignRow(const model::MethodEntry& row, void* object, std::vector<Value> arguments,
                  const Value& value) {
  arguments.insert(arguments.begin(), Value{.Address = object});
  arguments.push_back(value);
  return CallShape("V" + ArgumentLetters(row, true) + LetterOf(row.Of.Result), row.Record->Setter, arguments);
}

void GiveBack(const model::TypeName& type, const Value& value) {
  if (type == "string")
    model::UnlockString(static_cast<model::StringRecord*>(value.Address));
  else
    model::Unlock(value.Address);
}

}
