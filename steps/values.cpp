#include "values.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <fstream>
#include <iterator>

#include "failure.h"

namespace picturezor::steps {

namespace {

using files::Failure;
using files::UsageFailure;

[[noreturn]] void Refuse(const Option& option, const std::string& what) {
  throw UsageFailure(option.Shown() + ": " + what);
}

template <class T>
bool Parse(std::string_view text, T& number) {
  if (text.starts_with('+')) text.remove_prefix(1);
  const auto [rest, failed] = std::from_chars(text.data(), text.data() + text.size(), number);
  return failed == std::errc() && rest == text.data() + text.size();
}

/// The parts of a text between a letter.
std::vector<std::string_view> Split(std::string_view text, char between) {
  std::vector<std::string_view> parts;
  for (std::size_t at = 0;; ++at) {
    const std::size_t end = std::min(text.find(between, at), text.size());
    parts.push_back(text.substr(at, end - at));
    at = end;
    if (at == text.size()) return parts;
  }
}

Integers WholeNumbers(const Option& option, const std::string& text, char between, std::size_t count) {
  Integers numbers;
  for (const std::string_view part : Split(text, between)) {
    std::int64_t number = 0;
    if (!Parse(part, number)) break;
    numbers.push_back(number);
  }
  if (numbers.size() != count || std::count(text.begin(), text.end(), between) + 1 != std::ptrdiff_t(count))
    Refuse(option,
           text + " isn't " + std::to_string(count) + " whole numbers with '" + between + "' between them");
  return numbers;
}

Integers NumbersOrFile(const Option& option, const std::string& text) {
  std::string all = text;
  if (text.starts_with('@')) {
    std::ifstream file(text.substr(1), std::ios::binary);
    if (!file) throw Failure(text.substr(1), "it can't be read");
    all.assign(std::istreambuf_iterator<char>(file), {});
  }
  std::ranges::replace_if(
      all, [](unsigned char c) { return std::isspace(c); }, ',');
  Integers numbers;
  for (const std::string_view word : Split(all, ',')) {
    if (word.empty()) continue;
    std::int32_t number = 0;
    if (!Parse(word, number)) Refuse(option, std::string(word) + " isn't a 32-bit whole number");
    numbers.push_back(number);
  }
  return numbers;
}

std::string Shortest(double number) {
  char text[32];
  const bool near = std::fabs(number) < 1e10;
  return {text, std::to_chars(text, text + sizeof text, number,
                              near ? std::chars_format::fixed : std::chars_format::general)
                    .ptr};
}

void RequireWithin(const Option& option, double number) {
  // Not a number is nowhere.
  if (!(number >= option.Least && number <= option.Most))
    Refuse(option,
           Shortest(number) + " isn't from " + Shortest(option.Least) + " to " + Shortest(option.Most));
}

void RequireCount(const Option& option, const Integers& numbers, std::size_t count) {
  if (numbers.size() != count) Refuse(option, "it takes " + std::to_string(count) + " whole numbers");
  for (const std::int64_t number : numbers)
    if (number < INT32_MIN / 2 || number > INT32_MAX / 2)
      Refuse(option, std::to_string(number) + " is out of range");
}

void RequireSize(const Option& option, std::int64_t width, std::int64_t height) {
  if (width < 1 || height < 1) Refuse(option, "width and height must be at least 1");
}

template <class T>
const T& Require(const Option& option, const Value& value, const char* what) {
  const T* wanted = std::get_if<T>(&value);
  if (!wanted) Refuse(option, std::string("it takes ") + what);
  return *wanted;
}

double ParseNumber(const Option& option, std::string_view text) {
  double number = 0;
  if (!Parse(text, number)) Refuse(option, std::string(text) + " isn't a number");
  return number;
}

}

std::string Option::Shown() const {
  std::string name = ByPlace ? Name : std::string("--") + Name;
  if (ByPlace) std::ranges::transform(name, name.begin(), [](unsigned char c) { return std::toupper(c); });
  return name;
}

const char* Option::Stands() const {
  if (Placeholder) return Placeholder;
  switch (Of) {
    case Kind::Flag: return "";
    case Kind::Integer: return "N";
    case Kind::Number: return "X";
    case Kind::Choice: return "NAME";
    case Kind::Size: return "WxH";
    case Kind::Rectangle: return "X,Y,W,H";
    case Kind::Point: return "X,Y";
    case Kind::Colour: return "COLOUR";
    case Kind::Numbers: return "X,X,..";
    case Kind::IntegersOrFile: return "N,N,..|@FILE";
    case Kind::File: return "FILE";
  }
  return "";
}

std::string Option::Explained() const {
  std::string text = Help;
  constexpr double far = 1e9;
  const bool bounded = Of == Kind::Integer || Of == Kind::Number || Of == Kind::Numbers;
  if (bounded && Most < far) text += "; " + Shortest(Least) + " to " + Shortest(Most);
  for (std::size_t i = 0; i < Choices.size(); ++i)
    text += (i == 0 ? ": " : i + 1 == Choices.size() ? " or " : ", ") + Choices[i];
  if (!Default.empty()) text += "; " + Default + " by default";
  return text;
}

std::optional<Color> ColourOf(const std::string& text) {
  const std::string digits = text.starts_with('#') ? text.substr(1) : text;
  std::uint32_t colour = 0;
  const char* end = digits.data() + digits.size();
  const auto [rest, failed] = std::from_chars(digits.data(), end, colour, 16);
  if (failed != std::errc() || rest != end || digits.size() != 6) return std::nullopt;
  return Color{std::uint8_t(colour >> 16), std::uint8_t(colour >> 8), std::uint8_t(colour)};
}

Value ParseValue(const Option& option, const std::string& text) {
  switch (option.Of) {
    case Kind::Flag:
      if (text != "true" && text != "false") Refuse(option, "it takes no value");
      return text == "true";
    case Kind::Integer: {
      std::int64_t number = 0;
      if (!Parse(text, number)) Refuse(option, text + " isn't a whole number");
      return number;
    }
    case Kind::Number: return ParseNumber(option, text);
    case Kind::Choice:
    case Kind::File: return text;
    case Kind::Size: return WholeNumbers(option, text, 'x', 2);
    case Kind::Rectangle: return WholeNumbers(option, text, ',', 4);
    case Kind::Point: return WholeNumbers(option, text, ',', 2);
    case Kind::Colour: {
      const std::optional<Color> colour = ColourOf(text);
      if (!colour) Refuse(option, text + " isn't a colour like ff8000");
      return *colour;
    }
    case Kind::Numbers: {
      Numbers numbers;
      for (const std::string_view part : Split(text, ',')) numbers.push_back(ParseNumber(option, part));
      return numbers;
    }
    case Kind::IntegersOrFile: return NumbersOrFile(option, text);
  }
  return false;
}

Value Checked(const Option& option, Value value) {
  switch (option.Of) {
    case Kind::Flag: Require<bool>(option, value, "true or false"); break;
    case Kind::Integer: {
      const auto number = Require<std::int64_t>(option, value, "a whole number");
      // Beyond 2^53 a double isn't exact, but no bound lies there.
      RequireWithin(option, double(number));
      break;
    }
    case Kind::Number:
      if (const auto* whole = std::get_if<std::int64_t>(&value)) value = double(*whole);
      RequireWithin(option, Require<double>(option, value, "a number"));
      break;
    case Kind::Choice:
      if (const auto& name = Require<std::string>(option, value, "a name");
          std::ranges::find(option.Choices, name) == option.Choices.end())
        Refuse(option, name + " isn't one of the choices");
      break;
    case Kind::Size: {
      const auto& size = Require<Integers>(option, value, "a size");
      RequireCount(option, size, 2);
      RequireSize(option, size[0], size[1]);
      break;
    }
    case Kind::Rectangle: {
      const auto& rect = Require<Integers>(option, value, "a rectangle");
      RequireCount(option, rect, 4);
      RequireSize(option, rect[2], rect[3]);
      break;
    }
    case Kind::Point: RequireCount(option, Require<Integers>(option, value, "a point"), 2); break;
    case Kind::Colour: Require<Color>(option, value, "a colour"); break;
    case Kind::Numbers:
      if (const auto* one = std::get_if<double>(&value)) value = Numbers{*one};
      if (const auto* whole = std::get_if<std::int64_t>(&value)) value = Numbers{double(*whole)};
      if (const auto* wholes = std::get_if<Integers>(&value)) value = Numbers(wholes->begin(), wholes->end());
      for (const double number : Require<Numbers>(option, value, "numbers")) RequireWithin(option, number);
      if (std::get<Numbers>(value).empty()) Refuse(option, "there are no numbers");
      break;
    case Kind::IntegersOrFile:
      if (Require<Integers>(option, value, "whole numbers").empty()) Refuse(option, "there are no numbers");
      for (const std::int64_t number : std::get<Integers>(value))
        if (number != std::int32_t(number))
          Refuse(option, std::to_string(number) + " isn't a 32-bit whole number");
      break;
    case Kind::File:
      if (const auto* picture = std::get_if<Picture>(&value)) {
        if (!picture->Valid()) Refuse(option, "the picture is closed");
        break;
      }
      if (Require<std::string>(option, value, "a file").empty()) Refuse(option, "the name is empty");
      break;
  }
  return value;
}

}
