#pragma once
#include <pybind11/pybind11.h>

#include <algorithm>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "picturezor/picture.h"
#include "values.h"

// What is given in Python in several ways: enumerations by their names, colours, rectangles.

namespace picturezor::python {

namespace py = pybind11;

template <class Enum>
struct EnumNames;
template <>
struct EnumNames<Format> {
  static constexpr auto Shown = py::detail::const_name("Format | str");
  static constexpr const char
      *Name = "Format",
      *Help = "The pixel format: the order of the samples of a pixel in memory, one byte each.";
  static const std::vector<std::pair<const char*, Format>> Members;
};
template <>
struct EnumNames<Kernel> {
  static constexpr auto Shown = py::detail::const_name("Kernel | str");
  static constexpr const char *Name = "Kernel",
                              *Help =
                                  "The resampling kernel: how samples are weighted when a picture is scaled.";
  static const std::vector<std::pair<const char*, Kernel>> Members;
};
template <>
struct EnumNames<DitherMatrix> {
  static constexpr auto Shown = py::detail::const_name("DitherMatrix | str");
  static constexpr const char *Name = "DitherMatrix", *Help = "The threshold matrix of dither_filter.";
  static const std::vector<std::pair<const char*, DitherMatrix>> Members;
};
template <>
struct EnumNames<PictureForm> {
  static constexpr auto Shown = py::detail::const_name("PictureForm | str");
  static constexpr const char *Name = "PictureForm", *Help = "How a host picture stores its pixels.";
  static const std::vector<std::pair<const char*, PictureForm>> Members;
};

/// A member of an enumeration, or its name.
template <class Enum>
struct Named {
  Named(Enum of = {}) : Of(of) {}
  operator Enum() const { return Of; }
  Enum Of;
};

/// Small letters and capitals count alike.
template <class Enum>
Enum FromName(const std::string& text) {
  const auto small = [](char letter) {
    return letter >= 'A' && letter <= 'Z' ? letter - 'A' + 'a' : int{letter};
  };
  std::string known;
  for (const auto& [member, value] : EnumNames<Enum>::Members) {
    if (std::ranges::equal(text, std::string_view(member), {}, small, small)) return value;
    known += (known.empty() ? "" : ", ") + std::string(member);
  }
  throw py::value_error(text + " is no " + EnumNames<Enum>::Name + "; there are " + known);
}

}

namespace pybind11::detail {

template <class Enum>
struct type_caster<picturezor::python::Named<Enum>> {
  PYBIND11_TYPE_CASTER(picturezor::python::Named<Enum>, picturezor::python::EnumNames<Enum>::Shown);

  bool load(handle source, bool convert) {
    if (isinstance<str>(source)) {
      value = picturezor::python::FromName<Enum>(source.cast<std::string>());
      return true;
    }
    make_caster<Enum> member;
    if (source.is_none() || !member.load(source, convert)) return false;
    value = cast_op<Enum&>(member);
    return true;
  }
  static handle cast(const picturezor::python::Named<Enum>& named, return_value_policy, handle parent) {
    return make_caster<Enum>::cast(named.Of, return_value_policy::copy, parent);
  }
};

/// '#ff8000', or red, green and blue.
template <>
struct type_caster<picturezor::Color> {
  PYBIND11_TYPE_CASTER(picturezor::Color, const_name("Colour"));

  bool load(handle source, bool) {
    if (isinstance<str>(source)) {
      const auto text = source.cast<std::string>();
      const auto colour = picturezor::steps::ColourOf(text);
      if (!colour) throw value_error(text + " isn't a colour like #ff8000");
      value = *colour;
      return true;
    }
    if (!isinstance<sequence>(source) || len(source) != 3) return false;
    const auto parts = reinterpret_borrow<sequence>(source);
    std::uint8_t* const samples[] = {&value.Red, &value.Green, &value.Blue};
    for (std::size_t i = 0; i < 3; ++i) {
      make_caster<std::uint8_t> sample;
      if (!sample.load(parts[i], true)) return false;
      *samples[i] = cast_op<std::uint8_t>(sample);
    }
    return true;
  }
  static handle cast(const picturezor::Color& colour, return_value_policy, handle) {
    return make_tuple(colour.Red, colour.Green, colour.Blue).release();
  }
};

/// x, y, width, height.
template <>
struct type_caster<picturezor::Rect> {
  PYBIND11_TYPE_CASTER(picturezor::Rect, const_name("Rect"));

  bool load(handle source, bool) {
    if (isinstance<str>(source) || !isinstance<sequence>(source) || len(source) != 4) return false;
    const auto parts = reinterpret_borrow<sequence>(source);
    std::int32_t* const sides[] = {&value.X, &value.Y, &value.Width, &value.Height};
    for (std::size_t i = 0; i < 4; ++i) {
      make_caster<std::int32_t> side;
      if (!side.load(parts[i], true)) return false;
      *sides[i] = cast_op<std::int32_t>(side);
    }
    return true;
  }
  static handle cast(const picturezor::Rect& rect, return_value_policy, handle) {
    return make_tuple(rect.X, rect.Y, rect.Width, rect.Height).release();
  }
};

}
