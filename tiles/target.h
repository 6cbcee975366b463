#pragma once
#include <filesystem>
#include <memory>
#include <set>
#include <string>
#include <utility>

#include "output.h"

namespace picturezor::tiles {

/// Where the files of a pyramid go. Failures are thrown as files::Failure.
class TileTarget {
 public:
  virtual ~TileTarget() = default;
  /// A file to write, by its name below the place where the pyramid is to stand. Several threads may begin
  /// files at once.
  virtual std::unique_ptr<files::Output> Begin(const std::string& name) const = 0;
  /// The file is written and committed. Called from one thread.
  virtual void Add(files::Output& /*file*/) {}
  /// All files of a row of a level's tiles have been added; and whether they had been, in an earlier run.
  virtual void AddRow(int /*level*/, std::int32_t /*row*/) {}
  virtual bool HasRow(int /*level*/, std::int32_t /*row*/) const { return false; }
  /// The pyramid is complete.
  virtual void Commit() = 0;
};

/// A name's file or folder, and what stands for it until it is complete: NAME.unfinished, which stays where
/// the work is interrupted.
class UnfinishedFolder : public TileTarget {
 public:
  void Commit() override;

 protected:
  /// `name` is what the names of all files begin with. Throws where the pyramid is there already.
  UnfinishedFolder(const std::filesystem::path& parent, const std::string& name);
  void RequireFree(const std::filesystem::path& file) const;

  const std::filesystem::path Parent, Unfinished;
  const std::string Name;
};

/// One that a single run fills.
class FolderTarget final : public UnfinishedFolder {
 public:
  /// `task` says what is done with what: with `resume` the rows of an unfinished pyramid with the same task
  /// needn't be made again.
  FolderTarget(const std::filesystem::path& parent, const std::string& name, const std::string& task,
               bool resume);
  std::unique_ptr<files::Output> Begin(const std::string& name) const override;
  void AddRow(int level, std::int32_t row) override;
  bool HasRow(int level, std::int32_t row) const override { return Rows.contains({level, row}); }
  void Commit() override;

 private:
  const std::filesystem::path JournalName;
  std::unique_ptr<files::Output> Journal;
  std::set<std::pair<int, std::int32_t>> Rows;
};

/// One that several runs fill, on one machine or many, and one of them commits. Each file is whole or not
/// there, also where two runs make it.
class SharedFolderTarget final : public UnfinishedFolder {
 public:
  /// Throws where the folder is that of another task; and without `begins` where it isn't there.
  SharedFolderTarget(const std::filesystem::path& parent, const std::string& name, const std::string& task,
                     bool begins);
  std::unique_ptr<files::Output> Begin(const std::string& name) const override;
  /// Nobody writes any more: what runs left that were killed is removed.
  void Commit() override;
  /// What a part, counted from 1, keeps for who joins them.
  std::filesystem::path PartName(std::int32_t part) const {
    return Unfinished / ("part-" + std::to_string(part));
  }
};

/// One uncompressed ZIP, with 64 bits where it needs them. It stands under its name when it is complete.
class ZipTarget final : public TileTarget {
 public:
  /// With `folder` all files stand in a folder of that name in it.
  explicit ZipTarget(const std::filesystem::path& file, const std::string& folder = {});
  ~ZipTarget() override;
  std::unique_ptr<files::Output> Begin(const std::string& name) const override;
  void Add(files::Output& file) override;
  void Commit() override;

 private:
  void Check(int result) const;

  std::unique_ptr<files::Output> File;
  const std::filesystem::path Folder;
  struct Archive;
  std::unique_ptr<Archive> Of;
};

}
