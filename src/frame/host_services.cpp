#include "frame/host_services.h"

namespace zor {
namespace {

Resolver CurrentResolver = nullptr;

}

void* Resolve(const char* name) { return CurrentResolver ? CurrentResolver(name) : nullptr; }

void SetResolver(Resolver resolver) { CurrentResolver = resolver; }

}
