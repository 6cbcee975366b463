#include "handle.h"
#include "picturezor/host.h"

namespace picturezor::python {

namespace {

void AddExceptions(py::module_& module) {
  static py::exception<Failed> error(module, "Error", PyExc_RuntimeError);
  error.doc() = "What can't be done though its arguments are right.";
  py::register_exception_translator([](std::exception_ptr pointer) {
    try {
      if (pointer) std::rethrow_exception(pointer);
    } catch (const Failed& failed) {
      error(failed.what());
    } catch (const HostException& raised) {
      PyErr_SetString(raised.ClassName() == "OutOfBoundsException" ? PyExc_IndexError : PyExc_ValueError,
                      raised.what());
    } catch (const ModuleError& failed) {
      error(failed.what());
    }
  });
}

}

PYBIND11_MODULE(_core, module) {
  AddExceptions(module);
  Host::Load();
  PictureClass pictures(module, "Picture", py::buffer_protocol(),
                        "An image of 8-bit samples, in memory or in a mapped file, or a view of one.");
  py::class_<Color>(module, "Colour",
                    "Red, green and blue; a string like '#ff8000' or a tuple does where one is asked for.")
      .def(py::init([](const std::string& text) {
        const std::string digits = text.starts_with('#') ? text.substr(1) : text;
        std::size_t used = 0;
        unsigned long value = 0;
        try {
          value = std::stoul(digits, &used, 16);
        } catch (const std::logic_error&) {
        }
        if (digits.size() != 6 || used != 6)
          throw std::invalid_argument(text + " isn't a colour like ff8000");
        return Color{std::uint8_t(value >> 16), std::uint8_t(value >> 8), std::uint8_t(value)};
      }))
      .def(py::init([](const std::tuple<std::uint8_t, std::uint8_t, std::uint8_t>& parts) {
        return Color{std::get<0>(parts), std::get<1>(parts), std::get<2>(parts)};
      }))
      .def_readwrite("red", &Color::Red)
      .def_readwrite("green", &Color::Green)
      .def_readwrite("blue", &Color::Blue);
  py::implicitly_convertible<py::str, Color>();
  py::implicitly_convertible<py::tuple, Color>();
  AddPictures(module, pictures);
  AddSamples(module, pictures);
  AddOperations(pictures);
}

}
