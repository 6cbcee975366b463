#include "filters/plane_tables.h"

#include <optional>

#include "filters/byte_tables.h"
#include "image/walk.h"

namespace zor {
namespace {

/// The tables of a group in the order of its planes.
std::array<const SampleTable*, 5> TablesOf(Group group, const PlaneTables& t) {
  switch (group) {
    case Group::Gray:
    case Group::GrayAlpha: return {t.Gray, t.Alpha};
    case Group::RGB:
    case Group::RGBAlpha: return {t.Red, t.Green, t.Blue, t.Alpha};
    case Group::CMYK:
    case Group::CMYKAlpha: return {t.Cyan, t.Magenta, t.Yellow, t.Black, t.Alpha};
    case Group::None: break;
  }
  return {};
}

/// The planes that have a table, as they lie in both pictures.
struct MappedPlanes {
  PlaneList In, Out;
  std::array<const SampleTable*, 5> Table{};

  MappedPlanes(Group group, const PlaneList& in, const PlaneList& out, const PlaneTables& tables)
      : In{0, in.Step, {}}, Out{0, out.Step, {}} {
    const auto all = TablesOf(group, tables);
    for (int c = 0; c < in.Count; ++c)
      if (all[c]) {
        Table[In.Count] = all[c];
        In.Offset[In.Count++] = in.Offset[c];
        Out.Offset[Out.Count++] = out.Offset[c];
      }
  }
};

/// The rows of two pictures that are to be mapped.
struct MappedRows {
  Lane From, Into;
  std::int32_t Width, Height;
  /// Whether a vector of samples may be read before any of them is written.
  bool ManyAtOnce;
};

bool MapRows(const MappedRows& rows, const MappedPlanes& planes) {
  if (rows.Width < 1 || planes.In.Count < 1) return true;
  const bool alike = rows.ManyAtOnce && LieAlike(planes.In, planes.Out);
  const std::int32_t firstIn = FirstOffset(planes.In), firstOut = FirstOffset(planes.Out);
  std::optional<ByteTables> tables;
  if (alike) tables.emplace(planes.In, planes.Table, rows.Width);
  bool done = true;
  ForPlaneCount(planes.In.Count, [&](auto n) {
    done = Walk(rows.From, rows.Into).Rows(rows.Height, [&](std::int32_t, Sample* source, Sample* dest) {
      // In locals, since a write through a Sample * may change anything else.
      const PlaneRow<n> in(source, planes.In), out(dest, planes.Out);
      const auto table = planes.Table;
      const std::ptrdiff_t width = rows.Width;
      for (std::ptrdiff_t x = tables ? MapBytes(*tables, source + firstIn, dest + firstOut) : 0; x < width;
           ++x)
        for (int c = 0; c < n; ++c) out(c, x) = (*table[c])[in(c, x)];
    });
  });
  return done;
}

}

bool MapPlanes(const FilterCall& call, const PlaneTables& tables) {
  return MapRows({From(call.Source), Into(call.Dest), call.Source.Width, call.Source.Height,
                  !call.SharesPixels || &call.Source == &call.Dest},
                 {call.Of, call.In, call.Out, tables});
}

bool MapPlanes(PictureData& picture, const Rectangle& part, const PlaneTables& tables) {
  const Group group = GroupOf(picture);
  const PlaneList planes = PlanesOf(group, picture, part.X);
  return MapRows({From(picture, part.Y), Into(picture, part.Y), part.Width, part.Height, true},
                 {group, planes, planes, tables});
}

}
