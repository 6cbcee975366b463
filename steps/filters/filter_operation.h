#pragma once
#include <functional>

#include "all_steps.h"

namespace picturezor::steps {

enum class Serves { All, GrayAndRGB, RGB };

/// What a filter is beside its arithmetic.
struct FilterRules {
  const char* Name;
  Serves Groups = Serves::All;
  flow::Dependence Needs{.Of = flow::Dependence::Kind::Bands};
  /// The pictures of the image's size that it needs at a time.
  int Pictures = 1;
  /// What is said of a gray image where the options are for colours; nothing where they do for both.
  const char* NotForGray = nullptr;
  /// It looks at what stands behind a row, so the picture has to be no view.
  bool LooksBehindRows = false;
};

/// Gets the colours of a picture, without alpha, and gives them back filtered, in place where that can be;
/// nil where it can't be done. New pictures come from the factory of the colours.
using Filtering = std::function<Picture(const Picture& colours)>;

/// Alpha stays as it is.
std::unique_ptr<const flow::Operation> MakeFilter(const FilterRules& rules, Filtering work);

/// Rows in reach, however large.
std::int32_t Rows(double count);

}
