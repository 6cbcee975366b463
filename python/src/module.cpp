#include "failure.h"
#include "handle.h"
#include "picturezor/host.h"

namespace picturezor::python {

namespace {

void AddExceptions(py::module_& module) {
  static py::exception<Failed> error(module, "Error", PyExc_RuntimeError);
  error.doc() = "An operation that can't be performed although its arguments are valid.";
  py::register_exception_translator([](std::exception_ptr pointer) {
    try {
      if (pointer) std::rethrow_exception(pointer);
    } catch (const Failed& failed) {
      error(failed.what());
    } catch (const files::UsageFailure& failed) {
      PyErr_SetString(PyExc_ValueError, failed.what());
    } catch (const files::Failure& failed) {
      error(failed.what());
    } catch (const HostException& raised) {
      // The host has one exception for rows that aren't there and for formats without a way to each other.
      if (std::string_view(raised.what()).starts_with("Conversion"))
        error(raised.what());
      else
        PyErr_SetString(raised.ClassName() == "OutOfBoundsException" ? PyExc_IndexError : PyExc_ValueError,
                        raised.what());
    } catch (const ModuleError& failed) {
      error(failed.what());
    }
  });
}

/// What the module and the host have at a time, for those who look for what was left behind.
py::dict Alive() {
  const Host::Alive alive = Host::Count();
  py::dict counts;
  counts["objects"] = alive.Objects;
  counts["strings"] = alive.Strings;
  counts["memory_blocks"] = alive.MemoryBlocks;
  counts["open_descriptions"] = alive.OpenDescriptions;
  counts["gworlds"] = alive.GWorlds;
  counts["pixel_locks"] = alive.PixelLocks;
  return counts;
}

}

PYBIND11_MODULE(_core, module) {
  AddExceptions(module);
  Host::Load();
  AddNames(module);
  PictureClass pictures(
      module, "Picture", py::custom_type_setup(SetBuffer),
      "An image of 8-bit samples, in memory or in a mapped file, or a view of one. A rectangle is (x, y, "
      "width, height) in pixels and is clipped to the picture; a negative width or height extends to the "
      "left or upwards. A `dest` must be at least as large as the result and have its channels; it is "
      "returned. By default, a new picture is made. Channels that a filter doesn't support are left "
      "unchanged in `dest`, and are 0 in a new picture. Raises Error for operations that these pictures or "
      "the free memory don't allow, IndexError for a row or pixel outside the picture, ValueError for a "
      "closed picture and for invalid values and names, TypeError for a wrong type.");
  AddHostPictures(module, pictures);
  AddPictures(module, pictures);
  AddSamples(pictures);
  AddOperations(pictures);
  AddFiles(module, pictures);
  module.def("alive", Alive, "Return how many objects of each kind the module and the host currently hold.");
  module.def(
      "_declarations",
      [] {
        std::vector<std::pair<std::string, bool>> rows;
        for (const auto& row : Host::Methods("PictureZOR"))
          rows.emplace_back(row.Declaration, row.Assignable);
        return rows;
      },
      "Return the methods of the class as the module declares them, and whether each can be assigned to.");
}

}
