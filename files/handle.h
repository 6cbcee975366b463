#pragma once
#include <memory>

namespace picturezor::files {

template <auto Free>
struct FreedBy {
  template <class T>
  void operator()(T* made) const {
    Free(made);
  }
};

/// Owns what a C library made; `Free` is its function that gives it back.
template <class T, auto Free>
using Handle = std::unique_ptr<T, FreedBy<Free>>;

}
