#include "in_format.h"

#include "failure.h"

namespace picturezor::flow {

Shape InFormat::Result(const Shape& source) const {
  if (!files::Convertible(source.Of, To))
    throw files::Failure(files::Describe(source.Of) + " can't be converted to " + files::Describe(To));
  Shape result = source;
  result.Of = To;
  return result;
}

Picture InFormat::Apply(Picture source, const Workplace& at) const {
  if (source.ImageFormat() == To) return source;
  Picture result = files::MakePictures(at.Stores, {{source.Width(), source.Height(), To}})[0];
  files::CopyInFileFormat(source, 0, result);
  return result;
}

}
