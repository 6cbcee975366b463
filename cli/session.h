#pragma once
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "failure.h"
#include "image_file.h"
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
  /// Of images that are written; empty where their names tell it.
  std::string TypeName;
  ProgressBar Bar;
  /// What the chosen command does; gives its exit code.
  std::function<int()> Work;

  /// A line on standard error, unless --quiet.
  void Note(const std::filesystem::path& file, const std::string& text);
};

/// -q, and the options of where pictures live.
void AddStoreOptions(CLI::App& command, Session& session);
/// --quality, --type.
void AddWriteOptions(CLI::App& command, Session& session);

/// An image file that is open, its notes told.
struct OpenedImage {
  std::filesystem::path File;
  std::unique_ptr<ImageReader> Reader;
  /// With the orientation applied.
  ImageInfo Upright;
  /// What alone counts of the picture as it is stored.
  std::optional<Rect> Part;

  OpenedImage(Session& session, const std::filesystem::path& file);
  PictureSize Size() const { return {Upright.Width, Upright.Height, Upright.Pixels}; }
  /// From now on only this part of the upright picture counts.
  void Limit(const Rect& part);
  /// Reads all of it, once.
  void ReadInto(Session& session, const Picture& picture) { files::ReadInto(picture, *Reader, session.Bar); }
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
  /// Carries an image through operations into the file, in another format of files at the end, and completes
  /// it. A profile goes along only where its colours fit.
  void Carry(Session& session, OpenedImage& source, const flow::Chain& chain, Format format, int threads = 0);
  /// Writes and completes the file. `info` tells what else goes into it.
  void Write(Session& session, const Picture& picture, Format format, ImageInfo info);
  /// The file stands under its name from now on.
  void Commit();

 private:
  std::unique_ptr<ImageWriter> Writer(Session& session, Format format, ImageInfo info);

  std::filesystem::path File, Spool;
  const FileType& Type;
  std::unique_ptr<files::Output> Output;
};

/// An operation that a command puts together.
class Work final : public flow::Operation {
 public:
  using Function = std::function<Picture(const Picture& source, const flow::Workplace& at)>;
  Work(flow::Dependence needs, int pictures, Function function,
       std::function<void(flow::Shape&)> reshape = {})
      : Needs(needs), AtATime(pictures), Of(std::move(function)), Reshape(std::move(reshape)) {}
  flow::Shape Result(const flow::Shape& source) const override;
  flow::Dependence DependsOn(const flow::Shape&) const override { return Needs; }
  int Pictures() const override { return AtATime; }
  Picture Apply(Picture source, const flow::Workplace& at) const override { return Of(source, at); }

 private:
  flow::Dependence Needs;
  int AtATime;
  Function Of;
  std::function<void(flow::Shape&)> Reshape;
};

/// A chain of one.
flow::Chain ChainOf(flow::Dependence needs, int pictures, Work::Function function,
                    std::function<void(flow::Shape&)> reshape = {});

/// "256M", "1.5G" or a plain number of bytes. Throws UsageFailure.
std::int64_t ParseBytes(const std::string& text);
/// Numbers with a letter between them, "640x480" or "10,20". Throws UsageFailure naming the option.
std::vector<std::int64_t> ParseNumbers(const std::string& option, const std::string& text, char between,
                                       std::size_t count);

/// 6 digits of hexadecimal, with or without a # before them. Throws UsageFailure naming the option.
Color ParseColor(const std::string& option, const std::string& text);

/// Each adds its command to the program.
void AddScale(CLI::App& app, Session& session);
void AddConvert(CLI::App& app, Session& session);
void AddCrop(CLI::App& app, Session& session);
void AddCombine(CLI::App& app, Session& session);
void AddChannels(CLI::App& app, Session& session);
void AddCompare(CLI::App& app, Session& session);
void AddFilter(CLI::App& app, Session& session);
void AddMirror(CLI::App& app, Session& session);
void AddRotate(CLI::App& app, Session& session);
void AddInfo(CLI::App& app, Session& session);
void AddThumbnail(CLI::App& app, Session& session);
void AddShow(CLI::App& app, Session& session);

}
