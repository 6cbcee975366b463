#pragma once
#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "picturezor/picture.h"

namespace picturezor::steps {

using Integers = std::vector<std::int64_t>;
using Numbers = std::vector<double>;
/// What an option says: a flag, a whole number, a number, a name or file, a colour, several numbers, or a
/// picture in a file's place.
using Value = std::variant<bool, std::int64_t, double, std::string, Color, Integers, Numbers, Picture>;

enum class Kind {
  /// bool; in texts it stands alone.
  Flag,
  /// std::int64_t and double, Least to Most.
  Integer,
  Number,
  /// std::string, one of Choices.
  Choice,
  /// Integers: width and height, 640x480; x, y, width and height, 10,20,640,480; x and y.
  Size,
  Rectangle,
  Point,
  /// ff8000, with or without a # before it.
  Colour,
  /// One number or more, with commas between them, each Least to Most.
  Numbers,
  /// Integers, with commas or white space between them; in texts also @ and the name of a file with them.
  IntegersOrFile,
  /// std::string, or a Picture that isn't changed.
  File
};

/// An option of a step.
struct Option {
  /// Without the dashes.
  const char* Name;
  Kind Of;
  const char* Help;
  /// What stands for the value in a help text; nullptr takes the kind's own.
  const char* Placeholder = nullptr;
  double Least = 0, Most = 0;
  /// What holds where nothing is said, as text; empty where that is something else than a value.
  std::string Default{};
  std::vector<std::string> Choices{};
  bool Required = false;
  /// Given by its place on a command line and not by its name.
  bool ByPlace = false;
  /// Other options that it can't stand beside.
  std::vector<const char*> Excludes{};

  /// --name, or the name in capitals where it is given by its place.
  std::string Shown() const;
  const char* Stands() const;
  /// Its help with the names that it takes, the bounds of its numbers and the default.
  std::string Explained() const;
};

/// The colour of six hexadecimal digits, with or without a # before them; nothing where there are no such.
std::optional<Color> ColourOf(const std::string& text);
/// What a text says. Throws files::UsageFailure naming the option, or files::Failure for a file that can't be
/// read.
Value ParseValue(const Option& option, const std::string& text);
/// Throws files::UsageFailure where a value isn't one that the option takes. Whole numbers become numbers
/// where those are wanted.
Value Checked(const Option& option, Value value);

/// The options of a step by their names, with defaults where nothing was said.
class Values {
 public:
  explicit Values(std::map<std::string, Value> values) : Of(std::move(values)) {}
  bool Has(const std::string& name) const { return Of.contains(name); }
  /// The value of an option that is there.
  template <class T>
  const T& Get(const std::string& name) const {
    return std::get<T>(Of.at(name));
  }
  const Value& Any(const std::string& name) const { return Of.at(name); }
  bool Flag(const std::string& name) const { return Has(name) && Get<bool>(name); }
  std::int32_t Integer(const std::string& name) const { return std::int32_t(Get<std::int64_t>(name)); }
  double Number(const std::string& name) const { return Get<double>(name); }
  const std::string& Text(const std::string& name) const { return Get<std::string>(name); }

 private:
  std::map<std::string, Value> Of;
};

}
