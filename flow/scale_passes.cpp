#include "scale_passes.h"

#include <utility>

#include "failure.h"

namespace picturezor::flow {

namespace {

/// The first pass of a scale is what it leaves in its temporary picture; a single row of result is made
/// beside it.
class PassAlongRows final : public Operation {
 public:
  PassAlongRows(Kernel kernel, std::int32_t width) : By(kernel), Width(width) {}
  Shape Result(const Shape& source) const override {
    Shape result = source;
    result.Width = Width;
    return result;
  }
  Dependence DependsOn(const Shape&) const override { return {.Of = Dependence::Kind::Bands}; }
  int Pictures() const override { return 3; }
  Picture Apply(Picture source, const Workplace&) const override {
    const Format format = source.ImageFormat();
    // Between the passes three channels take four bytes.
    const Format stored = format == Format::RGB ? Format::RGBX : format;
    const int pixel = BytesPerPixel(stored);
    const std::int32_t rows = source.Height(), rowSize = Width * pixel;
    const auto raw = Format(std::int32_t(Format::Scaling1) + pixel - 1);
    const MemoryBlock block(std::size_t(rowSize) * std::size_t(rows));
    const Picture between(block, Width, rows, raw, rowSize), line(Width, 1, format);
    if (!between.Valid() || !line.Valid() || !line.Scale(source, between, By, Width, 1))
      throw files::Failure("a picture can't be scaled");
    const Picture made(block, Width, rows, stored, rowSize);
    if (stored == format) return made;
    const Picture packed(Width, rows, format);
    if (!packed.Valid() || !packed.CopyPixels(made)) throw files::Failure("not enough memory for a scale");
    return packed;
  }

 private:
  Kernel By;
  std::int32_t Width;
};

/// Counter-clockwise, or back.
class QuarterTurn final : public Operation {
 public:
  explicit QuarterTurn(bool back) : Back(back) {}
  Shape Result(const Shape& source) const override {
    Shape result = source;
    std::swap(result.Width, result.Height);
    if (result.Density) std::swap(result.Density->X, result.Density->Y);
    return result;
  }
  std::optional<int> Turns() const override { return Back ? 6 : 8; }
  Picture Apply(Picture source, const Workplace&) const override {
    const Picture turned = Back ? source.Rotate270() : source.Rotate90();
    if (!turned) throw files::Failure("not enough memory for a scale");
    return turned;
  }

 private:
  bool Back;
};

}

std::vector<std::unique_ptr<const Operation>> ScalePasses(Kernel kernel, std::int32_t width,
                                                          std::int32_t height) {
  std::vector<std::unique_ptr<const Operation>> passes;
  passes.push_back(std::make_unique<PassAlongRows>(kernel, width));
  passes.push_back(std::make_unique<QuarterTurn>(false));
  passes.push_back(std::make_unique<PassAlongRows>(kernel, height));
  passes.push_back(std::make_unique<QuarterTurn>(true));
  return passes;
}

}
