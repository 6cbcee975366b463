#include "support/every_target.h"

#include <dlfcn.h>

#include <stdexcept>

namespace picturezor {

zor::Target& TargetOfModule() {
  void* module = dlopen(PICTUREZOR_MODULE, RTLD_NOW | RTLD_NOLOAD);
  void* target = module ? dlsym(module, "_ZN3zor13CurrentTargetE") : nullptr;
  if (!target) throw std::runtime_error("the module doesn't tell its target");
  return *static_cast<zor::Target*>(target);
}

}
