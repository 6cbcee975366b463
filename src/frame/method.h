#pragma once
#include <algorithm>
#include <cstddef>

#include "frame/declaration.h"

namespace zor {

constexpr Word NoFlags = 0, PlainFlags = 4, PictureFlags = 0x40000;

/// A method row as its component declares it: its place in the table of the class, and how to write it there.
struct MethodRow {
  int Number;
  void (*Write)(MethodRecord&);
};

/// The function of a row as the host calls it. Called on nil it gives its failure value: nil, false, or -1.
template <class Function>
struct OnObject;
template <class Result, class... Arguments>
struct OnObject<Result(PictureZOR*, Arguments...)> {
  template <Result (*Function)(PictureZOR*, Arguments...)>
  static Result Call(PictureZOR* self, Arguments... arguments) {
    if (self) return Function(self, arguments...);
    if constexpr (std::is_same_v<Result, Int64>)
      return -1;
    else
      return Result();
  }
};

/// Row `Number` of the class. The declaration says which overload of the function is meant;
/// a declaration that fits none doesn't compile.
template <int Number, Text Declaration, FunctionOf<Declaration>* Function, Word Flags = PlainFlags,
          SetterOf<Declaration>*... Setter>
constexpr MethodRow Method{Number, [](MethodRecord& record) {
                             using Called = OnObject<FunctionOf<Declaration>>;
                             using Assigned = OnObject<SetterOf<Declaration>>;
                             record = {
                                 reinterpret_cast<Word>(Called::template Call<Function>),
                                 (Word{} | ... | reinterpret_cast<Word>(Assigned::template Call<Setter>)),
                                 Declaration.Characters, Flags};
                           }};

/// A row of the shared methods, which have no object.
template <int Number, Text Declaration, SharedFunctionOf<Declaration>* Function>
constexpr MethodRow SharedMethod{
    Number, [](MethodRecord& record) {
      record = {reinterpret_cast<Word>(Function), 0, Declaration.Characters, PlainFlags};
    }};

void ARowNumberIsUsedTwice();  // never defined: a call of it stops the compiler

/// The rows of all components in the order of the table. A number used twice doesn't compile.
template <std::size_t... Counts>
consteval auto InTableOrder(const MethodRow (&... components)[Counts]) {
  std::array<MethodRow, (Counts + ...)> table{};
  auto end = table.begin();
  ((end = std::copy_n(components, Counts, end)), ...);
  std::ranges::sort(table, {}, &MethodRow::Number);
  auto sameNumber = [](const MethodRow& a, const MethodRow& b) { return a.Number == b.Number; };
  if (std::ranges::adjacent_find(table, sameNumber) != table.end()) ARowNumberIsUsedTwice();
  return table;
}

}
