#include "named.h"

#include <unistd.h>

#include <charconv>

#include "failure.h"
#include "temporary_files.h"

namespace picturezor::files {

namespace {

constexpr const char* Standard = "-";

/// Takes the number off a name like FILE[2]; 0 stands for none.
int TakePage(std::string& name) {
  const std::size_t bracket = name.rfind('[');
  std::error_code failed;
  if (!name.ends_with(']') || bracket == name.npos || std::filesystem::exists(name, failed)) return 0;
  int page = 0;
  const char *first = name.data() + bracket + 1, *last = name.data() + name.size() - 1;
  const auto [rest, wrong] = std::from_chars(first, last, page);
  if (rest != last || wrong != std::errc()) return 0;
  if (page < 1) throw UsageFailure(name, "pictures of a file are counted from 1 on");
  name.resize(bracket);
  return page;
}

}

std::unique_ptr<ImageReader> OpenNamed(const std::filesystem::path& name, ReadOptions options) {
  std::string file = name.string();
  if (const int page = TakePage(file)) options.Page = page - 1;
  return OpenImage(file == Standard ? Input::Descriptor(STDIN_FILENO, "standard input") : Input(file),
                   options);
}

const FileType& TypeToWrite(const std::filesystem::path& name, const std::string& type) {
  if (!type.empty()) return TypeByName(type);
  if (name == Standard) throw UsageFailure("--type has to say what standard output is to be");
  return TypeByExtension(name);
}

std::unique_ptr<Output> OutputNamed(const std::filesystem::path& name, const FileType& type,
                                    const std::filesystem::path& spool) {
  if (name != Standard) return std::make_unique<OutputFile>(name);
  return std::make_unique<OutputDescriptor>(STDOUT_FILENO, "standard output", type.InOrder, spool);
}

}
