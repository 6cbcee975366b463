#pragma once

#include <array>
#include <cstddef>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <utility>

#include "frame/types.h"

namespace zor {

/// A string literal as a template argument.
template <std::size_t Size>
struct Text {
  char Characters[Size]{};
  consteval Text(const char (&text)[Size]) {
    for (std::size_t i = 0; i < Size; ++i) Characters[i] = text[i];
  }
  constexpr std::string_view View() const { return {Characters, Size - 1}; }
};

namespace declaration {

// The types that a declaration can name, in lower case, and what stands for each. Index 0 is no type at all;
// an array of integers is the last, since it has no name of its own.
constexpr std::string_view Names[] = {
    "",       "boolean",    "integer",     "int64",   "double",     "color",
    "string", "folderitem", "memoryblock", "picture", "picturezor", "picturefactoryzor",
    "variant"};
using Types =
    std::tuple<void*, Boolean, Integer, Int64, Double, Color, HostString*, FolderItem*, MemoryBlock*,
               HostPicture*, PictureZOR*, PictureFactoryZOR*, Variant*, IntegerArray*>;
constexpr std::size_t Array = std::size(Names);
static_assert(std::tuple_size_v<Types> == Array + 1);

constexpr char Lower(char c) { return c >= 'A' && c <= 'Z' ? char(c + 32) : c; }
constexpr bool IsLetter(char c) { return Lower(c) >= 'a' && Lower(c) <= 'z'; }

/// Whether text has word, written in lower case, at position at.
constexpr bool Reads(std::string_view text, std::size_t at, std::string_view word) {
  if (at + word.size() > text.size()) return false;
  for (std::size_t i = 0; i < word.size(); ++i)
    if (Lower(text[at + i]) != word[i]) return false;
  return true;
}

void ATypeIsNotKnown();  // never defined: a call of it stops the compiler

/// The index of the type in "name as type = default" or "name() as type"; 0 when there is none.
constexpr std::size_t TypeIn(std::string_view part) {
  for (std::size_t at = 0; at < part.size(); ++at) {
    if (!Reads(part, at, " as ")) continue;
    const bool array = at >= 2 && part[at - 2] == '(' && part[at - 1] == ')';
    for (std::size_t type = 1; type < std::size(Names); ++type) {
      const std::size_t end = at + 4 + Names[type].size();
      if (!Reads(part, at + 4, Names[type])) continue;
      if (end < part.size() && IsLetter(part[end])) continue;
      return array ? Array : type;
    }
    ATypeIsNotKnown();
  }
  return 0;
}

struct Parsed {
  std::size_t Result = 0, Count = 0;
  std::array<std::size_t, 16> Arguments{};
};

/// Takes "Name(a as type, b() as type = default, ...) as type" apart.
constexpr Parsed Parse(std::string_view text) {
  Parsed parsed;
  std::size_t first = 0, depth = 0, at = 0;
  for (; at < text.size(); ++at) {
    if (text[at] == '(' && ++depth == 1) first = at + 1;
    const bool closes = text[at] == ')' && --depth == 0;
    if (closes || (text[at] == ',' && depth == 1)) {
      parsed.Arguments[parsed.Count++] = TypeIn(text.substr(first, at - first));
      first = at + 1;
    }
    if (closes) break;
  }
  parsed.Result = TypeIn(text.substr(at == text.size() ? 0 : at + 1));
  return parsed;
}

template <Text Declaration, class = std::make_index_sequence<Parse(Declaration.View()).Count>>
struct Signature;

template <Text Declaration, std::size_t... I>
struct Signature<Declaration, std::index_sequence<I...>> {
  static constexpr Parsed Of = Parse(Declaration.View());
  template <std::size_t Index>
  using Type = std::tuple_element_t<Index, Types>;
  using Result = std::conditional_t<Of.Result == 0, void, Type<Of.Result>>;
  template <class... Object>
  using Function = Result(Object..., Type<Of.Arguments[I]>...);
  using Setter = void(PictureZOR*, Type<Of.Arguments[I]>..., Type<Of.Result>);
};

}

/// The C++ type that a declaration asks of its function: the object first, then the arguments.
template <Text Declaration>
using FunctionOf = typename declaration::Signature<Declaration>::template Function<PictureZOR*>;
/// The same without an object, as a shared method is called.
template <Text Declaration>
using SharedFunctionOf = typename declaration::Signature<Declaration>::template Function<>;
/// The assignment form: the object, the arguments, then the value.
template <Text Declaration>
using SetterOf = typename declaration::Signature<Declaration>::Setter;
/// The handler of an event, called with the object that the event belongs to.
template <Text Declaration, class Object>
using HandlerOf = typename declaration::Signature<Declaration>::template Function<Object>;

}
