#include "command_test_support.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <random>
#include <sstream>

namespace picturezor::tests {

Arguments operator+(Arguments first, const Arguments& more) {
  first.insert(first.end(), more.begin(), more.end());
  return first;
}

Arguments Words(const std::string& line) {
  Arguments words;
  std::istringstream stream(line);
  for (std::string word; stream >> word;) words.push_back(word == "''" ? "" : word);
  return words;
}

Raster Noise(int width, int height, int channels) {
  std::mt19937 random(std::uint32_t(width * 31 + height * 7 + channels));
  Raster raster{width, height, channels, Bytes(std::size_t(width * height * channels))};
  for (auto& sample : raster.Samples) sample = std::uint8_t(random());
  return raster;
}

Raster Waves(int width, int height, int channels) {
  Raster raster{width, height, channels, {}};
  for (int y = 0; y < height; ++y)
    for (int x = 0; x < width; ++x)
      for (int c = 0; c < channels; ++c)
        raster.Samples.push_back(
            std::uint8_t(128 + 60 * std::sin(x * 0.07 + c) + 60 * std::cos(y * 0.05 * c)));
  return raster;
}

int Difference(const Raster& a, const Raster& b) {
  if (a.Width != b.Width || a.Height != b.Height || a.Channels != b.Channels) return 256;
  int most = 0;
  for (std::size_t i = 0; i < a.Samples.size(); ++i)
    most = std::max(most, std::abs(a.Samples[i] - b.Samples[i]));
  return most;
}

Bytes ReadBytes(const std::filesystem::path& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

void WriteBytes(const std::filesystem::path& file, const Bytes& bytes) {
  std::ofstream(file, std::ios::binary)
      .write(reinterpret_cast<const char*>(bytes.data()), std::streamsize(bytes.size()));
}

void WriteEmptyTIFF(const std::filesystem::path& file, std::uint32_t width, std::uint32_t height,
                    std::uint32_t whiteFrom) {
  const std::uint32_t tags[][3] = {{256, 4, width}, {257, 4, height}, {258, 3, 8},
                                   {259, 3, 1},     {262, 3, 1},      {273, 4, 8},
                                   {277, 3, 1},     {278, 4, height}, {279, 4, width * height}};
  Bytes directory;
  const auto put = [](Bytes& bytes, std::uint32_t value, int count) {
    for (int i = 0; i < count; ++i) bytes.push_back(std::uint8_t(value >> 8 * i));
  };
  put(directory, std::size(tags), 2);
  for (const auto& [tag, type, value] : tags) {
    put(directory, tag, 2);
    put(directory, type, 2);
    put(directory, 1, 4);
    put(directory, value, 4);
  }
  put(directory, 0, 4);
  Bytes header = {'I', 'I', 42, 0};
  put(header, 8 + width * height, 4);
  WriteBytes(file, header);
  std::filesystem::resize_file(file, 8 + std::uintmax_t{width} * std::min(whiteFrom, height));
  std::ofstream stream(file, std::ios::binary | std::ios::app);
  const std::string white(width, char(255));
  for (std::uint32_t y = whiteFrom; y < height; ++y) stream << white;
  stream.close();
  std::filesystem::resize_file(file, 8 + std::uintmax_t{width} * height);
  std::ofstream(file, std::ios::binary | std::ios::app)
      .write(reinterpret_cast<const char*>(directory.data()), std::streamsize(directory.size()));
}

Bytes Profile(const std::string& space) {
  // libpng takes no notice of one that gets very short when it is compressed.
  Bytes profile = Noise(532, 1, 1).Samples;
  std::fill_n(profile.begin(), 132, 0);
  const auto put = [&](std::size_t at, const std::string& text) { std::ranges::copy(text, &profile[at]); };
  profile[2] = 532 >> 8;
  profile[3] = 532 & 255;
  profile[8] = 2;
  put(12, "mntr" + space + "XYZ ");
  put(36, "acsp");
  // The white of D50.
  put(68, {"\x00\x00\xF6\xD6\x00\x01\x00\x00\x00\x00\xD3\x2D", 12});
  return profile;
}

CommandTest::CommandTest() {
  std::string name = (std::filesystem::temp_directory_path() / "picturezor-test-XXXXXX").string();
  if (!mkdtemp(name.data())) throw std::runtime_error("no temporary directory");
  Directory = std::filesystem::path(name) / "files";
  Temporary = std::filesystem::path(name) / "temporary";
  std::filesystem::create_directory(Directory);
  std::filesystem::create_directory(Temporary);
}

CommandTest::~CommandTest() { std::filesystem::remove_all(Directory.parent_path()); }

void CommandTest::TearDown() { EXPECT_TRUE(std::filesystem::is_empty(Temporary)); }

pid_t CommandTest::Start(const Arguments& arguments, int out, int error, std::int64_t fileSizeLimit) const {
  std::vector<char*> list{const_cast<char*>(PICTUREZOR_PROGRAM)};
  for (const std::string& argument : arguments) list.push_back(const_cast<char*>(argument.c_str()));
  list.push_back(nullptr);
  const pid_t process = fork();
  if (process != 0) return process;
  dup2(out, STDOUT_FILENO);
  dup2(error, STDERR_FILENO);
  if (chdir(Directory.c_str()) != 0) _exit(126);
  setenv("TMPDIR", Temporary.c_str(), 1);
  if (fileSizeLimit) {
    const rlimit limit{rlim_t(fileSizeLimit), rlim_t(fileSizeLimit)};
    setrlimit(RLIMIT_FSIZE, &limit);
  }
  execv(PICTUREZOR_PROGRAM, list.data());
  _exit(127);
}

int CommandTest::WaitFor(pid_t process) {
  int status = 0;
  waitpid(process, &status, 0);
  return WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
}

Outcome CommandTest::Run(const Arguments& arguments, std::int64_t fileSizeLimit) const {
  const auto outFile = Directory.parent_path() / "out", errorFile = Directory.parent_path() / "error";
  const int out = open(outFile.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600);
  const int error = open(errorFile.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600);
  const int code = WaitFor(Start(arguments, out, error, fileSizeLimit));
  close(out);
  close(error);
  const Bytes outText = ReadBytes(outFile), errorText = ReadBytes(errorFile);
  return {code, {outText.begin(), outText.end()}, {errorText.begin(), errorText.end()}};
}

std::string CommandTest::Do(const Arguments& arguments) const {
  const Outcome outcome = Run(arguments);
  EXPECT_EQ(outcome.Code, 0) << outcome.Error;
  return outcome.Error;
}

void CommandTest::Fail(const Arguments& arguments, const std::string& file, const std::string& reason) const {
  const auto before = Files();
  const Outcome outcome = Run(arguments);
  EXPECT_EQ(outcome.Code, 2);
  EXPECT_THAT(outcome.Error, testing::StartsWith("picturezor: " + file + ": "));
  EXPECT_THAT(outcome.Error, testing::HasSubstr(reason));
  EXPECT_EQ(std::ranges::count(outcome.Error, '\n'), 1) << outcome.Error;
  EXPECT_EQ(Files(), before);
}

std::vector<std::string> CommandTest::Files() const {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(Directory))
    names.push_back(entry.path().filename());
  std::ranges::sort(names);
  return names;
}

}
