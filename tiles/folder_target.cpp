#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>
#include <system_error>

#include "failure.h"
#include "target.h"
#include "temporary_files.h"

namespace picturezor::tiles {

namespace {

using files::Failure;
using std::filesystem::path;

/// A file in the unfinished folder.
class PlainFile final : public files::Output {
 public:
  PlainFile(const path& file, int flags) : Output(file) {
    constexpr mode_t mode = 0666;
    File = open(file.c_str(), O_CREAT | O_CLOEXEC | flags, mode);
    if (File < 0 && errno == ENOENT) {
      std::error_code failed;
      std::filesystem::create_directories(file.parent_path(), failed);
      if (failed) throw Failure(file.parent_path(), failed.message());
      File = open(file.c_str(), O_CREAT | O_CLOEXEC | flags, mode);
    }
    if (File < 0) throw Failure(file, std::strerror(errno));
  }
  void Commit() override {
    const int file = std::exchange(File, -1);
    if (close(file) != 0) throw Failure(Name, std::strerror(errno));
  }
};

void Rename(const path& from, const path& to) {
  if (rename(from.c_str(), to.c_str()) != 0) throw Failure(to, std::strerror(errno));
}

}

UnfinishedFolder::UnfinishedFolder(const path& parent, const std::string& name)
    : Parent(parent), Unfinished(parent / (name + ".unfinished")), Name(name) {
  for (const char* ending : {"", "_files", ".dzi", ".html"}) RequireFree(Parent / (Name + ending));
}

void UnfinishedFolder::RequireFree(const path& file) const {
  std::error_code failed;
  if (std::filesystem::exists(std::filesystem::symlink_status(file, failed)))
    throw Failure(file, "it is there already; remove it first, or choose another name");
}

void UnfinishedFolder::Commit() {
  // What says that there is a pyramid comes last.
  constexpr std::array endings{"", "_files", ".html", ".dzi"};
  for (const char* ending : endings) RequireFree(Parent / (Name + ending));
  const files::SignalsHeldBack held;
  // What is half moved isn't gone on with: its tiles would be missing.
  for (const auto& entry : std::filesystem::directory_iterator(Unfinished))
    if (std::ranges::none_of(endings,
                             [&](const char* ending) { return entry.path().filename() == Name + ending; }))
      std::filesystem::remove(entry.path());
  for (const char* ending : endings)
    if (const path file = Unfinished / (Name + ending); std::filesystem::exists(file))
      Rename(file, Parent / (Name + ending));
  std::error_code failed;
  std::filesystem::remove_all(Unfinished, failed);
}

FolderTarget::FolderTarget(const path& parent, const std::string& name, const std::string& task, bool resume)
    : UnfinishedFolder(parent, name), JournalName(Unfinished / "journal") {
  bool goesOn = false;
  if (std::ifstream journal(JournalName); resume && journal) {
    std::string before;
    goesOn = std::getline(journal, before) && before == task;
    // A line that was cut off has no end, and its row is made again.
    for (std::string line; goesOn && std::getline(journal, line) && !journal.eof();) {
      std::istringstream numbers(line);
      int level = 0;
      std::int32_t row = 0;
      if (numbers >> level >> row) Rows.insert({level, row});
    }
  }
  std::error_code failed;
  // Only what has a journal is ours to remove.
  if (!goesOn && std::filesystem::exists(JournalName)) std::filesystem::remove_all(Unfinished, failed);
  if (failed) throw Failure(Unfinished, failed.message());
  if (!goesOn && std::filesystem::exists(Unfinished))
    throw Failure(Unfinished, "parts of a pyramid, or something else, are there; remove it first");
  Journal = std::make_unique<PlainFile>(JournalName, O_WRONLY | O_APPEND);
  files::WriteAll(Journal->Descriptor(), goesOn ? "\n" : task + "\n", JournalName);
}

std::unique_ptr<files::Output> FolderTarget::Begin(const std::string& name) const {
  return std::make_unique<PlainFile>(Unfinished / name, O_WRONLY | O_TRUNC);
}

void FolderTarget::AddRow(int level, std::int32_t row) {
  files::WriteAll(Journal->Descriptor(), std::to_string(level) + " " + std::to_string(row) + "\n",
                  JournalName);
}

void FolderTarget::Commit() {
  Journal->Commit();
  UnfinishedFolder::Commit();
}

SharedFolderTarget::SharedFolderTarget(const path& parent, const std::string& name, const std::string& task,
                                       bool begins)
    : UnfinishedFolder(parent, name) {
  // Not the name that a single run's journal has, which a run without parts would begin anew.
  const path taskName = Unfinished / "task";
  if (!begins && !std::filesystem::exists(taskName)) throw Failure(Unfinished, "no part is made yet");
  std::error_code failed;
  std::filesystem::create_directories(Unfinished, failed);
  if (failed) throw Failure(Unfinished, failed.message());
  if (!std::filesystem::exists(taskName)) {
    for (const auto& entry : std::filesystem::directory_iterator(Unfinished))
      // Another run may be just here, and write the same.
      if (!entry.path().filename().string().starts_with(files::TemporaryPrefix) &&
          !std::filesystem::exists(taskName))
        throw Failure(Unfinished, "something else is there");
    files::OutputFile file(taskName);
    files::WriteAll(file.Descriptor(), task + "\n", taskName);
    file.Commit();
  }
  std::ifstream file(taskName);
  std::string before;
  if (!std::getline(file, before) || before != task)
    throw Failure(Unfinished,
                  "the unfinished pyramid of another image, or with other options; remove it first");
}

std::unique_ptr<files::Output> SharedFolderTarget::Begin(const std::string& name) const {
  // Not the folder itself, which is gone once somebody has completed the pyramid.
  path folder = Unfinished;
  for (const path& part : path(name).parent_path()) {
    folder /= part;
    if (mkdir(folder.c_str(), 0777) != 0 && errno != EEXIST) throw Failure(folder, std::strerror(errno));
  }
  return std::make_unique<files::OutputFile>(Unfinished / name);
}

void SharedFolderTarget::Commit() {
  std::vector<path> left;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(Unfinished))
    if (entry.path().filename().string().starts_with(files::TemporaryPrefix)) left.push_back(entry.path());
  for (const path& file : left) std::filesystem::remove(file);
  UnfinishedFolder::Commit();
}

}
