#include "type_module.h"

#include <dlfcn.h>

#include <cstring>
#include <mutex>

#include "failure.h"
#include "picturezor/host.h"

namespace picturezor::files {

const TypeCode& CodeOf(const char* module, const char* type) {
  static std::mutex access;
  // Opening one that is open costs little. None is closed, since pictures may be read yet.
  const std::lock_guard lock(access);
  const std::string needs = std::string(type) + " needs ";
  const std::string file = std::string("types/") + module + ".so";
  const std::filesystem::path path = Host::Beside(file);
  if (path.empty()) throw Failure(needs + file + " beside the module PictureZOR.so, where it isn't");
  void* library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  const void* code = library ? dlsym(library, (std::string("PictureZORType") + type).c_str()) : nullptr;
  if (!code) throw Failure(needs + path.string() + ": " + dlerror());
  const auto& found = *static_cast<const TypeCode*>(code);
  if (std::strcmp(found.Version, PICTUREZOR_VERSION) != 0)
    throw Failure(needs + path.string() + ", of version " + PICTUREZOR_VERSION + " and not " + found.Version);
  return found;
}

}
