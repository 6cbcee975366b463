#pragma once
#include "scale/slot_columns.h"

namespace zor {

/// The second pass, prepared for all its lines. The rows between the passes stand in temp, or are made by
/// `rows` where there is no temp. Its lines may then be made in any order and on several threads.
class VerticalPass {
 public:
  VerticalPass(const ScaleContext& context, const ContributionTable& table, const HorizontalPass* rows)
      : Context(context), Table(table), Plan(ColumnPlan::Make(context, table, rows)) {}
  /// False where the rows have to stand in temp, since a line looks at so many of them.
  explicit operator bool() const { return Context.Temp || Plan.has_value(); }
  /// Makes the lines first to last of dest; `yields` may yield if it is given. False, and the lines made in
  /// part, when a row of the source can't be reached, or without memory for the rows; which only happens
  /// with `rows`.
  bool Run(std::int32_t first, std::int32_t last, PictureData* yields) const;

 private:
  /// Makes the lines from y on that are made together, in one stripe.
  bool MakeLines(std::int32_t y, int count, Columns stripe, SlotColumns& columns) const;
  void MakePlainLines(std::int32_t first, std::int32_t last, PictureData* yields) const;

  const ScaleContext& Context;
  const ContributionTable& Table;
  /// None where the plain form makes the lines out of temp.
  std::optional<ColumnPlan> Plan;
};

}
