#pragma once
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace picturezor::model {

/// A type as a declaration names it, in lower case; "" for none. An array of integers is "integer()".
using TypeName = std::string;

struct Parameter {
  std::string Name;
  TypeName Type;
  bool Optional = false;
  /// The default of an optional parameter: nil and false are 0, true is 1.
  double Default = 0;
};

struct Declaration {
  std::string Name;
  std::vector<Parameter> Parameters;
  TypeName Result;
};

/// Takes "Name(a as type, b() as type = default) as type" apart. Case doesn't matter in types and words.
/// Throws ModuleError for a text that isn't a declaration.
Declaration ParseDeclaration(std::string_view text);

/// Takes "Name = 12" or "Name = &h0000000C" apart. Throws ModuleError for anything else.
std::pair<std::string, std::int64_t> ParseConstant(std::string_view text);

}
