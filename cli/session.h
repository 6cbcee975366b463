#pragma once
#include <filesystem>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "failure.h"
#include "image_file.h"
#include "in_profile.h"
#include "named.h"
#include "pictures.h"
#include "progress_bar.h"
#include "run.h"
#include "temporary_files.h"

namespace CLI {
class App;
}

namespace picturezor::cli {

using namespace files;

/// What a script reads off; after a signal the shell gives 128 and its number.
enum ExitCode : int { Done = 0, Different = 1, Failed = 2, WrongUsage = 3 };

/// What all commands share: the options that several of them have, and the ways to the person at the other
/// end.
struct Session {
  bool Quiet = false;
  StoreOptions Stores;
  WriteOptions Writing;
  /// Of images that are read; as they are where it is empty.
  std::optional<TargetProfile> Profile;
  /// Whether images are written without notes, profile and resolution.
  bool Strip = false;
  /// Of images that are written; empty where their names tell it.
  std::string TypeName;
  /// 0 is one a processor.
  int Threads = 0;
  ProgressBar Bar;
  /// What the chosen command does; gives its exit code.
  std::function<int()> Work;
  bool NeedsModule = true;

  /// A line on standard error, unless --quiet. On any thread.
  void Note(const std::filesystem::path& file, const std::string& text);
  /// A line on standard error. Gives the exit code.
  int Complain(std::string text, ExitCode code);

 private:
  std::mutex Told;
};

/// -q, and the options of where pictures live.
void AddStoreOptions(CLI::App& command, Session& session);
/// How images are written: --type, --quality, --compression and those of TIFF.
void AddWriteOptions(CLI::App& command, Session& session);

/// For who does one image after another: memory that is given back stays with the process, since the system
/// would have to clear it for the next image.
void KeepMemory();
std::unique_ptr<ImageReader> OpenFor(const Session& session, const std::filesystem::path& file);

/// An image file that is open, its notes told.
struct OpenedImage {
  std::filesystem::path File;
  std::unique_ptr<ImageReader> Reader;
  /// With the orientation applied.
  ImageInfo Upright;

  OpenedImage(Session& session, const std::filesystem::path& file);
  PictureSize Size() const { return {Upright.Width, Upright.Height, Upright.Pixels}; }
  flow::Shape Shape() const { return {Upright.Width, Upright.Height, Upright.Pixels, Upright.Density}; }
  /// The file, to work on once; as often as wanted where it can be opened again.
  flow::OpenFile Take(const Session& session);
  /// All of its rows, upright, after some operations, once.
  std::unique_ptr<flow::Rows> Rows(Session& session, const flow::Chain& chain = {});
};

/// The file that a command writes. Made before the work, so that one that can't be written shows early.
class Target {
 public:
  Target(Session& session, const std::filesystem::path& file);
  ~Target();
  /// What of `pixels` the file can hold; says so where alpha is lost.
  Format Storable(Session& session, Format pixels) const;
  /// Refuses a size that the file can't hold, and starts the file.
  void Start(std::int64_t width, std::int64_t height);
  /// Carries an image through operations into the file, in another format of files at the end. A profile
  /// goes along only where its colours fit.
  void Carry(Session& session, OpenedImage& source, flow::Chain chain, Format format, int threads,
             Progress& progress);
  /// For the rows, as pixels of `format`. `info` tells what else goes into the file.
  std::unique_ptr<ImageWriter> Writer(const Session& session, Format format, ImageInfo info, int threads);
  /// The file stands under its name from now on.
  void Commit();

 private:
  std::filesystem::path File, Spool;
  const FileType& Type;
  std::unique_ptr<files::Output> Output;
};

/// Each adds its command to the program; AddSteps those that the steps describe.
void AddSteps(CLI::App& app, Session& session);
void AddRun(CLI::App& app, Session& session);
void AddChannels(CLI::App& app, Session& session);
void AddCompare(CLI::App& app, Session& session);
void AddInfo(CLI::App& app, Session& session);
void AddFormats(CLI::App& app, Session& session);
void AddThumbnail(CLI::App& app, Session& session);
void AddShow(CLI::App& app, Session& session);
void AddCompletion(CLI::App& app, Session& session);
void AddTiles(CLI::App& app, Session& session);
void AddView(CLI::App& app, Session& session);

}
