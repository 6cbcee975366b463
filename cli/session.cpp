#include "session.h"

#ifdef __GLIBC__
#include <malloc.h>
#endif

#include <CLI/CLI.hpp>
#include <algorithm>
#include <climits>
#include <cstdio>
#include <map>

#include "begin.h"
#include "file_types.h"

namespace picturezor::cli {

void Session::Note(const std::filesystem::path& file, const std::string& text) {
  if (Quiet) return;
  const std::lock_guard lock(Told);
  Bar.Clear();
  std::fprintf(stderr, "picturezor: %s: note: %s\n", file.c_str(), text.c_str());
}

int Session::Complain(std::string text, ExitCode code) {
  Bar.Clear();
  std::ranges::replace(text, '\n', ' ');
  std::fprintf(stderr, "picturezor: %s\n", text.c_str());
  return code;
}

void AddStoreOptions(CLI::App& command, Session& session) {
  static const std::map<std::string, Store> stores{
      {"auto", Store::Auto}, {"memory", Store::Memory}, {"mapped", Store::Mapped}};
  command.add_flag("-q,--quiet", session.Quiet, "Print no notes and no progress bar");
  command
      .add_option_function<std::string>(
          "--store", [&session](const std::string& name) { session.Stores.Kind = stores.at(name); },
          "Where pixels are kept: memory, mapped (in temporary files), or auto (mapped where --memory-limit\n"
          "is exceeded; the default)")
      ->type_name("KIND")
      ->check(CLI::IsMember({"auto", "memory", "mapped"}));
  command
      .add_option_function<std::string>(
          "--memory-limit",
          [&session](const std::string& text) { session.Stores.MemoryLimit = ParseBytes(text); },
          "Memory for all pixel data together, such as 256M or 2G; half of the free memory by default")
      ->type_name("SIZE");
  command
      .add_option("--temp-dir", session.Stores.TempDirectory,
                  "Directory for temporary files; $TMPDIR or /var/tmp by default")
      ->type_name("DIR");
}

namespace {

/// "9", "zstd", or both with a comma between them.
void SetCompression(WriteOptions& writing, const std::string& text) {
  if (const std::size_t comma = text.find(','); comma != text.npos) {
    SetCompression(writing, text.substr(0, comma));
    return SetCompression(writing, text.substr(comma + 1));
  }
  if (const auto packing = Compressions().find(text); packing != Compressions().end())
    writing.Packing = packing->second;
  else if (text.size() == 1 && text[0] >= '0' && text[0] <= '9')
    writing.Level = text[0] - '0';
  else
    throw UsageFailure("--compression: " + text + " isn't 0 to 9, none, lzw, deflate, zstd, jpeg or webp");
}

}

void AddWriteOptions(CLI::App& command, Session& session) {
  WriteOptions& writing = session.Writing;
  command
      .add_option("--type", session.TypeName,
                  "Type of the output file, such as png; by default taken from its extension")
      ->type_name("NAME");
  command
      .add_option(
          "--quality", writing.Quality,
          "Quality of JPEG, WebP and other lossy types, 1 to 100, 90 by default; from 90 on chroma isn't\n"
          "subsampled where the type has a choice")
      ->type_name("N")
      ->check(CLI::Range(1, 100));
  const auto target = [&session]() -> TargetProfile& {
    if (!session.Profile) session.Profile.emplace();
    return *session.Profile;
  };
  CLI::Option* profile =
      command
          .add_option_function<std::string>(
              "--profile", [target](const std::string& name) { target().Profile = ProfileNamed(name); },
              "Convert the colours: to srgb, adobe-rgb, gray, or the ICC profile in a file; from the image's "
              "own\n"
              "profile, or from sRGB where it has none")
          ->type_name("NAME");
  command
      .add_option_function<std::string>(
          "--intent", [target](const std::string& name) { target().By = Intents().at(name); },
          "Rendering intent of --profile: perceptual (default), relative, saturation or absolute")
      ->needs(profile)
      ->type_name("NAME")
      ->check(CLI::IsMember(Intents()));
  command.add_flag("--strip", session.Strip, "Drop EXIF, XMP, IPTC, the colour profile and the resolution");
  command.add_flag("--lossless", writing.Lossless,
                   "Lossless WebP, JPEG XL, AVIF, HEIC and JPEG 2000; PNG, TIFF and PNM always are");
  command
      .add_option_function<std::string>(
          "--compression", [&writing](const std::string& text) { SetCompression(writing, text); },
          "Compression effort of PNG and other types, or of deflate and zstd in TIFF: 0 to 9. For TIFF also\n"
          "the method: none, lzw, deflate, zstd, jpeg or webp; lzw by default. Both may be given:\n"
          "--compression zstd,9")
      ->type_name("N|NAME");
  command.add_option("--tile", writing.Tile, "TIFF with square tiles of N x N pixels, N a multiple of 16")
      ->type_name("N")
      ->check(CLI::Range(16, 1 << 14));
  command.add_flag("--bigtiff", writing.Big, "Write a BigTIFF (64-bit offsets), whatever its size");
  command.add_flag("--pyramid", writing.Pyramid,
                   "TIFF with smaller copies of the image, each half the size of the one before");
}

void KeepMemory() {
#ifdef __GLIBC__
  // The most that it takes; larger pieces are the system's all the same.
  mallopt(M_MMAP_THRESHOLD, 4 * 1024 * 1024 * int(sizeof(long)));
  mallopt(M_TRIM_THRESHOLD, INT_MAX);
#endif
}

std::unique_ptr<ImageReader> OpenFor(const Session& session, const std::filesystem::path& file) {
  auto reader = OpenNamed(file, {.MemoryLimit = session.Stores.MemoryLimit,
                                 .Threads = session.Threads,
                                 .TempDirectory = session.Stores.TempDirectory});
  return session.Profile ? InProfile(std::move(reader), file, *session.Profile) : std::move(reader);
}

OpenedImage::OpenedImage(Session& session, const std::filesystem::path& file)
    : File(file), Reader(OpenFor(session, file)), Upright(files::Upright(Reader->Info())) {
  for (const std::string& note : Upright.Notes) session.Note(file, note);
}

flow::OpenFile OpenedImage::Take(const Session& session) {
  flow::OpenFile file{std::move(Reader), {}};
  // Standard input comes once.
  if (File != "-") file.Again = [&session, name = File] { return OpenFor(session, name); };
  return file;
}

std::unique_ptr<flow::Rows> OpenedImage::Rows(Session& session, const flow::Chain& chain) {
  return flow::Through(Take(session), chain, {session.Stores, session.Threads}, session.Bar);
}

Target::Target(Session& session, const std::filesystem::path& file)
    : File(file), Spool(session.Stores.TempDirectory), Type(TypeToWrite(file, session.TypeName)) {
  const WriteOptions& asked = session.Writing;
  if (&Type != &TIFFType &&
      (asked.Packing != Compression::Usual || asked.Tile > 0 || asked.Big || asked.Pyramid))
    throw UsageFailure(file, std::string(Type.Name) +
                                 " has no tiles, pyramid or 64-bit offsets, and takes at most 0 to 9 for "
                                 "--compression; TIFF has all of them");
}
Target::~Target() = default;

Format Target::Storable(Session& session, Format pixels) const {
  const Format format = StorableFormat(File, Type, pixels);
  if (format != pixels) session.Note(File, std::string(Type.Name) + " has no alpha, so it is dropped");
  return format;
}

void Target::Start(std::int64_t width, std::int64_t height) {
  RequireStorableSize(File, Type, width, height);
  Output = OutputNamed(File, Type, Spool);
}

std::unique_ptr<ImageWriter> Target::Writer(const Session& session, Format format, ImageInfo info,
                                            int threads) {
  info.Pixels = format;
  if (!ProfileFits(info.Profile, format)) info.Profile.clear();
  if (session.Strip) {
    info.Density.reset();
    for (Bytes* notes : {&info.Profile, &info.Exif, &info.Xmp, &info.Iptc}) notes->clear();
  }
  WriteOptions options = session.Writing;
  options.Threads = threads;
  options.MemoryLimit = session.Stores.MemoryLimit;
  return Type.Create(Output->Descriptor(), File, info, options);
}

void Target::Carry(Session& session, OpenedImage& source, flow::Chain chain, Format format, int threads,
                   Progress& progress) {
  ImageInfo info = source.Upright;
  const flow::Shape result = flow::ResultOf(source.Shape(), chain);
  info.Width = result.Width;
  info.Height = result.Height;
  info.Density = result.Density;
  Start(result.Width, result.Height);
  const auto writer = Writer(session, format, std::move(info), threads);
  flow::OpenFile file = source.Take(session);
  flow::LetReaderBegin(file, chain);
  flow::Run(std::move(file), chain, format, *writer, {session.Stores, threads}, progress);
}

void Target::Commit() { Output->Commit(); }

}
