#include "object_model.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <new>
#include <utility>

#include "quickdraw.h"

namespace picturezor::model {
namespace {

Runtime* MakeRuntime() {
  auto* runtime = new Runtime;
  for (const char* name : {"OutOfBoundsException", "NilObjectException", "MemoryBlock", "FolderItem",
                           "IntegerArray", "Picture", "Graphics"})
    runtime->Classes[Lower(name)].Name = name;
  Class& gworlds = runtime->Classes["gworldzor"];
  gworlds.Name = "GWorldZOR";
  gworlds.Destructor = quickdraw::DisposeOfInstance;
  return runtime;
}

/// Whether a property of this type, in lower case, is a reference.
bool NamesObject(std::string_view name) {
  return name != "integer" && name != "int64" && name != "boolean" && name != "double" && name != "color" &&
         name != "string";
}

/// Gives back the objects that this host has written into an object's fields.
void ReleaseFields(void* object) {
  for (const PropertyEntry& row : HeaderOf(object).Of->Properties) {
    if (row.Record->Setter != zor::DirectField || !NamesObject(row.LowerType)) continue;
    void* held;
    std::memcpy(&held, InstanceOf(object) + row.Record->FieldOffset, sizeof held);
    Unlock(held);
  }
}

std::vector<MethodEntry> EntriesOf(const zor::MethodRecord* rows, std::size_t count) {
  std::vector<MethodEntry> entries;
  for (std::size_t i = 0; i < count; ++i) {
    Declaration declaration = ParseDeclaration(rows[i].Declaration);
    std::string lowerName = Lower(declaration.Name);
    entries.push_back({&rows[i], std::move(declaration), std::move(lowerName)});
  }
  return entries;
}

}

// Never destroyed, since objects may outlive the end of main().
Runtime& TheRuntime() {
  static Runtime* const runtime = MakeRuntime();
  return *runtime;
}

Pending& PendingHere() {
  thread_local Pending pending;
  return pending;
}

std::string Lower(std::string_view text) {
  std::string lower(text);
  std::ranges::transform(lower, lower.begin(), [](unsigned char c) { return char(std::tolower(c)); });
  return lower;
}

const Class* FindClass(std::string_view name) {
  const auto& classes = TheRuntime().Classes;
  const auto found = classes.find(Lower(name));
  return found == classes.end() ? nullptr : &found->second;
}

const Class& ClassNamed(std::string_view name) {
  if (const Class* found = FindClass(name)) return *found;
  throw ModuleError("there is no class " + std::string(name) +
                    (Host::IsLoaded() ? "" : ", since no module is loaded"));
}

void Register(zor::ClassRecord* record) {
  record->InstanceOffsetSlot = InstanceOffset;
  for (std::size_t i = 0; i < record->EventCount; ++i) record->Events[i].EventWord = i + 1;

  // What can be wrong with a record comes first, so that a wrong one leaves no class behind.
  auto methods = EntriesOf(record->Methods, record->MethodCount);
  auto sharedMethods = EntriesOf(record->SharedMethods, record->SharedMethodCount);
  decltype(Class::Constants) constants;
  for (std::size_t i = 0; i < record->ConstantCount; ++i) {
    const auto [name, value] = ParseConstant(record->Constants[i].Declaration);
    constants[Lower(name)] = value;
  }

  Class& added = TheRuntime().Classes[Lower(record->ClassName)];
  added.Name = record->ClassName;
  added.DataSize = record->DataSize;
  added.Destructor = reinterpret_cast<void (*)(void*)>(record->DestructorFunction);
  added.Record = record;
  added.Methods = std::move(methods);
  added.SharedMethods = std::move(sharedMethods);
  added.Constants = std::move(constants);
  for (std::size_t i = 0; i < record->PropertyCount; ++i) {
    const zor::PropertyRecord& row = record->Properties[i];
    added.Properties.push_back({&row, row.Name, row.Type, Lower(row.Name), Lower(row.Type)});
  }
}

bool IsHidden(std::string_view name) {
  return std::ranges::find(TheRuntime().Hidden, name) != TheRuntime().Hidden.end();
}

bool MayCreate() {
  std::atomic<int>& left = TheRuntime().CreationsLeft;
  int now = left;
  while (now > 0 && !left.compare_exchange_weak(now, now - 1)) continue;
  return now != 0;
}

void* NewObject(const Class& of, std::unique_ptr<Payload> holds) {
  void* memory = ::operator new(InstanceOffset + of.DataSize);
  std::memset(memory, 0, InstanceOffset + of.DataSize);
  new (memory) ObjectHeader{&of, 1, std::move(holds)};
  of.Alive.fetch_add(1, std::memory_order_relaxed);
  return memory;
}

void Lock(void* object) {
  if (object) HeaderOf(object).References.fetch_add(1, std::memory_order_relaxed);
}

void Unlock(void* object) {
  if (!object) return;
  std::atomic<int>& references = HeaderOf(object).References;
  // Who holds the only one needn't ask the other processors.
  if (references.load(std::memory_order_acquire) != 1 &&
      references.fetch_sub(1, std::memory_order_acq_rel) > 1)
    return;
  const Class* of = HeaderOf(object).Of;
  if (of->Destructor) {
    // A destructor may lock and unlock its own object; it must not end twice.
    references = 1 << 20;
    of->Destructor(object);
  }
  ReleaseFields(object);
  HeaderOf(object).~ObjectHeader();
  ::operator delete(object);
  of->Alive.fetch_sub(1, std::memory_order_relaxed);
}

void ThrowPending() {
  Pending& pending = PendingHere();
  if (!pending.Thrown && !pending.Raised) return;
  if (std::exception_ptr thrown = std::exchange(pending.Thrown, nullptr)) {
    Unlock(std::exchange(pending.Raised, nullptr));
    std::rethrow_exception(thrown);
  }
  if (void* raised = std::exchange(pending.Raised, nullptr)) {
    const auto* holds = HeldBy<ExceptionPayload>(raised);
    const HostException exception(HeaderOf(raised).Of->Name, holds ? holds->Message : "");
    Unlock(raised);
    throw HostException(exception);
  }
}

}
