#include <array>
#include <cerrno>
#include <cstring>

#include "failure.h"
#include "file_types.h"
#include "stream.h"

namespace picturezor::files {

namespace {

/// What the header of a file says.
struct PNMHeader {
  /// The digit of the magic number: 1 to 3 are text, 4 is packed bits, 7 is PAM.
  int Kind = 0;
  std::int64_t Width = 0, Height = 0, Depth = 1, Most = 1;
  std::string Tuple;

  bool Text() const { return Kind <= 3; }
  bool Bits() const { return Kind == 1 || Kind == 4; }
  std::int64_t SampleBytes() const { return Most > 255 ? 2 : 1; }
  std::int64_t RowBytes() const { return Kind == 4 ? (Width + 7) / 8 : Width * Depth * SampleBytes(); }
};

class PNMReader : public ImageReader {
 public:
  explicit PNMReader(const Input& input) : Path(input.Name()), File(input.Open()) {
    ReadHeader();
    const double bytes =
        Of.Bits() ? (Of.Text() ? 1 : 0.125) : double(Of.Depth) * (Of.Text() ? 1 : double(Of.SampleBytes()));
    RequirePlausible(Path, Of.Width, Of.Height, input.Size(), 1 / bytes);
    About.Width = std::int32_t(Of.Width);
    About.Height = std::int32_t(Of.Height);
    About.Bits = Of.Bits() ? 1 : Of.Most > 255 ? 16 : 8;
    if (Of.Most > 255) About.Notes.push_back("16 bits per sample reduced to 8");
    ChoosePixels();
    if (!Of.Text()) Line.resize(std::size_t(Of.RowBytes()));
  }

  void ReadRow(std::uint8_t* row) override {
    const std::int64_t samples = Of.Width * Of.Depth;
    if (!Of.Text() && std::fread(Line.data(), 1, Line.size(), File.get()) != Line.size()) CutOff();
    for (std::int64_t i = 0; i < samples; ++i) {
      if (Of.Kind == 1) {
        row[i] = Bit() ? 0 : 255;
      } else if (Of.Kind == 4) {
        row[i] = Line[std::size_t(i / 8)] >> (7 - i % 8) & 1 ? 0 : 255;
      } else {
        const std::int64_t value = Of.Text() ? Number()
                                   : Of.Most > 255
                                       ? Line[std::size_t(2 * i)] << 8 | Line[std::size_t(2 * i + 1)]
                                       : Line[std::size_t(i)];
        row[i] = std::uint8_t((std::min(value, Of.Most) * 255 + Of.Most / 2) / Of.Most);
      }
    }
  }

  void Finish() override {}

 private:
  [[noreturn]] void Refuse(const std::string& what) const { throw Failure(Path, "corrupt PNM: " + what); }
  [[noreturn]] void CutOff() const {
    throw Failure(Path, std::ferror(File.get()) ? std::strerror(errno) : "the PNM file is cut off");
  }

  int Next() const {
    const int c = std::getc(File.get());
    if (c == EOF) CutOff();
    return c;
  }

  /// The next character that counts, after white space and comments.
  int Skip() const {
    for (;;) {
      int c = Next();
      if (c == '#')
        while (c != '\n') c = Next();
      else if (!std::strchr(" \t\n\v\f\r", c) || c == 0)
        return c;
    }
  }

  /// Takes one character behind the number along, which is white space.
  std::int64_t Number() const {
    int c = Skip();
    std::int64_t value = 0;
    if (c < '0' || c > '9') Refuse("a number is missing");
    for (; c >= '0' && c <= '9'; c = std::getc(File.get()))
      if ((value = value * 10 + (c - '0')) > INT32_MAX) Refuse("a number is too large");
    return value;
  }

  bool Bit() const {
    const int c = Skip();
    if (c != '0' && c != '1') Refuse("a bit is missing");
    return c == '1';
  }

