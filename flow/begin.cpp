#include "begin.h"

#include <utility>

namespace picturezor::flow {

void LetReaderBegin(OpenFile& file, Chain& chain) {
  if (chain.empty() || file.Part) return;
  const Shape whole = ShapeOf(file);
  if (const auto cut = chain[0]->Cuts()) {
    chain[0]->Result(whole);
    file.Part = files::Stored(*cut, file.Reader->Info());
    chain.erase(chain.begin());
  } else if (auto draft = chain[0]->Drafted(whole)) {
    files::Extent least = draft->Least;
    if (file.Reader->Info().Orientation >= 5) std::swap(least.Width, least.Height);
    const auto reduced = [least](std::unique_ptr<files::ImageReader> reader) {
      reader->Reduce(least.Width, least.Height);
      return reader;
    };
    file.Reader = reduced(std::move(file.Reader));
    if (file.Again) file.Again = [=, again = std::move(file.Again)] { return reduced(again()); };
    chain[0] = std::move(draft->Rest);
  }
}

}
