#pragma once
#include <array>
#include <functional>
#include <string>

#include "picturezor/picture.h"
#include "run.h"

namespace picturezor::tiles {

using SampleTable = std::array<std::uint8_t, 256>;

/// What the sliders of a page say; as made, they change nothing.
struct Adjustments {
  bool AutoLevel = false;
  double Gamma = 1, Gain = 0.5, Bias = 0.5;
  double Radius = 1, Amount = 0;

  /// The steps that they stand for, as they are written on a command line; auto-level is the first one.
  std::string Steps() const;
  /// The steps that work on parts: all but auto-level, which has to see the whole picture.
  flow::Chain Chain(const files::StoreOptions& stores) const;
};

/// What auto-level makes of each sample of an RGB picture. Throws files::Failure where it isn't there for it.
SampleTable AutoLevelTable(const Picture& picture);

/// A word that a shell takes as it is.
std::string QuotedForShell(const std::string& word);

}
