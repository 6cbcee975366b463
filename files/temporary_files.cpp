#include "temporary_files.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <random>
#include <string_view>
#include <utility>

#include "failure.h"

namespace picturezor::files {

namespace {

/// Fixed memory, so that a signal handler can read it at any time.
struct Doomed {
  std::atomic<bool> Used = false;
  bool Directory = false;
  char Path[PATH_MAX] = {};
};
std::array<Doomed, 64> TheDoomed;
/// Several threads may take entries.
std::mutex Taking;
static_assert(std::atomic<bool>::is_always_lock_free);

/// Files stand behind the directory that they are in.
void RemoveDoomed() {
  for (std::size_t i = TheDoomed.size(); i-- > 0;)
    if (TheDoomed[i].Used) {
      if (TheDoomed[i].Directory)
        rmdir(TheDoomed[i].Path);
      else
        unlink(TheDoomed[i].Path);
    }
}

void DieBySignal(int signal) {
  RemoveDoomed();
  // Its action is the default one again, and it is let through when this returns.
  raise(signal);
}

int CodeOfFullDisk = 1;

void DieOfFullDisk(int) {
  RemoveDoomed();
  constexpr char line[] = "picturezor: no space left for the temporary file, or an input file was cut off\n";
  if (write(STDERR_FILENO, line, sizeof line - 1) < 0) _exit(CodeOfFullDisk);
  _exit(CodeOfFullDisk);
}

/// A signal takes such a file along from now on, or no longer.
void RemoveOnDeath(const std::filesystem::path& file, bool directory = false) {
  const std::string path = std::filesystem::absolute(file).string();
  if (path.size() >= PATH_MAX) return;
  const std::lock_guard lock(Taking);
  for (Doomed& entry : TheDoomed)
    if (!entry.Used) {
      std::strcpy(entry.Path, path.c_str());
      entry.Directory = directory;
      entry.Used = true;
      return;
    }
}

void KeepOnDeath(const std::filesystem::path& file) {
  const std::string path = std::filesystem::absolute(file).string();
  const std::lock_guard lock(Taking);
  for (Doomed& entry : TheDoomed)
    if (entry.Used && path == entry.Path) entry.Used = false;
}

constexpr char OpenFiles[] = "/proc/self/fd/";

}

void CatchSignals(int exitCode) {
  CodeOfFullDisk = exitCode;
  struct sigaction action {};
  action.sa_handler = DieBySignal;
  action.sa_flags = SA_RESETHAND;
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGXCPU, SIGALRM}) {
    struct sigaction before {};
    sigaction(signal, nullptr, &before);
    // As under nohup.
    if (before.sa_handler != SIG_IGN) sigaction(signal, &action, nullptr);
  }
  action.sa_handler = DieOfFullDisk;
  sigaction(SIGBUS, &action, nullptr);
  // They come as errors of the write instead.
  std::signal(SIGXFSZ, SIG_IGN);
  std::signal(SIGPIPE, SIG_IGN);
}

std::filesystem::path DefaultTempDirectory() {
  const char* named = std::getenv("TMPDIR");
  return named && *named ? named : "/var/tmp";
}

template <class Make>
int OutputFile::WithNewName(Make&& make) {
  constexpr std::string_view letters = "abcdefghijklmnopqrstuvwxyz0123456789";
  std::random_device random;
  const SignalsHeldBack held;
  for (;;) {
    // Short, since a name may be as long as the system allows already.
    std::string name = (Real.parent_path() / TemporaryPrefix).string();
    for (int i = 0; i < 6; ++i) name += letters[random() % letters.size()];
    if (const int made = make(name.c_str()); made >= 0) {
      Temporary = name;
      RemoveOnDeath(Temporary);
      return made;
    }
    if (errno != EEXIST) throw Failure(Name, std::strerror(errno));
  }
}

OutputFile::OutputFile(const std::filesystem::path& target) : Output(target), Real(target) {
  std::error_code failed;
  // What a link points to is replaced, not the link.
  if (std::filesystem::is_symlink(target, failed)) {
    Real = std::filesystem::weakly_canonical(target, failed);
    if (failed) throw Failure(target, failed.message());
  }
  struct stat about {};
  const bool there = stat(Real.c_str(), &about) == 0;
  if (there && S_ISDIR(about.st_mode)) throw Failure(target, "a directory");
  if (there && !S_ISREG(about.st_mode)) throw Failure(target, "not a regular file");
  if (there && access(Real.c_str(), W_OK) != 0) throw Failure(target, std::strerror(errno));
  const std::filesystem::path directory = Real.has_parent_path() ? Real.parent_path() : ".";
  // Not every file system has files without a name, and there is one way only to name them later.
  if (access(OpenFiles, X_OK) == 0) File = open(directory.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, 0666);
  if (File < 0)
    File =
        WithNewName([](const char* name) { return open(name, O_CREAT | O_EXCL | O_RDWR | O_CLOEXEC, 0666); });
  if (there && fchmod(File, about.st_mode & 07777) != 0) {
    // A file system without permissions has none to set.
  }
}

OutputFile::~OutputFile() {
  if (Temporary.empty()) return;
  unlink(Temporary.c_str());
  KeepOnDeath(Temporary);
}

void OutputFile::Commit() {
  if (Temporary.empty()) {
    const std::string file = OpenFiles + std::to_string(File);
    WithNewName(
        [&](const char* name) { return linkat(AT_FDCWD, file.c_str(), AT_FDCWD, name, AT_SYMLINK_FOLLOW); });
  }
  const int file = std::exchange(File, -1);
  if (close(file) != 0) throw Failure(Name, std::strerror(errno));
  if (rename(Temporary.c_str(), Real.c_str()) != 0) throw Failure(Name, std::strerror(errno));
  KeepOnDeath(Temporary);
  Temporary.clear();
}

int NamelessFile(const std::filesystem::path& directory) {
  const int nameless = open(directory.c_str(), O_TMPFILE | O_EXCL | O_RDWR | O_CLOEXEC, 0600);
  if (nameless >= 0) return nameless;
  // Not every file system has them.
  std::string name = (directory / "picturezor-XXXXXX").string();
  const SignalsHeldBack held;
  const int file = mkostemp(name.data(), O_CLOEXEC);
  if (file < 0)
    throw Failure(directory, std::string("no temporary file can be made there: ") + std::strerror(errno));
  unlink(name.c_str());
  return file;
}

void WriteAll(int descriptor, std::span<const std::uint8_t> bytes, const std::filesystem::path& target) {
  while (!bytes.empty()) {
    const ssize_t count = write(descriptor, bytes.data(), bytes.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) throw Failure(target, std::strerror(errno));
    bytes = bytes.subspan(std::size_t(count));
  }
}

void WriteAll(int descriptor, std::string_view text, const std::filesystem::path& target) {
  WriteAll(descriptor, std::span(reinterpret_cast<const std::uint8_t*>(text.data()), text.size()), target);
}

PrivateDirectory::PrivateDirectory(const std::filesystem::path& parent) {
  std::string name = (parent / "picturezor-XXXXXX").string();
  const SignalsHeldBack held;
  if (!mkdtemp(name.data()))
    throw Failure(parent, std::string("no temporary file can be made there: ") + std::strerror(errno));
  At = name;
  RemoveOnDeath(At, true);
}

PrivateDirectory::~PrivateDirectory() {
  rmdir(At.c_str());
  KeepOnDeath(At);
}

}
