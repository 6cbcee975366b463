#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <condition_variable>
#include <map>
#include <mutex>
#include <thread>

#include "small_picture.h"
#include "step_options.h"
#include "worker_threads.h"

namespace picturezor::cli {

namespace {

using std::filesystem::path;

struct ThumbnailOptions {
  std::vector<path> In;
  path Directory;
  std::string Name = "{stem}.png";
  std::int32_t Size = 0;
  int Jobs = 0;
};

/// What is to become of an image.
struct Thumbnail {
  path In, Out;
  Extent Size;
  /// Why it can't be.
  std::string Failed;
};

/// A picture of inks as light.
class InLight final : public flow::Operation {
 public:
  flow::Shape Result(const flow::Shape& source) const override {
    flow::Shape result = source;
    result.Of = HasAlpha(source.Of) ? Format::RGBA : Format::RGB;
    return result;
  }
  int Pictures() const override { return 3; }
  Picture Apply(Picture source, const flow::Workplace&) const override {
    const HostPicture light = source.CopyPictureWithMask();
    if (!light) throw Failure("no picture can be made from it");
    const Picture result(source.Width(), source.Height(), light.Mask() ? Format::RGBA : Format::RGB);
    result.DrawMaskedPictureRGB(light);
    return result;
  }
};

Extent SizeOf(const ImageInfo& upright, std::int32_t side) {
  const double most = std::min(side, std::max(upright.Width, upright.Height));
  return SizeWithin(upright, most, most);
}

/// A name like '{stem}-{width}.jpg' with everything filled in. Throws UsageFailure.
std::string NameOf(const std::string& pattern, const path& in, const Extent& size) {
  const std::map<std::string, std::string> words{
      {"name", in.filename().string()},
      {"stem", in.stem().string()},
      {"ext", in.has_extension() ? in.extension().string().substr(1) : ""},
      {"width", std::to_string(size.Width)},
      {"height", std::to_string(size.Height)}};
  std::string name;
  for (std::size_t at = 0; at < pattern.size(); ++at) {
    const std::size_t end = pattern.find('}', at);
    if (pattern[at] != '{' || end == pattern.npos) {
      name += pattern[at];
      continue;
    }
    const auto word = words.find(pattern.substr(at + 1, end - at - 1));
    if (word == words.end())
      throw UsageFailure("--name: the placeholders are {stem}, {name}, {ext}, {width} and {height}, not " +
                         pattern.substr(at, end - at + 1));
    name += word->second;
    at = end;
  }
  return name;
}

/// Tells a file from all others, whatever its names.
using Identity = std::pair<dev_t, ino_t>;
std::optional<Identity> IdentityOf(const path& file) {
  struct stat about {};
  if (stat(file.c_str(), &about) != 0) return std::nullopt;
  return Identity{about.st_dev, about.st_ino};
}

/// Finds out all sizes and names. Two of one name, or one that is an image itself, would cost somebody a
/// picture.
std::vector<Thumbnail> Planned(Session& session, const ThumbnailOptions& options) {
  std::vector<Thumbnail> thumbnails;
  std::map<path, path> of;
  std::map<Identity, path> images;
  for (const path& in : options.In) {
    if (const auto identity = IdentityOf(in)) images.emplace(*identity, in);
    Thumbnail one{in, {}, {}, {}};
    try {
      one.Size = SizeOf(Upright(OpenFor(session, in)->Info()), options.Size);
    } catch (const Failure& failure) {
      one.Failed = failure.what();
    }
    one.Out = options.Directory / NameOf(options.Name, in, one.Size);
    TypeToWrite(one.Out, session.TypeName);
    if (one.Failed.empty()) {
      const auto [other, added] = of.emplace(one.Out, in);
      if (!added) throw Failure(in, "its thumbnail would have the name of that of " + other->second.string());
    }
    thumbnails.push_back(one);
  }
  for (const Thumbnail& one : thumbnails)
    if (const auto identity = IdentityOf(one.Out); identity && images.contains(*identity))
      throw Failure(images[*identity], "it would be overwritten by a thumbnail");
  return thumbnails;
}

void Make(Session& session, const Thumbnail& one, int threads) {
  OpenedImage image(session, one.In);
  Target target(session, one.Out);
  flow::Chain chain = ScaleTo(session, image, one.Size, true);
  if (WithoutAlpha(image.Upright.Pixels) == Format::CMYK) chain.push_back(std::make_unique<InLight>());
  Silence silent;
  const Format colours = HasAlpha(image.Upright.Pixels) ? Format::RGBA : Format::RGB;
  target.Carry(session, image, std::move(chain), target.Storable(session, colours), threads, silent);
  target.Commit();
}

/// Makes all of them, some at a time. What keeps one from being made is kept with it.
void MakeAll(Session& session, std::vector<Thumbnail>& thumbnails, int asked) {
  KeepMemory();
  const int processors = files::Processors();
  const int jobs = int(std::min<std::size_t>(std::size_t(asked > 0 ? asked : processors), thumbnails.size()));
  // The jobs share the memory and the processors.
  session.Stores.MemoryLimit /= jobs;
  const int threads = std::max(1, processors / jobs);
  std::mutex access;
  std::condition_variable changed;
  std::size_t next = 0, done = 0;
  const auto work = [&] {
    std::unique_lock lock(access);
    while (next < thumbnails.size()) {
      Thumbnail& one = thumbnails[next++];
      lock.unlock();
      try {
        if (one.Failed.empty()) Make(session, one, threads);
      } catch (const std::bad_alloc&) {
        one.Failed = one.In.string() + ": not enough memory";
      } catch (const steps::Unserved& failure) {
        one.Failed = Failure(one.In, failure.what()).what();
      } catch (const std::exception& failure) {
        one.Failed = failure.what();
      }
      lock.lock();
      ++done;
      changed.notify_one();
    }
  };
  std::vector<std::thread> workers;
  for (int i = 0; i < jobs; ++i) workers.push_back(files::StartThread(work));
  session.Bar.Begin("making", std::int64_t(thumbnails.size()));
  std::unique_lock lock(access);
  for (std::size_t told = 0; told < thumbnails.size();) {
    changed.wait(lock, [&] { return done > told; });
    session.Bar.Step(std::int64_t(done - told));
    told = done;
  }
  lock.unlock();
  for (std::thread& worker : workers) worker.join();
}

int MakeThumbnails(Session& session, const ThumbnailOptions& options) {
  std::vector<Thumbnail> thumbnails = Planned(session, options);
  std::error_code failed;
  std::filesystem::create_directory(options.Directory, failed);
  if (failed) throw Failure(options.Directory, failed.message());
  MakeAll(session, thumbnails, options.Jobs);
  int code = Done;
  for (const Thumbnail& one : thumbnails)
    if (!one.Failed.empty()) code = session.Complain(one.Failed, Failed);
  return code;
}

}

void AddThumbnail(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("thumbnail", "Make thumbnails of many images");
  command->footer(Footer(
      "Aspect ratios are kept, and images that are small already keep their size. Colours become RGB;\n"
      "alpha is kept where the type has it. Images are read at a reduced size where their type has one, as\n"
      "by `scale --draft`. Those that can't be read are listed at the end; the others are made all the\n"
      "same.",
      {"thumbnail photos/*.jpg --size 160 -o contacts",
       "thumbnail photos/* --size 1024 --name '{stem}-{width}.jpg' --quality 80 -o web"}));
  auto options = std::make_shared<ThumbnailOptions>();
  command->add_option("IN", options->In, "Images to read")->required()->type_name("");
  command->add_option("-o,--output", options->Directory, "Directory to write to; created if it doesn't exist")
      ->required()
      ->type_name("DIR");
  command->add_option("--size", options->Size, "Length of the longer side in pixels")
      ->required()
      ->type_name("N")
      ->check(CLI::Range(1, 32767));
  command
      ->add_option("--name", options->Name,
                   "Names of the thumbnails, {stem}.png by default; {stem}, {name}, {ext}, {width} and\n"
                   "{height} stand for the image's name without and with its extension, the extension,\n"
                   "and the size")
      ->type_name("TEXT");
  command->add_option("--jobs", options->Jobs, "Images at a time; 0, the default, is one per processor")
      ->type_name("N")
      ->check(CLI::Range(0, 256));
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback([&session, options] {
    session.Work = [&session, options] { return MakeThumbnails(session, *options); };
  });
}

}
