#pragma once
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "object_model.h"

// Any row of a class can be called with values that are known only at run time: what is tried on every row is
// written once, and a row that is added is tried too.

namespace picturezor {

/// An argument or a result; the type that a declaration names says which member counts.
struct Value {
  /// Booleans, integers and colours.
  std::int64_t Whole = 0;
  double Real = 0;
  /// Objects, arrays and strings.
  void* Address = nullptr;
};

/// What a call gave, and the class of the exception that it raised; empty for none. Of one that the program's
/// own code threw meanwhile, what it says.
struct Outcome {
  Value Result;
  std::string Raised;
};

/// Whether the functions of a row can be called: the C types of its declaration are among those that are
/// listed in row_call.cpp.
bool CanCall(const model::MethodEntry& row);

/// Calls the function of a row on an object, which may be nil; and that of a shared row.
Outcome CallRow(const model::MethodEntry& row, void* object, std::vector<Value> arguments);
Outcome CallShared(const model::MethodEntry& row, const std::vector<Value>& arguments);
/// Calls the assignment form.
Outcome AssignRow(const model::MethodEntry& row, void* object, std::vector<Value> arguments,
                  const Value& value);

/// Gives back the reference that comes with a result of this type.
void GiveBack(const model::TypeName& type, const Value& value);

}
