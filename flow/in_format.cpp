#include "in_format.h"

#include <cstring>

#include "failure.h"
#include "rows.h"

namespace picturezor::flow {

Shape InFormat::Result(const Shape& source) const {
  if (!files::Convertible(source.Of, To))
    throw files::Failure("there is no way from " + files::Describe(source.Of) + " to " + files::Describe(To));
  Shape result = source;
  result.Of = To;
  return result;
}

Picture InFormat::Apply(Picture source, const Workplace& at) const {
  if (source.ImageFormat() == To) return source;
  const std::int32_t width = source.Width(), height = source.Height();
  Picture result = files::MakePictures(at.Stores, {{width, height, To}})[0];
  for (std::int32_t y = 0; y < height; ++y) {
    const Bytes row = files::RowInFileFormat(source, y, To);
    std::memcpy(RowOf(result, y), row.data(), row.size());
  }
  return result;
}

}
