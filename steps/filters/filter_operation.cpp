#include "filter_operation.h"

#include <algorithm>

#include "made_pictures.h"

namespace picturezor::steps {

namespace {

/// A view of the colours, so that alpha stays as it is.
Picture ColoursOf(const Picture& picture) {
  if (!picture.HasAlpha()) return picture;
  return picture.IsGray()  ? picture.GrayChannel()
         : picture.IsRGB() ? picture.RGBChannels()
                           : picture.CMYKChannels();
}

/// Puts the colours of a result where those of the image were.
void TakeColours(const Picture& colours, const Picture& result, Format format) {
  for (std::int32_t y = 0; y < colours.Height(); ++y)
    colours.SetRowInFormat(y, format, result.RowInFormat(y, format));
}

class FilterOperation final : public flow::Operation {
 public:
  FilterOperation(const FilterRules& rules, Filtering work) : Rules(rules), Work(std::move(work)) {}

  flow::Shape Result(const flow::Shape& source) const override {
    const Format colours = files::WithoutAlpha(source.Of);
    if (Rules.Groups == Serves::RGB && colours != Format::RGB)
      throw Unserved(std::string(Rules.Name) + " supports only RGB, and this is " +
                     files::Describe(source.Of));
    if (Rules.Groups == Serves::GrayAndRGB && colours == Format::CMYK)
      throw Unserved(std::string(Rules.Name) + " doesn't support CMYK");
    if (Rules.NotForGray && colours == Format::G) throw files::UsageFailure(Rules.NotForGray);
    return source;
  }
  flow::Dependence DependsOn(const flow::Shape&) const override { return Rules.Needs; }
  int Pictures() const override { return Rules.Pictures; }

  Picture Apply(Picture source, const flow::Workplace& at) const override {
    const Format format = source.ImageFormat();
    if (Rules.LooksBehindRows && source.Parent()) {
      const Picture own = files::MakePictures(at.Stores, {{source.Width(), source.Height(), format}})[0];
      own.CopyPixels(source);
      source = own;
    }
    const Picture colours = ColoursOf(source);
    colours.SetFactory(FactoryFor(at.Stores));
    Picture result = Work(colours);
    if (!result) throw Unserved("it can't be filtered");
    if (result == colours) return source;
    if (!files::HasAlpha(format)) return result;
    TakeColours(colours, result, files::WithoutAlpha(format));
    return source;
  }

 private:
  const FilterRules Rules;
  const Filtering Work;
};

}

std::unique_ptr<const flow::Operation> MakeFilter(const FilterRules& rules, Filtering work) {
  return std::make_unique<FilterOperation>(rules, std::move(work));
}

std::int32_t Rows(double count) { return std::int32_t(std::min(count, double(INT32_MAX / 2))); }

}
