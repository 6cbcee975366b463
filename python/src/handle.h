#pragma once
#include <pybind11/pybind11.h>
#include <pybind11/stl.h>
#include <pybind11/stl/filesystem.h>

#include <algorithm>
#include <filesystem>
#include <initializer_list>
#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <tuple>
#include <vector>

#include "picturezor/picture.h"

// How Python's pictures stand for the library's: who holds what, who waits for whom, what comes back.

namespace picturezor::python {

namespace py = pybind11;

/// What can't be done though its arguments are right: picturezor.Error.
class Failed : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// A picture of Python's.
struct Handle {
  explicit Handle(Picture picture, std::shared_ptr<std::recursive_mutex> turn = {})
      : Of(std::move(picture)), Turn(turn ? std::move(turn) : std::make_shared<std::recursive_mutex>()) {}

  Picture Of;
  /// Threads take turns at the samples, so a picture and its views share it.
  std::shared_ptr<std::recursive_mutex> Turn;
  /// A view that was made when arrays on the samples were, so that they outlive close().
  Picture Exported;
  bool Closed = false;
};

inline const Picture& Opened(const Handle& handle) {
  if (handle.Closed || !handle.Of.Valid()) throw std::invalid_argument("the picture is closed");
  return handle.Of;
}

/// Holds the turns of some pictures, without the interpreter's lock, which a thread that waits would keep
/// from the one that it waits for.
class AtWork {
 public:
  explicit AtWork(std::initializer_list<const Handle*> handles) {
    Turns.reserve(handles.size());
    for (const Handle* handle : handles)
      if (handle) Turns.push_back(handle->Turn.get());
    // In one order everywhere, so that no two threads wait for each other.
    std::sort(Turns.begin(), Turns.end());
    Turns.erase(std::unique(Turns.begin(), Turns.end()), Turns.end());
    for (auto* turn : Turns) turn->lock();
  }
  AtWork(const AtWork&) = delete;
  ~AtWork() {
    for (auto* turn : Turns) turn->unlock();
  }

 private:
  py::gil_scoped_release Released;
  std::vector<std::recursive_mutex*> Turns;
};

/// How a parameter of the library's is given in Python, and how it gets there.
template <class T>
struct Given {
  using Type = T;
  static T Native(const Type& value) { return value; }
  static const Handle* HandleOf(const Type&) { return nullptr; }
};
template <>
struct Given<Picture> {
  using Type = const Handle*;
  static Picture Native(Type value) { return value ? Opened(*value) : Picture(); }
  static const Handle* HandleOf(Type value) { return value; }
};
template <>
struct Given<Rect> {
  using Type = std::tuple<std::int32_t, std::int32_t, std::int32_t, std::int32_t>;
  static Rect Native(const Type& value) {
    const auto [x, y, width, height] = value;
    return {x, y, width, height};
  }
  static const Handle* HandleOf(const Type&) { return nullptr; }
};
template <>
struct Given<IntegerArray> {
  using Type = std::vector<std::int32_t>;
  static IntegerArray Native(const Type& value) { return IntegerArray(value); }
  static const Handle* HandleOf(const Type&) { return nullptr; }
};
template <class T>
using GivenAs = Given<std::remove_cvref_t<T>>;

/// A result as Python gets it: a new picture, a view, or one of the arguments.
template <class... Handles>
Handle Wrapped(Picture picture, const char* name, const Handles*... handles) {
  if (!picture) throw Failed(std::string(name) + ": it can't be done with these pictures");
  for (const Handle* handle : {handles...})
    if (handle && handle->Of == picture) return *handle;
  for (const Handle* handle : {handles...})
    if (handle && picture.Parent() && handle->Of == picture.Parent()) return Handle(picture, handle->Turn);
  return Handle(picture);
}

/// A method of the class as one of Python's: the pictures' turns held, the interpreter's lock released, nil
/// and false become picturezor.Error.
template <class R, class... A>
auto Method(const char* name, R (Picture::*method)(A...) const) {
  return [name, method](const Handle& self, typename GivenAs<A>::Type... arguments) {
    const Picture& picture = Opened(self);
    std::tuple<std::remove_cvref_t<A>...> native{GivenAs<A>::Native(arguments)...};
    const auto call = [&]() -> R {
      const AtWork working({&self, GivenAs<A>::HandleOf(arguments)...});
      return std::apply([&](auto&... given) -> R { return (picture.*method)(given...); }, native);
    };
    if constexpr (std::is_same_v<R, Picture>) {
      return Wrapped(call(), name, &self, GivenAs<A>::HandleOf(arguments)...);
    } else if constexpr (std::is_same_v<R, bool>) {
      if (!call()) throw Failed(std::string(name) + ": it can't be done with these pictures");
    } else if constexpr (std::is_base_of_v<HostPicture, R>) {
      R result = call();
      if (!result) throw Failed(std::string(name) + ": the host has no such picture");
      return result;
    } else {
      return call();
    }
  };
}

using PictureClass = py::class_<Handle>;

// Each adds its part of the class.
void AddPictures(py::module_& module, PictureClass& pictures);
void AddSamples(py::module_& module, PictureClass& pictures);
void AddOperations(PictureClass& pictures);

}
