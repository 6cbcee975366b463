#include "invoke.h"

#include <algorithm>

namespace picturezor::model {
namespace {

/// Whether the row takes arguments of these types, as its first ones, and can do without the others.
bool Takes(const MethodEntry& row, const std::string& lowerName, TypeList types) {
  const auto& parameters = row.Of.Parameters;
  if (row.LowerName != lowerName || types.size() > parameters.size()) return false;
  for (std::size_t i = 0; i < types.size(); ++i)
    if (parameters[i].Type != types[i]) return false;
  return types.size() == parameters.size() || parameters[types.size()].Optional;
}

std::string Listed(std::string_view name, TypeList types) {
  std::string text = std::string(name) + "(";
  for (const char* type : types) text += std::string(text.back() == '(' ? "" : ", ") + type;
  return text + ")";
}

}

Found FindMethod(const std::vector<MethodEntry>& rows, std::string_view name, TypeList types) {
  const std::string lowerName = Lower(name);
  const MethodEntry* best = nullptr;
  for (const MethodEntry& row : rows)
    if (Takes(row, lowerName, types) && (!best || row.Of.Parameters.size() < best->Of.Parameters.size()))
      best = &row;
  if (!best) throw ModuleError("the class has no method " + Listed(name, types));
  return {best, std::span(best->Of.Parameters).subspan(types.size())};
}

const Found& FindMethod(const Object& self, std::string_view name, TypeList types) {
  if (!self) throw ModuleError(std::string(name) + ": called on nil");
  const Class& of = *HeaderOf(self.Address()).Of;
  const std::pair<std::string_view, const void*> asked(name, types.data());
  auto found = of.FoundMethods.find(asked);
  if (found == of.FoundMethods.end())
    found = of.FoundMethods.emplace(asked, FindMethod(of.Methods, name, types)).first;
  return found->second;
}

const zor::PropertyRecord& FindProperty(const Object& self, std::string_view name, std::string_view type) {
  if (!self) throw ModuleError(std::string(name) + ": read on nil");
  const std::string lowerName = Lower(name);
  for (const PropertyEntry& row : HeaderOf(self.Address()).Of->Properties)
    if (row.LowerName == lowerName && row.LowerType == type) return *row.Record;
  throw ModuleError("the class has no property " + std::string(name) + " as " + std::string(type));
}

}
