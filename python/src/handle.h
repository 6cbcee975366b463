#pragma once
#include <pybind11/pybind11.h>
#include <pybind11/stl.h>
#include <pybind11/stl/filesystem.h>

#include <array>
#include <atomic>
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

#include "arguments.h"
#include "pictures.h"
#include "picturezor/picture.h"

// How Python's pictures stand for the library's: who holds what, who waits for whom, what comes back.

namespace picturezor::python {

/// What can't be done though its arguments are right: picturezor.Error.
class Failed : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// What Python knows of an object of the library, however it came to it.
struct State {
  std::recursive_mutex Access;
  bool Closed = false;
};
/// One thread at a time is at a picture, its views, and the host's picture that it may stand on.
using Turn = std::shared_ptr<State>;

/// What a picture hands on to those that are made from it.
struct Origin {
  /// Where pictures live; without it half of the free memory counts.
  std::optional<files::StoreOptions> Stores;
  /// What was in the file beside the pixels, as of the upright picture.
  std::optional<files::ImageInfo> Info;
};

/// A picture of Python's.
struct Handle {
  /// Nil becomes picturezor.Error.
  explicit Handle(Picture picture, std::shared_ptr<const Origin> origin = {});

  Picture Of;
  /// Of the picture itself, and of what its samples belong to.
  std::shared_ptr<State> Own;
  Turn At;
  std::shared_ptr<const Origin> From;
  /// The file that it was read from, unchanged since.
  std::filesystem::path File;
  int Page = 0;
};

/// A picture of the host.
struct HostHandle {
  explicit HostHandle(HostPicture picture);
  /// A part of another one.
  HostHandle(HostPicture picture, Turn at) : Of(std::move(picture)), At(std::move(at)) {}

  HostPicture Of;
  Turn At;
};

/// Throws std::invalid_argument once a picture is closed.
const Picture& Opened(const Handle& handle);
files::StoreOptions StoresOf(const Handle& handle);

/// Holds the turns of some pictures, without the interpreter's lock, which a thread that waits would keep
/// from the one that it waits for.
class AtWork {
 public:
  /// Null ones count for nothing.
  explicit AtWork(std::initializer_list<const Turn*> turns);
  AtWork(const AtWork&) = delete;
  ~AtWork();
  /// The threads that are at work, this one too. Exact for who holds the interpreter's lock.
  static int Threads() { return Working; }

 private:
  static inline std::atomic<int> Working = 0;

  py::gil_scoped_release Released;
  std::array<State*, 4> Held{};
  std::size_t Count = 0;
};

/// A reference to something of Python's that is given up on whatever thread.
class Reference {
 public:
  explicit Reference(py::object object);
  const py::object& Object() const { return *Of; }

