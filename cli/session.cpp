#include "session.h"

#include <CLI/CLI.hpp>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <map>

namespace picturezor::cli {

void Session::Note(const std::filesystem::path& file, const std::string& text) {
  if (Quiet) return;
  Bar.Clear();
  std::fprintf(stderr, "picturezor: %s: note: %s\n", file.c_str(), text.c_str());
}

void AddStoreOptions(CLI::App& command, Session& session) {
  static const std::map<std::string, Store> stores{
      {"auto", Store::Auto}, {"memory", Store::Memory}, {"mapped", Store::Mapped}};
  command.add_flag("-q,--quiet", session.Quiet, "No notes, no progress bar");
  command
      .add_option_function<std::string>(
          "--store", [&session](const std::string& name) { session.Stores.Kind = stores.at(name); },
          "Where pictures live: memory, mapped (in temporary files), or auto (mapped where --memory-limit\n"
          "is passed; the default)")
      ->type_name("KIND")
      ->check(CLI::IsMember({"auto", "memory", "mapped"}));
  command
      .add_option_function<std::string>(
          "--memory-limit",
          [&session](const std::string& text) { session.Stores.MemoryLimit = ParseBytes(text); },
          "Memory for all pictures together, as 256M or 2G; half of the free memory by default")
      ->type_name("SIZE");
  command
      .add_option("--temp-dir", session.Stores.TempDirectory,
                  "Directory of the temporary files; $TMPDIR or /var/tmp by default")
      ->type_name("DIR");
}

void AddWriteOptions(CLI::App& command, Session& session) {
  command
      .add_option("--quality", session.Writing.Quality,
                  "JPEG quality, 1 to 100, 90 by default; from 90 on colours keep their full resolution")
      ->type_name("N")
      ->check(CLI::Range(1, 100));
  command
      .add_option("--type", session.TypeName,
                  "Type of the image that is written, like png; what the name ends in otherwise")
      ->type_name("NAME");
}

namespace {

std::unique_ptr<ImageReader> OpenFor(const Session& session, const std::filesystem::path& file) {
  return OpenNamed(
      file, {.MemoryLimit = session.Stores.MemoryLimit, .TempDirectory = session.Stores.TempDirectory});
}

}

OpenedImage::OpenedImage(Session& session, const std::filesystem::path& file)
    : File(file), Reader(OpenFor(session, file)), Upright(files::Upright(Reader->Info())) {
  for (const std::string& note : Upright.Notes) session.Note(file, note);
}

void OpenedImage::Limit(const Rect& part) {
  Part = Stored(part, Reader->Info());
  Upright.Width = part.Width;
  Upright.Height = part.Height;
}

Target::Target(Session& session, const std::filesystem::path& file)
    : File(file), Spool(session.Stores.TempDirectory), Type(TypeToWrite(file, session.TypeName)) {}
Target::~Target() = default;

Format Target::Storable(Session& session, Format pixels) const {
  const Format format = StorableFormat(File, Type, pixels);
  if (format != pixels) session.Note(File, std::string(Type.Name) + " has no alpha, it is left out");
  return format;
}

void Target::Start(std::int64_t width, std::int64_t height) {
  RequireStorableSize(File, Type, width, height);
  Output = OutputNamed(File, Type, Spool);
}

std::unique_ptr<ImageWriter> Target::Writer(Session& session, Format format, ImageInfo info) {
  info.Pixels = format;
  if (!ProfileFits(info.Profile, format)) info.Profile.clear();
  return Type.Create(Output->Descriptor(), File, info, session.Writing);
}

void Target::Write(Session& session, const Picture& picture, Format format, ImageInfo info) {
  info.Width = picture.Width();
  info.Height = picture.Height();
  const auto writer = Writer(session, format, std::move(info));
  WriteFrom(picture, *writer, format, session.Bar);
  writer->Finish();
}

void Target::Carry(Session& session, OpenedImage& source, const flow::Chain& chain, Format format,
                   int threads) {
  ImageInfo info = source.Upright;
  const flow::Shape result = flow::ResultOf({info.Width, info.Height, info.Pixels, info.Density}, chain);
  info.Width = result.Width;
  info.Height = result.Height;
  info.Density = result.Density;
  const auto writer = Writer(session, format, std::move(info));
  std::function<std::unique_ptr<ImageReader>()> again;
  // Standard input comes once.
  if (source.File != "-") again = [&session, file = source.File] { return OpenFor(session, file); };
  flow::Run({std::move(source.Reader), again, source.Part}, chain, format, *writer, {session.Stores, threads},
            session.Bar);
}

void Target::Commit() { Output->Commit(); }

flow::Shape Work::Result(const flow::Shape& source) const {
  flow::Shape result = source;
  if (Reshape) Reshape(result);
  return result;
}

flow::Chain ChainOf(flow::Dependence needs, int pictures, Work::Function function,
                    std::function<void(flow::Shape&)> reshape) {
  flow::Chain chain;
  chain.push_back(std::make_unique<Work>(needs, pictures, std::move(function), std::move(reshape)));
  return chain;
}

std::int64_t ParseBytes(const std::string& text) {
  double number = 0;
  const char* end = text.data() + text.size();
  auto [rest, failed] = std::from_chars(text.data(), end, number);
  double unit = 1;
  if (failed == std::errc() && rest != end) {
    constexpr std::string_view letters = "KMGT";
    const auto power = letters.find(char(std::toupper(*rest)));
    unit = power == letters.npos ? 0 : std::pow(1024.0, double(power + 1));
    ++rest;
    if (rest != end && *rest == 'i') ++rest;
    if (rest != end && *rest == 'B') ++rest;
  }
  const double bytes = number * unit;
  if (failed != std::errc() || rest != end || !(bytes >= 1) || bytes > 1e18)
    throw UsageFailure("--memory-limit: " + text + " isn't a size like 256M or 2G");
  return std::int64_t(bytes);
}

std::vector<std::int64_t> ParseNumbers(const std::string& option, const std::string& text, char between,
                                       std::size_t count) {
  std::vector<std::int64_t> numbers;
  const char *at = text.data(), *end = at + text.size();
  while (numbers.size() < count) {
    std::int64_t number = 0;
    const auto [rest, failed] = std::from_chars(at, end, number);
    if (failed != std::errc()) break;
    numbers.push_back(number);
    at = rest;
    if (at == end || *at != between) break;
    ++at;
  }
  if (numbers.size() != count || at != end)
    throw UsageFailure(option + ": " + text + " isn't " + std::to_string(count) + " whole numbers with '" +
                       between + "' between them");
  return numbers;
}

Color ParseColor(const std::string& option, const std::string& text) {
  const std::string digits = text.starts_with('#') ? text.substr(1) : text;
  std::uint32_t colour = 0;
  const char* end = digits.data() + digits.size();
  const auto [rest, failed] = std::from_chars(digits.data(), end, colour, 16);
  if (failed != std::errc() || rest != end || digits.size() != 6)
    throw UsageFailure(option + ": " + text + " isn't a colour like ff8000");
  return {std::uint8_t(colour >> 16), std::uint8_t(colour >> 8), std::uint8_t(colour)};
}

}
