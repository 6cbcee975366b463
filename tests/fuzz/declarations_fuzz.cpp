#include <cstdlib>
#include <string>

#include "declaration.h"
#include "picturezor/host.h"

// The two parsers of the host: what they take they take whole, what they refuse they refuse with ModuleError.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace picturezor;
  const std::string text(reinterpret_cast<const char*>(data), size);
  try {
    const model::Declaration declaration = model::ParseDeclaration(text);
    if (declaration.Name.empty()) std::abort();
    for (const model::Parameter& parameter : declaration.Parameters)
      if (parameter.Name.empty() || parameter.Type.empty()) std::abort();
  } catch (const ModuleError&) {
    // Refused.
  }
  try {
    model::ParseConstant(text);
  } catch (const ModuleError&) {
    // Refused.
  }
  return 0;
}
