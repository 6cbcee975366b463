#include "frame/records.h"

extern "C" [[gnu::visibility("default")]] void REALPluginMain(zor::Resolver) {}
