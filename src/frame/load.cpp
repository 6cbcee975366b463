#include "frame/load.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "frame/classes.h"
#include "frame/host_services.h"
#include "image/stores.h"

namespace zor {
namespace {

constexpr double FlagsChangedIn = 2010.029;

void RewriteFlags(Word& flags) {
  if (flags & 0x40000) flags |= 4;
  if (flags & 0x80000) flags |= 8;
}

template <class Row>
void RewriteTable(Row* rows, Word count) {
  for (Word i = 0; rows && i < count; ++i) RewriteFlags(rows[i].Flags);
}

void RegisterClassRounded(ClassRecord& record) {
  record.DataSize = (record.DataSize + 15) / 16 * 16;
  PluginRegisterClass(&record);
}

}

void BuildConstantDeclarations(ClassRecord* record, std::int32_t first, std::int32_t withPrefix,
                               std::int32_t decimalOnly) {
  if (!record) return;
  for (Word i = Word(first); i < record->ConstantCount; ++i) {
    ConstantRecord& row = record->Constants[i];
    const std::size_t room = std::strlen(row.Declaration) + (withPrefix ? 17 : 15);
    auto* text = static_cast<char*>(std::calloc(1, room));
    const auto value = std::uint32_t(row.Value);
    if (!text) continue;
    std::snprintf(text, room, value > 9 && !decimalOnly ? "%s%s = &h%08X" : "%s%s = %d",
                  withPrefix ? "k" : "", row.Declaration, value);
    row.Declaration = text;
    row.Value = 0;
  }
}

void RewriteVersionFlags(ClassRecord& record, double hostVersion) {
  if (!(hostVersion >= FlagsChangedIn)) return;
  RewriteFlags(record.ClassFlags);
  RewriteTable(record.Methods, record.MethodCount);
  RewriteTable(record.SharedMethods, record.SharedMethodCount);
  RewriteTable(record.Properties, record.PropertyCount);
  RewriteTable(record.SharedProperties, record.SharedPropertyCount);
}

}

extern "C" [[gnu::visibility("default")]] void REALPluginMain(zor::Resolver resolver) {
  using namespace zor;
  // The first resolver's one task is to name the second.
  SetResolver(resolver);
  SetResolver(reinterpret_cast<Resolver>(Resolve("ResolverPPC")));
  RegisterPluginVersion(9);
  const double hostVersion = REALGetRBVersion();
  std::srand(unsigned(std::time(nullptr)));
  InitPageSize();
  WritePictureClass();
  WriteFactoryClass();
  BuildConstantDeclarations(&PictureClass, 0, 0, 0);
  RewriteVersionFlags(PictureClass, hostVersion);
  RewriteVersionFlags(FactoryClass, hostVersion);
  RegisterClassRounded(PictureClass);
  RegisterClassRounded(FactoryClass);
}
