#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <thread>

#include "support/row_arguments.h"

// Run under the thread sanitizer too.

namespace picturezor {
namespace {

struct Scaling {
  Picture Source{160, 170, Format::RGBA}, Dest{120, 130, Format::RGBA};
  explicit Scaling(unsigned seed) { FillWithNoise(Source, seed); }
  std::vector<Samples> Plain() const {
    EXPECT_TRUE(Dest.Scale(Source, {}, Kernel::Lanczos3, 120, 130));
    return StoredRows(Dest);
  }
  std::vector<Samples> OnThreads(int threads) const {
    EXPECT_TRUE(Dest.ScaleMT(threads, Source, {}, Kernel::Lanczos3, 120, 130));
    return StoredRows(Dest);
  }
};

// Catches a worker that is given a second work before the first one is done, and a result that depends on who
// did which rows.
TEST(Threads, AScaleMayComeWhileAnotherOneRuns) {
  const Scaling outer(1), inner(2);
  const std::vector<Samples> outerRows = outer.Plain(), innerRows = inner.Plain();
  int depth = 0, nested = 0;
  Host::OnYield([&] {
    if (depth > 0) return;
    ++depth;
    ++nested;
    EXPECT_EQ(inner.OnThreads(3), innerRows);
    --depth;
  });
  for (int tries = 0; nested == 0 && tries < 1000; ++tries)
    for (const int threads : {4, 1, 32, 0}) {
      for (const Picture* picture : {&outer.Source, &outer.Dest, &inner.Source}) picture->SetYieldTicks(1);
      EXPECT_EQ(outer.OnThreads(threads), outerRows) << threads << " threads";
    }
  Host::OnYield({});
  EXPECT_GT(nested, 0) << "nothing yielded";
}

/// What a call left, to be compared.
struct Traces {
  std::string Declaration, Raised;
  std::int64_t Whole;
  std::vector<Samples> Picture, Result;
  bool operator==(const Traces&) const = default;
};

std::vector<Samples> RowsOf(const Picture& picture) {
  return picture && picture.Valid() && picture.Memory() ? StoredRows(picture) : std::vector<Samples>();
}

/// Calls every row, each on pictures of its own.
std::vector<Traces> CallEveryRow(StoredPicture::Kind kind, Format format) {
  std::vector<Traces> all;
  const model::Class& pictures = model::ClassNamed("PictureZOR");
  for (const auto* rows :
       {&pictures.Methods, &pictures.SharedMethods, &model::ClassNamed("PictureFactoryZOR").SharedMethods})
    for (const model::MethodEntry& row : *rows) {
      const RowArguments with(kind, format);
      const Picture& self = row.LowerName == "constructor" ? UnbuiltPicture() : with.Self();
      void* const object = rows == &pictures.Methods ? self.Address() : nullptr;
      const std::vector<Value> arguments = with.Ordinary(row);
      const Outcome outcome = object ? CallRow(row, object, arguments) : CallShared(row, arguments);
      Traces traces{row.Record->Declaration, outcome.Raised, 0, {}, {}};
      const bool random = row.LowerName == "fillrectrandom" || row.LowerName == "diffusefilter";
      if (!outcome.Result.Address) traces.Whole = outcome.Result.Whole;
      if (row.Of.Result == "picturezor" && !random)
        traces.Result = RowsOf(Picture(Object::Share(outcome.Result.Address)));
      if (row.Record->Setter && row.LowerName != "row") AssignRow(row, object, arguments, with.Assigned(row));
      if (!random) traces.Picture = RowsOf(self);
      GiveBack(row.Of.Result, outcome.Result);
      all.push_back(std::move(traces));
    }
  return all;
}

/// Runs body on two threads and gives what each made of it.
template <class Body>
auto OnTwoThreads(Body&& body) {
  std::array<decltype(body()), 2> made;
  std::thread first([&] { made[0] = body(); }), second([&] { made[1] = body(); });
  first.join();
  second.join();
  return made;
}

// Catches state that the module or the host keeps for one thread only: counts, caches, what was raised.
TEST(Threads, EveryRowWorksOnPicturesOfItsOwn) {
  for (const StoredPicture::Kind kind : {StoredPicture::Memory, StoredPicture::MappedClip})
    for (const Format format : {Format::RGBA, Format::G, Format::KYMCA}) {
      const std::vector<Traces> alone = CallEveryRow(kind, format);
      for (const auto& beside : OnTwoThreads([=] { return CallEveryRow(kind, format); })) {
        ASSERT_EQ(beside.size(), alone.size());
        for (std::size_t i = 0; i < alone.size(); ++i)
          EXPECT_EQ(beside[i], alone[i])
              << alone[i].Declaration << " on " << StoredPicture::NameOf(kind) << ", format " << int(format);
      }
      PictureFactory::SetFactory({});
    }
}

// Catches a factory that ends while another thread is asking it.
TEST(Threads, TheFactoryMayChangeWhileItIsAsked) {
  for (const int large : OnTwoThreads([] {
         int count = 0;
         for (int i = 0; i < 500; ++i) {
           PictureFactory::SetFactory(
               PictureFactory([i](std::int32_t width, std::int32_t height, Format format) {
                 return Picture(width + 1 + i % 2, height, format);
               }));
           count += Picture::Create(3, 5, Format::G).Width() > 3;
         }
         return count;
       }))
    EXPECT_EQ(large, 500);
  PictureFactory::SetFactory({});
}

// Catches a file that is cut under one picture while another begins on it.
TEST(Threads, AFileBelongsToOnePictureAtATime) {
  const TemporaryFile file;
  for (const bool kept : OnTwoThreads([&] {
         bool same = true;
         for (unsigned made = 0; made < 50;) {
           const Picture picture = Picture::Mapped(file.Path(), 9, 5, Format::RGB);
           if (!picture.Valid()) continue;
           FillWithNoise(picture, made++);
           const std::vector<Samples> rows = StoredRows(picture);
           std::this_thread::yield();
           same = same && StoredRows(picture) == rows;
         }
         return same;
       }))
    EXPECT_TRUE(kept);
  EXPECT_FALSE(std::filesystem::exists(file.Path()));
}

}
}
