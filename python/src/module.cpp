#include "failure.h"
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
  PictureClass pictures(module, "Picture", py::custom_type_setup(SetBuffer),
                        "An image of 8-bit samples, in memory or in a mapped file, or a view of one. A "
                        "rectangle is (x, y, width, height) in pixels, cut off at the edges; a negative "
                        "width or height goes to the left or up. A `dest` is as large as the result at "
                        "least, and has its channels; it is what comes back. Error is raised for what can't "
                        "be done with these pictures or this memory, IndexError for a row or place outside, "
                        "ValueError for a closed picture and a wrong value or name, TypeError for another "
                        "type.");
  AddHostPictures(module, pictures);
  AddPictures(module, pictures);
  AddSamples(pictures);
  AddOperations(pictures);
  AddFiles(module, pictures);
  module.def("alive", Alive, "How many objects of each kind the module and the host have now.");
  module.def(
      "_declarations",
      [] {
        std::vector<std::pair<std::string, bool>> rows;
        for (const auto& row : Host::Methods("PictureZOR"))
          rows.emplace_back(row.Declaration, row.Assignable);
        return rows;
      },
      "The methods of the class as the module declares them, and whether they can be assigned to.");
}

}
