#pragma once
#include "operation.h"

namespace picturezor::flow {

/// Pixels of another format of files, to which there is a way.
class InFormat final : public Operation {
 public:
  explicit InFormat(Format format) : To(format) {}
  Shape Result(const Shape& source) const override;
  Dependence DependsOn(const Shape&) const override {
    return {.Of = Dependence::Kind::Bands, .KeepsSource = true};
  }
  Picture Apply(Picture source, const Workplace& at) const override;

 private:
  Format To;
};

}
