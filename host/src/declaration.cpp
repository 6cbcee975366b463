#include "declaration.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <limits>

#include "picturezor/host.h"

namespace picturezor::model {
namespace {

char LowerLetter(char c) { return char(std::tolower(static_cast<unsigned char>(c))); }

/// Reads a declaration word by word.
class Reader {
 public:
  explicit Reader(std::string_view text) : Text(text) {}

  bool AtEnd() {
    Skip();
    return At == Text.size();
  }
  bool Take(char c) {
    Skip();
    if (At == Text.size() || Text[At] != c) return false;
    ++At;
    return true;
  }
  void Expect(char c) {
    if (!Take(c)) Fail(std::string("'") + c + "' expected");
  }
  std::string Word() {
    Skip();
    const std::size_t first = At;
    while (At < Text.size() && (std::isalnum(static_cast<unsigned char>(Text[At])) || Text[At] == '_')) ++At;
    if (At == first) Fail("a word expected");
    return std::string(Text.substr(first, At - first));
  }
  std::string LowerWord() {
    std::string word = Word();
    std::ranges::transform(word, word.begin(), LowerLetter);
    return word;
  }
  double Default() {
    Skip();
    if (At < Text.size() && std::isalpha(static_cast<unsigned char>(Text[At]))) {
      const std::string word = LowerWord();
      if (word == "true") return 1;
      if (word == "false" || word == "nil") return 0;
      Fail("'" + word + "' is no default");
    }
    double value = 0;
    const auto [end, error] = std::from_chars(Text.data() + At, Text.data() + Text.size(), value);
    if (error != std::errc()) Fail("a default expected");
    At = std::size_t(end - Text.data());
    return value;
  }
  [[noreturn]] void Fail(const std::string& why) const {
    throw ModuleError("\"" + std::string(Text) + "\": " + why + " at character " + std::to_string(At + 1));
  }

 private:
  void Skip() {
    while (At < Text.size() && Text[At] == ' ') ++At;
  }

  std::string_view Text;
  std::size_t At = 0;
};

constexpr std::array<std::string_view, 12> KnownTypes = {"boolean",
                                                         "integer",
                                                         "int64",
                                                         "double",
                                                         "color",
                                                         "string",
                                                         "folderitem",
                                                         "memoryblock",
                                                         "picture",
                                                         "picturezor",
                                                         "picturefactoryzor",
                                                         "variant"};

TypeName ReadType(Reader& reader) {
  if (reader.LowerWord() != "as") reader.Fail("\"as\" expected");
  std::string type = reader.LowerWord();
  if (std::ranges::find(KnownTypes, type) == KnownTypes.end()) reader.Fail("type '" + type + "' isn't known");
  return type;
}

Parameter ReadParameter(Reader& reader) {
  Parameter parameter;
  parameter.Name = reader.Word();
  const bool array = reader.Take('(');
  if (array) reader.Expect(')');
  parameter.Type = ReadType(reader) + (array ? "()" : "");
  parameter.Optional = reader.Take('=');
  if (parameter.Optional) parameter.Default = reader.Default();
  return parameter;
}

}

Declaration ParseDeclaration(std::string_view text) {
  Reader reader(text);
  Declaration declaration;
  declaration.Name = reader.Word();
  if (reader.Take('(') && !reader.Take(')')) {
    do {
      declaration.Parameters.push_back(ReadParameter(reader));
      const auto count = declaration.Parameters.size();
      if (count > 1 && declaration.Parameters[count - 2].Optional && !declaration.Parameters.back().Optional)
        reader.Fail("an argument without a default after one with a default");
    } while (reader.Take(','));
    reader.Expect(')');
  }
  if (!reader.AtEnd()) declaration.Result = ReadType(reader);
  if (!reader.AtEnd()) reader.Fail("nothing more expected");
  return declaration;
}

std::pair<std::string, std::int64_t> ParseConstant(std::string_view text) {
  const std::size_t equals = text.find(" = ");
  if (equals == std::string_view::npos) throw ModuleError("\"" + std::string(text) + "\": no constant");
  std::string_view digits = text.substr(equals + 3);
  int base = 10;
  if (digits.starts_with("&h")) {
    digits.remove_prefix(2);
    base = 16;
  }
  std::int64_t value = 0;
  const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value, base);
  if (error != std::errc() || end != digits.data() + digits.size())
    throw ModuleError("\"" + std::string(text) + "\": no number");
  return {std::string(text.substr(0, equals)), value};
}

}
