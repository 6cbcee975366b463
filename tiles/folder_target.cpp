#include <fcntl.h>
#include <unistd.h>

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
    : Parent(parent),
      Unfinished(parent / (name + ".unfinished")),
      JournalName(Unfinished / "journal"),
      Name(name) {
  for (const char* ending : {"", "_files", ".dzi", ".html"}) RequireFree(Parent / (Name + ending));
}

void UnfinishedFolder::RequireFree(const path& file) const {
  std::error_code failed;
  if (std::filesystem::exists(std::filesystem::symlink_status(file, failed)))
    throw Failure(file, "it is there already; remove it first, or choose another name");
}

void UnfinishedFolder::Commit() {
  // What says that there is a pyramid comes last.
  for (const char* ending : {"", "_files", ".html", ".dzi"}) {
    const path file = Unfinished / (Name + ending);
    if (!std::filesystem::exists(file)) continue;
    RequireFree(Parent / (Name + ending));
    Rename(file, Parent / (Name + ending));
  }
  std::filesystem::remove_all(Unfinished);
}

FolderTarget::FolderTarget(const path& parent, const std::string& name, const std::string& task, bool resume)
    : UnfinishedFolder(parent, name) {
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
  if (!goesOn && std::filesystem::exists(Unfinished)) throw Failure(Unfinished, "something else is there");
  Journal = std::make_unique<PlainFile>(JournalName, O_WRONLY | O_APPEND);
  const std::string start = goesOn ? "\n" : task + "\n";
  files::WriteAll(Journal->Descriptor(), {reinterpret_cast<const std::uint8_t*>(start.data()), start.size()},
                  JournalName);
}

std::unique_ptr<files::Output> FolderTarget::Begin(const std::string& name) const {
  return std::make_unique<PlainFile>(Unfinished / name, O_WRONLY | O_TRUNC);
}

void FolderTarget::Add(files::Output& file) { file.Commit(); }

void FolderTarget::AddRow(int level, std::int32_t row) {
  const std::string line = std::to_string(level) + " " + std::to_string(row) + "\n";
  files::WriteAll(Journal->Descriptor(), {reinterpret_cast<const std::uint8_t*>(line.data()), line.size()},
                  JournalName);
}

void FolderTarget::Commit() {
  Journal->Commit();
  UnfinishedFolder::Commit();
}

SharedFolderTarget::SharedFolderTarget(const path& parent, const std::string& name, const std::string& task,
                                       bool begins)
    : UnfinishedFolder(parent, name) {
  if (!begins && !std::filesystem::exists(JournalName)) throw Failure(Unfinished, "no part is made yet");
  std::error_code failed;
  std::filesystem::create_directories(Unfinished, failed);
  if (failed) throw Failure(Unfinished, failed.message());
  if (!std::filesystem::exists(JournalName)) {
    // Another run may be just here, and write the same.
    for (const auto& entry : std::filesystem::directory_iterator(Unfinished))
      if (!entry.path().filename().string().starts_with(".picturezor-") && entry.path() != JournalName)
        throw Failure(Unfinished, "something else is there");
    files::OutputFile journal(JournalName);
    const std::string line = task + "\n";
    files::WriteAll(journal.Descriptor(), {reinterpret_cast<const std::uint8_t*>(line.data()), line.size()},
                    JournalName);
    journal.Commit();
  }
  std::ifstream journal(JournalName);
  std::string before;
  if (!std::getline(journal, before) || before != task)
    throw Failure(Unfinished,
                  "the unfinished pyramid of another image, or with other options; remove it first");
}

std::unique_ptr<files::Output> SharedFolderTarget::Begin(const std::string& name) const {
  const path file = Unfinished / name;
  std::error_code failed;
  if (!std::filesystem::exists(Unfinished)) throw Failure(Unfinished, "it is gone");
  std::filesystem::create_directories(file.parent_path(), failed);
  if (failed) throw Failure(file.parent_path(), failed.message());
  return std::make_unique<files::OutputFile>(file);
}

}
