#include "invoke.h"

#include <algorithm>
#include <unordered_map>

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

/// What is asked for: a class, the name of a method, and the address of the list of the arguments' types.
template <class Text>
struct Question {
  const Class* Of;
  Text Name;
  const void* Types;
};

struct SameQuestion {
  using is_transparent = void;
  template <class Text>
  std::size_t operator()(const Question<Text>& asked) const {
    return std::hash<std::string_view>()(asked.Name) ^ std::hash<const void*>()(asked.Types);
  }
  template <class Text, class OtherText>
  bool operator()(const Question<Text>& a, const Question<OtherText>& b) const {
    return a.Of == b.Of && a.Types == b.Types && a.Name == b.Name;
  }
};

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
  // Some calls work on a row of a picture only, so a search is much to them.
  thread_local std::unordered_map<Question<std::string>, Found, SameQuestion, SameQuestion> known;
  const Question<std::string_view> asked{HeaderOf(self.Address()).Of, name, types.data()};
  auto found = known.find(asked);
  if (found == known.end()) {
    const Found row = FindMethod(asked.Of->Methods, name, types);
    found = known.emplace(Question<std::string>{asked.Of, std::string(name), asked.Types}, row).first;
  }
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
