#include "faults/shim.h"

#include <cerrno>
#include <cstdarg>
#include <cstdlib>
#include <cstring>
#include <type_traits>

#include "frame/declaration.h"
#include "frame/host_services.h"

// Linked into a module of its own with --wrap, so that only the module's calls come through here.

extern "C" {
[[gnu::visibility("default")]] picturezor::Faults TheFaults;

void* __real_calloc(std::size_t count, std::size_t size);
void __real_free(void* memory);
void* __real_mmap64(void* at, std::size_t size, int access, int flags, int file, long long offset);
int __real_open64(const char* path, int flags, ...);
int __real_close(int file);
int __real_ftruncate64(int file, long long size);
long long __real_lseek64(int file, long long offset, int from);
long __real_write(int file, const void* bytes, std::size_t count);
int __real_fstat64(int file, void* about);
int __real_fstatvfs64(int file, void* about);
int __real_posix_fallocate64(int file, long long offset, long long size);
int __real_pthread_create(void* thread, const void* attributes, void* (*start)(void*), void* argument);
void* __real__ZN3zor7ResolveEPKc(const char* name);
}

namespace {

bool Fails(bool makesThreads = false) {
  if (TheFaults.ThreadsOnly && !makesThreads) return false;
  const int call = ++TheFaults.Calls;
  return TheFaults.First > 0 && call >= TheFaults.First && call < TheFaults.First + TheFaults.Count;
}

template <class Result>
Result Failed(Result result, int error) {
  errno = error;
  return result;
}

/// A service that fails when its turn has come.
template <zor::Text Name, class Signature>
struct Failing;

template <zor::Text Name, class Result, class... Arguments>
struct Failing<Name, Result(Arguments...)> {
  static inline Result (*Real)(Arguments...) = nullptr;
  static Result Call(Arguments... arguments) {
    if (!Fails()) return Real(arguments...);
    // NewGWorld says by a number that isn't 0 that it failed.
    if constexpr (Name.View() == "NewGWorld") return Result(-1);
    if constexpr (!std::is_void_v<Result>) return Result();
  }
  static void* Wrapped(void* real) {
    Real = reinterpret_cast<Result (*)(Arguments...)>(real);
    return real ? reinterpret_cast<void*>(&Call) : nullptr;
  }
};

struct Wrapper {
  const char* Name;
  void* (*Wrap)(void* real);
};

template <zor::Text Name, class Signature>
constexpr Wrapper Of(const zor::Service<Name, Signature>&) {
  return {Name.Characters, Failing<Name, Signature>::Wrapped};
}

/// The services that can refuse.
constexpr Wrapper Wrappers[] = {
    Of(zor::PluginNewInstance),
    Of(zor::GetEventInstancePPC),
    Of(zor::REALBuildString),
    Of(zor::REALConvertString),
    Of(zor::REALSetPropValueString),
    Of(zor::REALGetPropValueInt),
    Of(zor::newMemoryBlock),
    Of(zor::memoryBlockGetPtr),
    Of(zor::PtrToMemoryBlock),
    Of(zor::REALFSRefFromFolderItem),
    Of(zor::REALLockPictureDescription),
    Of(zor::newPicture),
    Of(zor::pluginPictureGraphicsGetter),
    Of(zor::REALGetPictureMask),
    Of(zor::REALLoadObjectMethod),
    Of(zor::GetGWorldPixMap),
    Of(zor::GetPortPixMap),
    Of(zor::LockPixels),
    Of(zor::GetPixBaseAddr),
    Of(zor::NewGWorld),
    Of(zor::GetCTable),
};

}

extern "C" {

void* __wrap_calloc(std::size_t count, std::size_t size) {
  void* memory = Fails() ? nullptr : __real_calloc(count, size);
  TheFaults.Blocks += memory != nullptr;
  return memory;
}
void __wrap_free(void* memory) {
  TheFaults.Blocks -= memory != nullptr;
  __real_free(memory);
}
void* __wrap_mmap64(void* at, std::size_t size, int access, int flags, int file, long long offset) {
  if (Fails()) return Failed(reinterpret_cast<void*>(-1), ENOMEM);
  return __real_mmap64(at, size, access, flags, file, offset);
}
int __wrap_open64(const char* path, int flags, ...) {
  va_list rest;
  va_start(rest, flags);
  const int mode = va_arg(rest, int);
  va_end(rest);
  if (Fails()) return Failed(-1, EACCES);
  const int file = __real_open64(path, flags, mode);
  TheFaults.Descriptors += file >= 0;
  return file;
}
int __wrap_close(int file) {
  --TheFaults.Descriptors;
  return __real_close(file);
}
int __wrap_ftruncate64(int file, long long size) {
  return Fails() ? Failed(-1, ENOSPC) : __real_ftruncate64(file, size);
}
long long __wrap_lseek64(int file, long long offset, int from) {
  return Fails() ? Failed(-1LL, EINVAL) : __real_lseek64(file, offset, from);
}
long __wrap_write(int file, const void* bytes, std::size_t count) {
  return Fails() ? Failed(-1L, ENOSPC) : __real_write(file, bytes, count);
}
int __wrap_fstat64(int file, void* about) { return Fails() ? Failed(-1, EIO) : __real_fstat64(file, about); }
int __wrap_fstatvfs64(int file, void* about) {
  return Fails() ? Failed(-1, EIO) : __real_fstatvfs64(file, about);
}
int __wrap_posix_fallocate64(int file, long long offset, long long size) {
  return Fails() ? ENOSPC : __real_posix_fallocate64(file, offset, size);
}
int __wrap_pthread_create(void* thread, const void* attributes, void* (*start)(void*), void* argument) {
  return Fails(true) ? EAGAIN : __real_pthread_create(thread, attributes, start, argument);
}

void* __wrap__ZN3zor7ResolveEPKc(const char* name) {
  void* real = __real__ZN3zor7ResolveEPKc(name);
  for (const Wrapper& wrapper : Wrappers)
    if (!std::strcmp(wrapper.Name, name)) return wrapper.Wrap(real);
  return real;
}
}
