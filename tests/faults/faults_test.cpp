#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>

#include "faults/shim.h"
#include "support/in_child.h"
#include "support/row_arguments.h"

// Each call to the system and to the host that can fail is made to fail once, in every row of the class.

namespace picturezor {
namespace {

using model::MethodEntry;

Faults& Shim() {
  static void* const module = dlopen(PICTUREZOR_MODULE, RTLD_NOW | RTLD_NOLOAD);
  return *static_cast<Faults*>(dlsym(module, "TheFaults"));
}

/// Runs body with the calls from `first` on failing, `count` of them, and gives the number of calls.
template <class Body>
int WithFaults(int first, int count, Body&& body) {
  Faults& faults = Shim();
  faults.Calls = 0;
  faults.First = first;
  faults.Count = count;
  body();
  const int calls = faults.Calls;
  faults.First = faults.Count = 0;
  return calls;
}

/// The windows on files that are mapped now.
int Windows() {
  std::ifstream maps("/proc/self/maps");
  int windows = 0;
  for (std::string line; std::getline(maps, line);)
    windows += line.find("picturezor-test-") != std::string::npos;
  return windows;
}

/// What the module and the host hold.
struct Held {
  Host::Alive InHost = Host::Count();
  int Blocks = Shim().Blocks, Descriptors = Shim().Descriptors, Mapped = Windows();
};

bool IsShared(const MethodEntry& row) {
  return std::ranges::any_of(model::ClassNamed("PictureZOR").SharedMethods,
                             [&](const MethodEntry& shared) { return shared.Record == row.Record; });
}

int FilesInTemporaryFolder() {
  int files = 0;
  const std::string ours = "picturezor-test-" + std::to_string(getpid());
  for (const auto& entry : std::filesystem::directory_iterator(std::filesystem::temp_directory_path()))
    files += entry.path().filename().string().starts_with(ours);
  return files;
}

/// Calls a row with good arguments while calls to the system fail. Gives the number of calls that could have.
int Try(const MethodEntry& row, StoredPicture::Kind kind, Format format, int first, int count) {
  const Held before;
  int calls = 0;
  {
    const RowArguments with(kind, format);
    const bool constructs = row.LowerName == "constructor";
    const Picture made = UnbuiltPicture(), self = constructs ? made : with.Self();
    const std::vector<Value> arguments = with.Ordinary(row);
    const std::vector<Samples> rows =
        constructs || row.LowerName == "close" ? std::vector<Samples>() : StoredRows(self);
    // What these rows give is another picture; their own one is only read.
    const bool reads = row.Of.Result == "picturezor" || row.Of.Result == "picture" ||
                       row.Of.Result == "variant" || row.Of.Result == "string" ||
                       row.Of.Result == "memoryblock";
    Outcome outcome;
    calls = WithFaults(first, count, [&] {
      outcome = IsShared(row) ? CallShared(row, arguments) : CallRow(row, self.Address(), arguments);
    });
    const Value& result = outcome.Result;
    EXPECT_TRUE(outcome.Raised.empty() || (!result.Address && !result.Whole));
    if (row.Of.Result == "picturezor" && result.Address) {
      const Picture picture(Object::Adopt(result.Address));
      // A view of a picture whose window couldn't be mapped is made, and can't be used.
      if (picture.Valid()) picture.IntegerProperty("Width");
    } else {
      GiveBack(row.Of.Result, result);
    }
    const bool unchanged = row.LowerName != "close" && (reads || !outcome.Raised.empty());
    EXPECT_TRUE(!unchanged || StoredRows(self) == rows) << "the picture was only to be read";
    if (row.Record->Setter) {
      const Value value = with.Assigned(row);
      calls = std::max(calls,
                       WithFaults(first, count, [&] { AssignRow(row, self.Address(), arguments, value); }));
    }
    if (constructs && self.Valid()) self.Row(0);
    // A closed picture has no rows to look at; a whole stored row that is set, or cleared, holds the
    // surroundings too.
    const bool wholeRows =
        row.LowerName == "row" || (row.LowerName == "clearrect" && row.Of.Parameters.empty());
    EXPECT_TRUE(row.LowerName == "close" || wholeRows || with.SurroundingsIntact());
  }
  const Held after;
  EXPECT_EQ(after.InHost, before.InHost) << "objects are left in the host";
  EXPECT_EQ(after.Blocks, before.Blocks) << "memory is left";
  EXPECT_EQ(after.Mapped, before.Mapped) << "mappings are left";
  EXPECT_EQ(after.Descriptors, before.Descriptors) << "descriptors are left";
  return calls;
}

// Catches a result that isn't tested, and what isn't given back on the way out.
TEST(Faults, OfEachCallInEachRow) {
  int rows = 0, injected = 0;
  std::vector<MethodEntry> all = model::ClassNamed("PictureZOR").Methods;
  std::ranges::copy(model::ClassNamed("PictureZOR").SharedMethods, std::back_inserter(all));
  for (const MethodEntry& row : all) {
    ++rows;
    for (const auto& [kind, format] : {std::pair(StoredPicture::Block, Format::RGBA),
                                       {StoredPicture::Block, Format::G},
                                       {StoredPicture::Mapped, Format::RGBA}}) {
      SCOPED_TRACE(std::string(row.Record->Declaration) + " on " + StoredPicture::NameOf(kind) + ", format " +
                   std::to_string(int(format)));
      // The host's services are looked up at the first call.
      Try(row, kind, format, 0, 0);
      const int calls = Try(row, kind, format, 0, 0);
      for (int n = 1; n <= calls && !testing::Test::HasFailure(); ++n)
        for (const int count : {1, 1 << 20}) {
          SCOPED_TRACE("call " + std::to_string(n) + (count > 1 ? " and all later ones" : ""));
          Try(row, kind, format, n, count);
          ++injected;
        }
    }
  }
  EXPECT_EQ(FilesInTemporaryFolder(), 0);
  std::printf("%d rows, %d faults injected\n", rows, injected);
}

// Threads that can't be started leave their share to the caller.
TEST(Faults, OfEachThread) {
  const auto scaled = [](int threads) {
    const Picture source(60, 200, Format::RGB), dest(90, 90, Format::RGB);
    FillWithNoise(source, 3);
    EXPECT_TRUE(threads ? dest.ScaleMT(threads, source, {}, Kernel::Lanczos3, 90, 90)
                        : dest.Scale(source, {}, Kernel::Lanczos3, 90, 90));
    return StoredRows(dest);
  };
  const std::vector<Samples> wanted = scaled(0);
  Shim().ThreadsOnly = true;
  int calls = 1;
  for (int n = 0; n <= calls; ++n) {
    int pipes[2];
    ASSERT_EQ(pipe(pipes), 0);
    // Threads stay for good once they are there, so each case is a process.
    const pid_t child = fork();
    if (child == 0) {
      std::vector<Samples> rows;
      const int made = WithFaults(n, 1, [&] { rows = scaled(8); });
      if (write(pipes[1], &made, sizeof made) < 0) _exit(2);
      _exit(rows == wanted && !testing::Test::HasFailure() ? 0 : 1);
    }
    int status = 0, made = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0) << "call " << n;
    if (read(pipes[0], &made, sizeof made) == sizeof made && n == 0) calls = made;
    close(pipes[0]);
    close(pipes[1]);
  }
  Shim().ThreadsOnly = false;
  EXPECT_GE(calls, 8);
}

/// A file system of two megabytes in a name space of the child's own; false where that isn't allowed.
bool MountSmallDisk(const char* at) {
  return (unshare(CLONE_NEWNS) == 0 || unshare(CLONE_NEWUSER | CLONE_NEWNS) == 0) &&
         mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
         mount("tmpfs", at, "tmpfs", 0, "size=2m") == 0;
}

bool FillUp(const std::filesystem::path& file) {
  std::ofstream out(file, std::ios::binary);
  const std::vector<char> bytes(1 << 16, 'x');
  while (out.write(bytes.data(), std::ptrdiff_t(bytes.size())) && out.flush()) {
  }
  return !out;
}

// A file that the disk can't hold is refused. One that was made has its blocks, so that its rows can be
// written when the disk is full; a page that can't be had then would end the process.
TEST(Faults, OfAFullDisk) {
  char folder[] = "/tmp/picturezor-disk-XXXXXX";
  ASSERT_NE(mkdtemp(folder), nullptr);
  InChild([&] {
    if (!MountSmallDisk(folder)) std::_Exit(0);
    const std::filesystem::path disk = folder;
    EXPECT_FALSE(Picture::Mapped(disk / "large", 1000, 3000, Format::G).Valid());
    EXPECT_FALSE(std::filesystem::exists(disk / "large"));
    const Picture picture = Picture::Mapped(disk / "fits", 1000, 250, Format::G);
    EXPECT_TRUE(picture.Valid());
    EXPECT_TRUE(FillUp(disk / "rest"));
    EXPECT_FALSE(Picture::Mapped(disk / "more", 10, 10, Format::G).Valid());
    for (int y = 0; y < 250; ++y) picture.SetRow(y, Samples(std::size_t(picture.RowSize()), std::uint8_t(y)));
    for (int y = 0; y < 250; ++y)
      EXPECT_EQ(picture.Row(y), Samples(std::size_t(picture.RowSize()), std::uint8_t(y)));
    picture.Close();
    std::error_code error;
    EXPECT_FALSE(std::filesystem::exists(disk / "fits", error));
  });
  rmdir(folder);
}

}
}
