#include <chrono>
#include <functional>

#include "failure.h"
#include "handle.h"
#include "output.h"
#include "progress.h"
#include "run.h"
#include "step.h"
#include "written_steps.h"

// Image files, and what is described in steps/.

namespace picturezor::python {

namespace {

using py::arg;

/// Tells a function of Python's, and lets Ctrl-C and what the function raises end the work.
class Reporter final : public files::Progress {
 public:
  explicit Reporter(py::object function) : Function(std::move(function)) {}

  void Begin(const std::string& stage, std::int64_t steps) override {
    Stage = stage;
    Done = 0;
    Total = steps;
    Tell();
  }
  void Step(std::int64_t steps) override {
    Done += steps;
    if (Done == Total)
      Tell();
    else
      Tick();
  }
  void Tick() override {
    if (std::chrono::steady_clock::now() - Last > std::chrono::milliseconds(50)) Tell();
  }

  /// Does long work without the interpreter's lock, and raises what ended it.
  template <class Work>
  auto Run(std::initializer_list<const Turn*> turns, Work&& work) {
    try {
      const AtWork working(turns);
      return work();
    } catch (const files::Cancelled&) {
      if (Raised) std::rethrow_exception(Raised);
      throw;
    }
  }

 private:
  void Tell() {
    Last = std::chrono::steady_clock::now();
    const py::gil_scoped_acquire locked;
    try {
      if (PyErr_CheckSignals() != 0) throw py::error_already_set();
      if (!Function.is_none()) Function(Stage, Done, Total);
    } catch (const py::error_already_set&) {
      Raised = std::current_exception();
      throw files::Cancelled();
    }
  }

