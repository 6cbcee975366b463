#include "picturezor/host.h"

#include <dlfcn.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <cstring>
#include <mutex>

#include "object_model.h"

namespace picturezor {

using namespace model;

namespace {

std::filesystem::path& LoadedModule() {
  static std::filesystem::path module;
  return module;
}
std::mutex LoadMutex;
std::atomic<bool> Loaded = false;

/// The file that this code is in, a shared library or a program that was linked with it.
std::filesystem::path OwnFile() {
  Dl_info code{};
  dladdr(reinterpret_cast<void*>(&OwnFile), &code);
  std::error_code failed;
  auto file = std::filesystem::read_symlink("/proc/self/exe", failed);
  if (code.dli_fname && std::strchr(code.dli_fname, '/')) {
    const auto library = std::filesystem::canonical(code.dli_fname, failed);
    if (!failed) file = library;
  }
  return file;
}

/// Where the module and what belongs to it may stand.
std::vector<std::filesystem::path> Places() {
  const auto own = OwnFile().parent_path();
  return {own, own / "picturezor", own / PICTUREZOR_LIBRARY_DIR "/picturezor"};
}

std::filesystem::path FoundIn(const std::vector<std::filesystem::path>& places,
                              const std::filesystem::path& file) {
  std::error_code failed;
  for (const auto& place : places)
    if (std::filesystem::exists(place / file, failed)) return (place / file).lexically_normal();
  return {};
}

std::filesystem::path NamedModule() {
  const char* named = std::getenv("PICTUREZOR_MODULE");
  return named ? named : "";
}

std::filesystem::path InstalledModule() {
  if (auto named = NamedModule(); !named.empty()) return named;
  auto module = FoundIn(Places(), "PictureZOR.so");
  if (module.empty())
    throw ModuleError("the module PictureZOR.so isn't beside " + OwnFile().string() +
                      "; the environment variable PICTUREZOR_MODULE can name it");
  return module;
}

std::vector<Host::MethodInfo> InfosOf(const std::vector<MethodEntry>& rows) {
  std::vector<Host::MethodInfo> infos;
  infos.reserve(rows.size());
  for (const MethodEntry& row : rows)
    infos.push_back({row.Record->Declaration, row.Record->Flags, row.Record->Setter != 0});
  return infos;
}

}

void Host::Load(const std::filesystem::path& module, const Options& options) {
  const std::filesystem::path path = std::filesystem::absolute(module);
  const std::lock_guard lock(LoadMutex);
  if (IsLoaded()) {
    if (path == LoadedModule()) return;
    throw ModuleError("a module is loaded already: " + LoadedModule().string());
  }
  void* library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  if (!library) throw ModuleError(std::string("the module can't be loaded: ") + dlerror());
  const auto entry = reinterpret_cast<zor::PluginMain>(dlsym(library, "REALPluginMain"));
  if (!entry) {
    dlclose(library);
    throw ModuleError(path.string() + " isn't a module: it has no REALPluginMain");
  }
  Runtime& runtime = TheRuntime();
  runtime.Version = options.Version;
  runtime.Hidden = options.Hidden;
  runtime.Pictures = options.Pictures;
  runtime.BytesOfDepth24 = options.BytesOfDepth24;
  entry([](const char* name) { return ServiceNamed(name); });
  ThrowPending();
  LoadedModule() = path;
  Loaded = true;
}

void Host::Load() { Load(InstalledModule()); }

bool Host::IsLoaded() { return Loaded; }

std::filesystem::path Host::Beside(const std::filesystem::path& file) {
  std::vector<std::filesystem::path> places = Places();
  if (const auto named = NamedModule(); !named.empty()) places.insert(places.begin(), named.parent_path());
  if (IsLoaded()) places.insert(places.begin(), LoadedModule().parent_path());
  return FoundIn(places, file);
}

void Host::OnYield(std::function<void()> hook) {
  auto next = hook ? std::make_shared<const std::function<void()>>(std::move(hook)) : nullptr;
  const std::lock_guard lock(TheRuntime().YieldMutex);
  TheRuntime().OnYield.swap(next);
}

void Host::MakePicturesAs(PictureForm form) { TheRuntime().Pictures = form; }

void Host::Hide(const std::string& service, bool hidden) {
  auto& names = TheRuntime().Hidden;
  std::erase(names, service);
  if (hidden) names.push_back(service);
}

void Host::FailCreationsAfter(int successes) { TheRuntime().CreationsLeft = successes; }

Host::Alive Host::Count() {
  Runtime& runtime = TheRuntime();
  Alive alive;
  for (const auto& [name, of] : runtime.Classes) alive.Objects += of.Alive;
  alive.MemoryBlocks = CountOf("MemoryBlock");
  alive.Strings = runtime.Alive.Strings;
  alive.OpenDescriptions = runtime.Alive.OpenDescriptions;
  alive.GWorlds = runtime.Alive.GWorlds;
  alive.PixelLocks = runtime.Alive.PixelLocks;
  return alive;
}

int Host::CountOf(std::string_view className) {
  const Class* of = FindClass(className);
  return of ? of->Alive.load() : 0;
}

std::vector<Host::MethodInfo> Host::Methods(std::string_view className) {
  return InfosOf(ClassNamed(className).Methods);
}

std::vector<Host::MethodInfo> Host::SharedMethods(std::string_view className) {
  return InfosOf(ClassNamed(className).SharedMethods);
}

std::vector<Host::PropertyInfo> Host::Properties(std::string_view className) {
  std::vector<PropertyInfo> infos;
  for (const PropertyEntry& row : ClassNamed(className).Properties)
    infos.push_back({row.Name, row.Type, row.Record->Flags, row.Record->Setter != 0});
  return infos;
}

std::int64_t Host::Constant(std::string_view className, std::string_view name) {
  const auto& constants = ClassNamed(className).Constants;
  const auto found = constants.find(Lower(name));
  if (found == constants.end()) throw ModuleError("there is no constant " + std::string(name));
  return found->second;
}

std::vector<std::string> Host::ConstantDeclarations(std::string_view className) {
  const zor::ClassRecord* record = ClassNamed(className).Record;
  std::vector<std::string> declarations;
  for (std::size_t i = 0; record && i < record->ConstantCount; ++i)
    declarations.emplace_back(record->Constants[i].Declaration);
  return declarations;
}

}