  std::string Word() const {
    std::string word;
    for (int c = Skip(); c > ' ' && word.size() < 32; c = Next()) word += char(c);
    return word;
  }

  void ReadHeader() {
    if (Next() != 'P') Refuse("it doesn't begin with P");
    Of.Kind = Next() - '0';
    if (Of.Kind == 7) {
      for (std::string word = Word(); word != "ENDHDR"; word = Word()) {
        if (word == "WIDTH")
          Of.Width = Number();
        else if (word == "HEIGHT")
          Of.Height = Number();
        else if (word == "DEPTH")
          Of.Depth = Number();
        else if (word == "MAXVAL")
          Of.Most = Number();
        else if (word == "TUPLTYPE")
          Of.Tuple = Word();
        else
          Refuse("its header has a line that can't be");
      }
    } else {
      Of.Width = Number();
      Of.Height = Number();
      Of.Most = Of.Bits() ? 1 : Number();
      Of.Depth = Of.Kind == 3 || Of.Kind == 6 ? 3 : 1;
    }
    if (Of.Most < 1 || Of.Most > 65535) Refuse("its largest sample is out of range");
    if (Of.Depth < 1 || Of.Depth > 5) throw Failure(Path, "PAM files of this depth aren't supported");
  }

  void ChoosePixels() {
    constexpr std::array byDepth{Format::G, Format::GA, Format::RGB, Format::RGBA, Format::CMYKA};
    About.Pixels = Of.Depth == 4 && Of.Tuple == "CMYK" ? Format::CMYK : byDepth[std::size_t(Of.Depth - 1)];
  }

  std::filesystem::path Path;
  Stream File;
  PNMHeader Of;
  Bytes Line;
};

class PNMWriter : public ImageWriter {
 public:
  PNMWriter(int descriptor, const std::filesystem::path& target, const ImageInfo& info)
      : Path(target),
        File(StreamOn(descriptor, target)),
        Size(std::size_t(info.Width) * std::size_t(ChannelsOf(info.Pixels))) {
    const int channels = ChannelsOf(info.Pixels);
    if (channels == 1 || channels == 3) {
      std::fprintf(File.get(), "P%c\n%d %d\n255\n", channels == 1 ? '5' : '6', info.Width, info.Height);
      return;
    }
    const char* tuple = info.Pixels == Format::GA     ? "GRAYSCALE_ALPHA"
                        : info.Pixels == Format::RGBA ? "RGB_ALPHA"
                        : info.Pixels == Format::CMYK ? "CMYK"
                                                      : "CMYK_ALPHA";
    std::fprintf(File.get(), "P7\nWIDTH %d\nHEIGHT %d\nDEPTH %d\nMAXVAL 255\nTUPLTYPE %s\nENDHDR\n",
                 info.Width, info.Height, channels, tuple);
  }

  void WriteRow(const std::uint8_t* row) override {
    if (std::fwrite(row, 1, Size, File.get()) != Size) throw Failure(Path, std::strerror(errno));
  }
  void Finish() override { Flush(File, Path); }

 private:
  std::filesystem::path Path;
  Stream File;
  std::size_t Size;
};

}

const FileType PNMType{
    .Name = "PNM",
    .Extensions = {".pnm", ".ppm", ".pgm", ".pam"},
    .Holds = {Format::G, Format::GA, Format::RGB, Format::RGBA, Format::CMYK, Format::CMYKA},
    .MostEdge = INT32_MAX,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          return start.size() > 2 && start[0] == 'P' && start[1] >= '1' && start[1] <= '7' &&
                 (start[2] <= ' ' || start[2] == '#');
        },
    .InOrder = true,
    .Open = [](const Input& input, const ReadOptions&) -> std::unique_ptr<ImageReader> {
      return std::make_unique<PNMReader>(input);
    },
    .Create = [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
                 const WriteOptions&) -> std::unique_ptr<ImageWriter> {
      return std::make_unique<PNMWriter>(descriptor, target, info);
    },
};

}