  py::object Function;
  std::string Stage;
  std::int64_t Done = 0, Total = 0;
  std::chrono::steady_clock::time_point Last;
  std::exception_ptr Raised;
};

void Warn(const std::string& text) {
  if (PyErr_WarnEx(PyExc_UserWarning, text.c_str(), 2) != 0) throw py::error_already_set();
}

files::StoreOptions StoresFor(std::optional<std::int64_t> memoryLimit,
                              const std::optional<std::filesystem::path>& tempDirectory) {
  return {files::Store::Auto, memoryLimit.value_or(files::DefaultMemoryLimit()),
          tempDirectory.value_or(files::DefaultTempDirectory())};
}

/// A path, the bytes of a file, or a descriptor with what it is called.
Handle Open(const py::object& source, const std::string& name, std::optional<std::int64_t> memoryLimit,
            const std::optional<std::filesystem::path>& tempDirectory, int page, py::object progress) {
  std::optional<GivenBytes> bytes;
  std::optional<std::filesystem::path> file;
  int descriptor = -1;
  if (PyObject_CheckBuffer(source.ptr()))
    bytes.emplace(source);
  else if (py::isinstance<py::int_>(source))
    descriptor = source.cast<int>();
  else
    file = std::filesystem::absolute(source.cast<std::filesystem::path>());
  if (page < 0) throw std::invalid_argument("pages are counted from 0 on");
  Reporter reporter(std::move(progress));
  return reporter.Run({}, [&] {
    auto origin = std::make_shared<Origin>();
    origin->Stores = StoresFor(memoryLimit, tempDirectory);
    const files::Input input = bytes  ? files::Input::Memory(*bytes, name)
                               : file ? files::Input(*file)
                                      : files::Input::Descriptor(descriptor, name);
    const auto reader = files::OpenImage(input, {.MemoryLimit = origin->Stores->MemoryLimit,
                                                 .TempDirectory = origin->Stores->TempDirectory,
                                                 .Page = page});
    if (page >= reader->Info().Pages)
      throw std::invalid_argument("page " + std::to_string(page) + " of " +
                                  std::to_string(reader->Info().Pages));
    origin->Info = files::Upright(reader->Info());
    const files::ImageInfo& info = *origin->Info;
    const Picture picture = files::MakePictures(*origin->Stores, {{info.Width, info.Height, info.Pixels}})[0];
    files::ReadInto(picture, *reader, reporter);
    Handle handle(picture, origin);
    if (file) handle.File = *file;
    handle.Page = page;
    return handle;
  });
}

files::WriteOptions WritingOf(int quality, const std::optional<std::string>& compression,
                              std::optional<int> level, bool lossless, std::int32_t tile, bool big,
                              bool pyramid) {
  if (quality < 1 || quality > 100) throw std::invalid_argument("the quality is 1 to 100");
  if (level && (*level < 0 || *level > 9)) throw std::invalid_argument("the level is 0 to 9");
  if (tile < 0 || tile % 16 != 0) throw std::invalid_argument("a tile's edge is a multiple of 16");
  files::WriteOptions options{
      .Quality = quality, .Lossless = lossless, .Level = level, .Tile = tile, .Big = big, .Pyramid = pyramid};
  if (!compression) return options;
  const auto packing = files::Compressions().find(*compression);
  if (packing == files::Compressions().end())
    throw std::invalid_argument("no compression is called " + *compression);
  options.Packing = packing->second;
  return options;
}

/// Writes a file, or gives its bytes.
std::optional<py::bytes> Save(const Handle& self, const std::optional<std::filesystem::path>& target,
                              const std::string& type, int quality,
                              const std::optional<std::string>& compression, std::optional<int> level,
                              bool lossless, std::int32_t tile, bool big, bool pyramid, py::object progress) {
  const files::WriteOptions options = WritingOf(quality, compression, level, lossless, tile, big, pyramid);
  Reporter reporter(std::move(progress));
  Bytes bytes;
  const bool opaque = reporter.Run({&self.At}, [&] {
    const Picture& picture = Opened(self);
    const std::filesystem::path name = target.value_or(type);
    const files::FileType& as = type.empty() ? files::TypeByExtension(name) : files::TypeByName(type);
    const Format pixels = files::FileFormatOf(picture);
    files::ImageInfo info = self.From && self.From->Info ? *self.From->Info : files::ImageInfo();
    info.Width = picture.Width();
    info.Height = picture.Height();
    info.Pixels = files::StorableFormat(name, as, pixels);
    if (!files::ProfileFits(info.Profile, info.Pixels)) info.Profile.clear();
    files::RequireStorableSize(name, as, info.Width, info.Height);
    const auto write = [&](files::Output& output) {
      const auto writer = as.Create(output.Descriptor(), name, info, options);
      if (!writer) throw files::Failure(name, std::string(as.Name) + " can only be read");
      flow::Run(picture, {info.Width, info.Height, pixels, info.Density}, info.Pixels, *writer,
                {StoresOf(self), 0}, reporter);
      output.Commit();
    };
    if (target) {
      files::OutputFile output(name);
      write(output);
    } else {
      files::OutputBytes output(name);
      write(output);
      bytes = std::move(output.Result);
    }
    return info.Pixels != pixels;
  });
  if (opaque) Warn("alpha is dropped, since this file type has none");
  if (target) return {};
  return AsBytes(bytes);
}

/// What a command calls --mask-colour is mask_colour here.
std::string PythonName(std::string name) {
  for (char& letter : name)
    if (letter == '-') letter = '_';
  return name;
}

std::string PythonWords(const std::string& text) {
  std::string words;
  for (std::size_t at = 0; at < text.size();) {
    const std::size_t option = std::min(text.find("--", at), text.size());
    words += text.substr(at, option - at);
    const std::size_t end = std::min(text.find_first_of(" ,:;", option), text.size());
    if (option < text.size()) words += PythonName(text.substr(option + 2, end - option - 2));
    at = end;
  }
  return words;
}

/// What was given for an option: a text as with the command, or the thing itself.
steps::Value ValueOf(const steps::Option& option, const py::handle& value) {
  using steps::Kind;
  const auto text = [&] {
    return py::str(py::module_::import("os").attr("fspath")(value)).cast<std::string>();
  };
  try {
    if (option.Of == Kind::File && py::isinstance<Handle>(value)) return Opened(value.cast<const Handle&>());
    if (option.Of == Kind::Choice || option.Of == Kind::File) return text();
    if (py::isinstance<py::str>(value)) return steps::ParseValue(option, text());
    switch (option.Of) {
      case Kind::Flag: return value.cast<bool>();
      case Kind::Integer: return value.cast<std::int64_t>();
      case Kind::Number: return value.cast<double>();
      case Kind::Colour: return value.cast<Color>();
      case Kind::Numbers:
        if (py::isinstance<py::sequence>(value)) return value.cast<steps::Numbers>();
        return value.cast<double>();
      default: return value.cast<steps::Integers>();
    }
  } catch (const py::cast_error&) {
  }
  throw py::type_error(PythonName(option.Name) + " can't be " + py::repr(value).cast<std::string>());
}

std::unique_ptr<const flow::Operation> OperationOf(const steps::Step& step, const py::dict& given,
                                                   const steps::Surroundings& around) {
  std::map<std::string, steps::Value> values;
  for (const steps::Option& option : step.Options)
    if (const std::string name = PythonName(option.Name); given.contains(name))
      values[option.Name] = ValueOf(option, given[name.c_str()]);
  return steps::MakeOperation(step, std::move(values), around);
}

Handle RunChain(const Handle& self, std::initializer_list<const Turn*> turns,
                const std::function<flow::Chain(const steps::Surroundings&)>& make, py::object progress) {
  std::vector<std::string> notes;
  const files::StoreOptions stores = StoresOf(self);
  const steps::Surroundings around{stores, [&](const std::filesystem::path& file, const std::string& text) {
                                     notes.push_back(file.string() + ": " + text);
                                   }};
  Reporter reporter(std::move(progress));
  try {
    const flow::Chain chain = make(around);
    for (const std::string& note : notes) Warn(note);
    return reporter.Run(turns, [&] {
      const Picture& picture = Opened(self);
      flow::Shape shape{picture.Width(), picture.Height(), files::FileFormatOf(picture), {}};
      const bool known = self.From && self.From->Info;
      if (known) shape.Density = self.From->Info->Density;
      const flow::Shape result = flow::ResultOf(shape, chain);
      auto origin = std::make_shared<Origin>();
      if (self.From) *origin = *self.From;
      if (known) {
        origin->Info->Width = result.Width;
        origin->Info->Height = result.Height;
        origin->Info->Pixels = result.Of;
        origin->Info->Density = result.Density;
      }
      return Handle(flow::ResultOf(picture, shape, chain, {stores, 0}, reporter), origin);
    });
  } catch (const files::UsageFailure& failure) {
    throw files::UsageFailure(PythonWords(failure.what()));
  } catch (const files::Failure& failure) {
    throw files::Failure(PythonWords(failure.what()));
  }
}

Handle RunStep(const Handle& self, const std::string& name, const py::dict& values, py::object progress) {
  // One step takes two pictures beside its own at most.
  std::array<const Turn*, 2> more{};
  std::size_t count = 0;
  for (const auto& [option, value] : values)
    if (py::isinstance<Handle>(value) && count < more.size()) more[count++] = &value.cast<const Handle&>().At;
  return RunChain(
      self, {&self.At, more[0], more[1]},
      [&](const steps::Surroundings& around) {
        const steps::Step* step = steps::FindStep(name);
        if (!step) throw files::UsageFailure("no step is called " + name);
        flow::Chain made;
        made.push_back(OperationOf(*step, values, around));
        return made;
      },
      std::move(progress));
}

Handle RunText(const Handle& self, const std::string& text, py::object progress) {
  return RunChain(
      self, {&self.At},
      [&](const steps::Surroundings& around) {
        return steps::MakeChain(steps::ParseSteps(text, "steps"), around);
      },
      std::move(progress));
}

const char* NameOf(steps::Kind kind) {
  using steps::Kind;
  switch (kind) {
    case Kind::Flag: return "flag";
    case Kind::Integer: return "integer";
    case Kind::Number: return "number";
    case Kind::Choice: return "choice";
    case Kind::Size: return "size";
    case Kind::Rectangle: return "rectangle";
    case Kind::Point: return "point";
    case Kind::Colour: return "colour";
    case Kind::Numbers: return "numbers";
    case Kind::IntegersOrFile: return "integers";
    case Kind::File: return "file";
  }
  return "";
}

py::list Descriptions() {
  py::list all;
  for (const steps::Step* step : steps::Steps()) {
    py::list options;
    for (const steps::Option& option : step->Options) {
      py::dict described;
      described["name"] = PythonName(option.Name);
      described["kind"] = NameOf(option.Of);
      described["help"] = PythonWords(option.Help);
      described["least"] = option.Least;
      described["most"] = option.Most;
      described["default"] = option.Default;
      described["choices"] = option.Choices;
      described["required"] = option.Required;
      options.append(described);
    }
    py::dict described;
    described["name"] = step->Name;
    described["help"] = PythonWords(step->Help);
    described["more"] = PythonWords(step->More);
    described["options"] = options;
    all.append(described);
  }
  return all;
}

py::dict InfoOf(const Handle& self) {
  if (!self.From || !self.From->Info) return {};
  const files::ImageInfo& info = *self.From->Info;
  py::dict known;
  if (info.Density) known["density"] = py::make_tuple(info.Density->X, info.Density->Y);
  if (!info.Profile.empty()) known["profile"] = AsBytes(info.Profile);
  if (!info.Exif.empty()) known["exif"] = AsBytes(info.Exif);
  if (!info.Xmp.empty()) known["xmp"] = AsBytes(info.Xmp);
  if (!info.Iptc.empty()) known["iptc"] = AsBytes(info.Iptc);
  if (info.Pages > 1) known["pages"] = info.Pages;
  if (!info.Notes.empty()) known["notes"] = info.Notes;
  return known;
}

}

void AddFiles(py::module_& module, PictureClass& pictures) {
  module.def("_open", Open, arg("source"), arg("name"), arg("memory_limit"), arg("temp_dir"), arg("page"),
             arg("progress"));
  module.def("_save", Save, arg("picture"), arg("target"), arg("type"), arg("quality"), arg("compression"),
             arg("level"), arg("lossless"), arg("tile"), arg("big"), arg("pyramid"), arg("progress"));
  module.def("_run", RunStep, arg("picture"), arg("step"), arg("values"), arg("progress"));
  module.def("_run_text", RunText, arg("picture"), arg("steps"), arg("progress"));
  module.def("_steps", Descriptions);
  pictures.def(
      "_like",
      [](const Handle& self) {
        const Picture& picture = Opened(self);
        const files::PictureSize size{picture.Width(), picture.Height(), picture.ImageFormat()};
        return Handle(files::MakePictures(StoresOf(self), {size})[0], self.From);
      },
      "Return a picture of the same size and format, stored where results of this picture are.");
  module.def("_parse_bytes", files::ParseBytes);
  pictures.def_property_readonly(
      "info", InfoOf,
      "A dict with the metadata of the file, which is carried over to files that are saved: density (pixels "
      "per inch, horizontally and vertically), profile, exif, xmp and iptc. pages is the number of images in "
      "the file, if there are several; notes lists what was changed when it was read.");
  pictures.def_property_readonly("_file", [](const Handle& self) { return std::pair(self.File, self.Page); });
}

}
