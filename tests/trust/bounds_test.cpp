#include <gtest/gtest.h>

#include <cstdio>

#include "support/row_arguments.h"

// Every row of the class, as its record declares it, with what no caller should give, in each position.

namespace picturezor {
namespace {

using model::MethodEntry;
using model::Parameter;

const std::vector<MethodEntry>& Rows() { return model::ClassNamed("PictureZOR").Methods; }
const std::vector<MethodEntry>& SharedRows() { return model::ClassNamed("PictureZOR").SharedMethods; }

/// The picture of a call: a constructor's is a new one.
Picture ObjectFor(const MethodEntry& row, const Picture& picture) {
  return row.LowerName == "constructor" ? UnbuiltPicture() : picture;
}

/// What holds for every row, however it was called.
void Check(const MethodEntry& row, const Outcome& outcome) {
  const Value& result = outcome.Result;
  EXPECT_TRUE(outcome.Raised.empty() || outcome.Raised == "OutOfBoundsException" ||
              outcome.Raised == "NilObjectException")
      << outcome.Raised;
  EXPECT_TRUE(outcome.Raised.empty() || (!result.Address && !result.Whole)) << "a result beside an exception";
  EXPECT_TRUE(row.Of.Result != "boolean" || result.Whole == 0 || result.Whole == 1);
}

int Calls = 0;

/// Calls the function of a row and its assignment form with these arguments.
void Try(const RowArguments& with, const MethodEntry& row, const Picture& on,
         const std::vector<Value>& arguments) {
  if (!KeepsPromises(row, arguments)) return;
  ++Calls;
  const Picture object = ObjectFor(row, on);
  const Outcome outcome = CallRow(row, object.Address(), arguments);
  Check(row, outcome);
  if (row.Record->Setter) {
    // A whole stored row goes back as it was, since it holds the surroundings of a view too.
    const bool stored = row.LowerName == "row" && outcome.Result.Address;
    AssignRow(row, object.Address(), arguments, stored ? outcome.Result : with.Assigned(row));
  }
  GiveBack(row.Of.Result, outcome.Result);
}

/// Runs body with the arguments of a call in small pictures of some stores and formats, and looks that
/// nothing is left behind and nothing around the pictures was touched.
template <class Body>
void ForEachRow(Body&& body) {
  Calls = 0;
  for (const StoredPicture::Kind kind :
       {StoredPicture::Block, StoredPicture::Clip, StoredPicture::MappedClip})
    for (const Format format : {Format::RGBA, Format::G, Format::KYMCA, Format::Scaling3})
      for (const MethodEntry& row : Rows()) {
        SCOPED_TRACE(std::string(row.Record->Declaration) + " on " + StoredPicture::NameOf(kind) +
                     ", format " + std::to_string(int(format)));
        const Host::Alive before = Host::Count();
        {
          const RowArguments with(kind, format);
          body(with, row);
          EXPECT_TRUE(with.SurroundingsIntact());
        }
        EXPECT_EQ(Host::Count(), before) << "something is left";
      }
  std::printf("%d calls of %d rows\n", Calls, int(Rows().size()));
}

// Catches a row whose C type isn't among those that can be called: it would go untested.
TEST(Bounds, EveryRowCanBeCalled) {
  for (const auto* rows : {&Rows(), &SharedRows(), &model::ClassNamed("PictureFactoryZOR").SharedMethods})
    for (const MethodEntry& row : *rows) EXPECT_TRUE(CanCall(row)) << row.Record->Declaration;
}

// Catches a trap, a write outside, an endless loop or a leak behind any single argument.
TEST(Bounds, OfEachArgument) {
  ForEachRow([](const RowArguments& with, const MethodEntry& row) {
    for (std::size_t i = 0; i < row.Of.Parameters.size(); ++i) {
      SCOPED_TRACE(row.Of.Parameters[i].Name);
      for (const Value& hostile : with.Hostile(row.Of.Parameters[i].Type)) {
        SCOPED_TRACE(std::to_string(hostile.Whole) + " or " + std::to_string(hostile.Real));
        std::vector<Value> arguments = with.Ordinary(row);
        arguments[i] = hostile;
        Try(with, row, with.Self(), arguments);
      }
    }
  });
}

// A sum of two extremes is another place to go wrong than either alone.
TEST(Bounds, OfAllArgumentsTogether) {
  ForEachRow([](const RowArguments& with, const MethodEntry& row) {
    Noise noise(unsigned(row.Of.Parameters.size()));
    const int tries = row.Of.Parameters.size() < 2 ? 0 : 40;
    for (int i = 0; i < tries; ++i) {
      std::vector<Value> arguments = with.Ordinary(row);
      for (std::size_t a = 0; a < arguments.size(); ++a) {
        const std::vector<Value> hostile = with.Hostile(row.Of.Parameters[a].Type);
        const int pick = noise.Between(-1, int(hostile.size()) - 1);
        if (pick >= 0) arguments[a] = hostile[std::size_t(pick)];
      }
      Try(with, row, with.Self(), arguments);
    }
  });
}

TEST(Bounds, OfThePictureItself) {
  ForEachRow([](const RowArguments& with, const MethodEntry& row) {
    for (const Picture& odd : with.OddPictures()) Try(with, row, odd, with.Ordinary(row));
  });
}

/// What a row gives that hasn't worked.
std::int64_t FailureOf(const MethodEntry& row) { return row.Of.Result == "int64" ? -1 : 0; }

// Without the picture that it works on, or the one that it reads, an operation can't have worked.
TEST(Bounds, NilIsRefused) {
  ForEachRow([](const RowArguments& with, const MethodEntry& row) {
    const Outcome onNil = CallRow(row, nullptr, with.Ordinary(row));
    EXPECT_EQ(onNil.Result.Whole, FailureOf(row));
    EXPECT_EQ(onNil.Result.Address, nullptr);
    EXPECT_EQ(onNil.Raised, "");
    if (row.Record->Setter) AssignRow(row, nullptr, with.Ordinary(row), with.Assigned(row));
    if (row.Of.Result != "boolean" && row.Of.Result != "int64") return;
    for (std::size_t i = 0; i < row.Of.Parameters.size(); ++i) {
      const std::string name = model::Lower(row.Of.Parameters[i].Name);
      if (row.Of.Parameters[i].Type != "picturezor" || name == "temp" || name == "mask") continue;
      std::vector<Value> arguments = with.Ordinary(row);
      arguments[i] = {};
      ++Calls;
      EXPECT_EQ(CallRow(row, with.Self().Address(), arguments).Result.Whole, FailureOf(row));
    }
  });
}

TEST(Bounds, OfSharedRows) {
  const RowArguments with(StoredPicture::Memory, Format::RGBA);
  for (const MethodEntry& row : SharedRows())
    for (const Value& first : with.Hostile("integer"))
      for (const Value& second : with.Hostile("integer"))
        for (const Value& third : with.Hostile("integer")) {
          SCOPED_TRACE(row.Record->Declaration);
          Check(row, CallShared(row, {first, second, third}));
        }
}

TEST(Bounds, OfProperties) {
  for (const StoredPicture::Kind kind : {StoredPicture::Memory, StoredPicture::Mapped})
    for (const char* name : {"YieldTicks", "MappingBlockSize"}) {
      const RowArguments with(kind, Format::RGB);
      for (const Value& value : with.Hostile("integer")) {
        SCOPED_TRACE(std::string(name) + " " + std::to_string(value.Whole));
        if (name[0] == 'Y') with.Self().SetYieldTicks(std::int32_t(value.Whole));
        if (name[0] == 'M') with.Self().SetMappingBlockSize(std::int32_t(value.Whole));
        EXPECT_EQ(with.Self().Row(RowArguments::Height - 1).size(), std::size_t(with.Self().RowSize()));
        with.Self().Clone();
      }
    }
}

}
}