 private:
  std::shared_ptr<py::object> Of;
};

inline py::bytes AsBytes(const Bytes& bytes) {
  return py::bytes(reinterpret_cast<const char*>(bytes.data()), bytes.size());
}
/// Anything with the buffer protocol, its bytes one after the other.
struct GivenBytes {
  explicit GivenBytes(const py::object& object) {
    if (PyObject_GetBuffer(object.ptr(), &Of, PyBUF_C_CONTIGUOUS) != 0) throw py::error_already_set();
  }
  GivenBytes(const GivenBytes&) = delete;
  ~GivenBytes() { PyBuffer_Release(&Of); }
  operator std::span<const std::uint8_t>() const {
    return {static_cast<const std::uint8_t*>(Of.buf), std::size_t(Of.len)};
  }
  Py_buffer Of{};
};

/// How a parameter of the library's is given in Python, and how it gets there.
template <class T>
struct Given {
  using Type = T;
  static T Native(const Type& value) { return value; }
  static const Turn* TurnOf(const Type&) { return nullptr; }
  static void RequireOpen(const Type&) {}
};
template <>
struct Given<Picture> {
  using Type = const Handle*;
  static Picture Native(Type value) { return value ? value->Of : Picture(); }
  static const Turn* TurnOf(Type value) { return value ? &value->At : nullptr; }
  static void RequireOpen(Type value) {
    if (value) Opened(*value);
  }
};
template <>
struct Given<HostPicture> {
  using Type = const HostHandle*;
  static HostPicture Native(Type value) { return value ? value->Of : HostPicture(); }
  static const Turn* TurnOf(Type value) { return value ? &value->At : nullptr; }
  static void RequireOpen(Type) {}
};
template <class Enum>
requires std::is_enum_v<Enum>
struct Given<Enum> {
  using Type = Named<Enum>;
  static Enum Native(const Type& value) { return value; }
  static const Turn* TurnOf(const Type&) { return nullptr; }
  static void RequireOpen(const Type&) {}
};
template <>
struct Given<IntegerArray> : Given<std::vector<std::int32_t>> {
  static IntegerArray Native(const Type& value) { return IntegerArray(value); }
};
template <class T>
using GivenAs = Given<std::remove_cvref_t<T>>;

/// A result on its way to Python.
class Result {
 public:
  /// To be made while the turns are held. Nil is picturezor.Error.
  template <class... Arguments>
  Result(Picture picture, const char* name, const Handle& self, const Arguments&... arguments) {
    if (!picture) throw Failed(std::string(name) + ": it can't be done with these pictures");
    const auto compare = [&](const auto& argument) {
      if constexpr (std::is_same_v<std::remove_cvref_t<decltype(argument)>, const Handle*>)
        if (argument && argument->Of == picture) Same = argument;
    };
    compare(&self);
    (compare(arguments), ...);
    if (!Same) New.emplace(std::move(picture), self.From);
  }
  /// The very object that was given for it, or a new one.
  py::object ToPython() && {
    return Same ? py::cast(Same, py::return_value_policy::reference) : py::cast(std::move(*New));
  }

 private:
  const Handle* Same = nullptr;
  std::optional<Handle> New;
};

/// A method of the class as one of Python's: the pictures' turns held, the interpreter's lock released, nil
/// and false become picturezor.Error.
template <class R, class... A>
auto Method(const char* name, R (Picture::*method)(A...) const) {
  return [name, method](const Handle& self, typename GivenAs<A>::Type... arguments) {
    const auto call = [&](const auto& take) {
      std::tuple<std::remove_cvref_t<A>...> native{GivenAs<A>::Native(arguments)...};
      const AtWork working({&self.At, GivenAs<A>::TurnOf(arguments)...});
      Opened(self);
      (GivenAs<A>::RequireOpen(arguments), ...);
      return take(
          [&] { return std::apply([&](auto&... given) { return (self.Of.*method)(given...); }, native); });
    };
    const auto require = [&](const auto& result) {
      if (!result) throw Failed(std::string(name) + ": it can't be done with these pictures");
    };
    if constexpr (std::is_same_v<R, Picture>) {
      return call([&](const auto& made) { return Result(made(), name, self, arguments...); }).ToPython();
    } else if constexpr (std::is_same_v<R, bool>) {
      call([&](const auto& done) { require(done()); });
    } else if constexpr (std::is_same_v<R, HostPicture> || std::is_same_v<R, GWorld>) {
      R result = call([](const auto& made) { return made(); });
      require(result);
      if constexpr (std::is_same_v<R, GWorld>)
        return result;
      else
        return HostHandle(std::move(result));
    } else {
      return call([](const auto& value) { return value(); });
    }
  };
}

using PictureClass = py::class_<Handle>;

// Each adds its part of the module.
void AddNames(py::module_& module);
void AddPictures(py::module_& module, PictureClass& pictures);
/// Lets the class show its samples as a buffer.
void SetBuffer(PyHeapTypeObject* type);
void AddSamples(PictureClass& pictures);
void AddOperations(PictureClass& pictures);
void AddHostPictures(py::module_& module, PictureClass& pictures);
void AddFiles(py::module_& module, PictureClass& pictures);

}
