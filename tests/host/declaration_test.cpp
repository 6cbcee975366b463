#include "declaration.h"

#include <gmock/gmock.h>

#include "picturezor/host.h"

namespace picturezor::model {
namespace {

/// A declaration as one line in a fixed form.
std::string Parsed(std::string_view text) {
  const Declaration declaration = ParseDeclaration(text);
  std::string line = declaration.Name + "|";
  for (const Parameter& parameter : declaration.Parameters) {
    line += parameter.Name + ":" + parameter.Type;
    if (parameter.Optional) line += "=" + std::to_string(int(parameter.Default * 10));
    line += ";";
  }
  return line + "|" + declaration.Result;
}

TEST(Declaration, IsTakenApart) {
  struct {
    const char *Text, *Parsed;
  } cases[] = {
      {"Close", "Close||"},
      {"Clone as PictureZOR", "Clone||picturezor"},
      {"F() as INT64", "F||int64"},
      {"F(a As Integer,b  as  Double)", "F|a:integer;b:double;|"},
      {"F(red() as integer) as string", "F|red:integer();|string"},
      {"F(a as boolean=True, b as PictureZOR = nil, c as integer = -3, d as double=0.5)",
       "F|a:boolean=10;b:picturezor=0;c:integer=-30;d:double=5;|"},
  };
  for (const auto& [text, parsed] : cases) EXPECT_EQ(Parsed(text), parsed);
}

// A wrong row of a module is a message for its author, never a crash or a row half understood.
TEST(Declaration, IsRefusedWhereItIsMalformed) {
  const std::string whole = "F(a as integer)";
  for (std::size_t size = 2; size < whole.size(); ++size)
    EXPECT_THROW(ParseDeclaration(whole.substr(0, size)), ModuleError) << size;
  for (const char* text :
       {"", " ", "(", "F(a as integer,", "F(a as integer,)", "F(a as integers)", "F(a is integer)",
        "F(a( as integer)", "F(a as integer=)", "F(a as integer=maybe)", "F(a as integer=1, b as integer)",
        "F as", "F as void", "F as integer integer", "F(a as integer))", "F(a as integer) integer", "F[a]"})
    EXPECT_THROW(ParseDeclaration(text), ModuleError) << text;
}

TEST(Constant, IsTakenApart) {
  using Named = std::pair<std::string, std::int64_t>;
  EXPECT_EQ(ParseConstant("A = 0"), Named("A", 0));
  EXPECT_EQ(ParseConstant("A = 12"), Named("A", 12));
  EXPECT_EQ(ParseConstant("A = &h0000000A"), Named("A", 10));
  EXPECT_EQ(ParseConstant("A = &hFFFFFFFF"), Named("A", 0xFFFFFFFF));
  for (const char* text : {"", "A", "A =", "A = ", "A = &h", "A = x", "A = 1x", "A = &hG", "A=1"})
    EXPECT_THROW(ParseConstant(text), ModuleError) << text;
}

}
}
