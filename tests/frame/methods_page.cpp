#include "frame/methods_page.h"

#include <sstream>

#include "frame/classes.h"
#include "frame/load.h"

namespace zor {
namespace {

void PrintMethods(std::ostream& out, const char* title, const MethodRecord* rows, Word count) {
  out << "\n## " << title << "\n\n| No. | Declaration | Flags | Assignment |\n|---|---|---|---|\n";
  for (Word i = 0; i < count; ++i)
    out << "| " << i + 1 << " | `" << rows[i].Declaration << "` | " << std::hex << "0x" << rows[i].Flags
        << std::dec << " | " << (rows[i].Setter ? "yes" : "") << " |\n";
}

void PrintProperties(std::ostream& out, const ClassRecord& record) {
  out << "\n## Properties\n\n| No. | Name | Type | Read | Written | Flags |\n|---|---|---|---|---|---|\n";
  const auto access = [](Word function) {
    return function == 0 ? "" : function == DirectField ? "in the record" : "by a function";
  };
  for (Word i = 0; i < record.PropertyCount; ++i) {
    const PropertyRecord& row = record.Properties[i];
    out << "| " << i + 1 << " | `" << row.Name << "` | " << row.Type << " | " << access(row.Getter) << " | "
        << access(row.Setter) << " | 0x" << std::hex << row.Flags << std::dec << " |\n";
  }
}

void PrintConstants(std::ostream& out, const ClassRecord& record) {
  out << "\n## Constants\n\n```\n";
  for (Word i = 0; i < record.ConstantCount; ++i) out << record.Constants[i].Declaration << "\n";
  out << "```\n";
}

}

std::string MethodsPage() {
  WritePictureClass();
  WriteFactoryClass();
  BuildConstantDeclarations(&PictureClass, 0, 0, 0);
  std::ostringstream out;
  out << "# Methods, properties and constants\n\n"
         "The module registers these declarations with a host, in this order. `scripts/methods` generates "
         "the page from the\nmodule's tables, and a test checks that it is up to date.\n\n"
         "- Assignment: the method can also stand on the left of an assignment, which stores a value.\n"
         "- Read, Written: a host accesses the property in the object's record, or through a function of the "
         "module.\n"
         "- Flags: availability in hosts; 0x40000 marks entries that use pictures of the host.\n\n"
         "# PictureZOR\n";
  PrintMethods(out, "Methods", PictureClass.Methods, PictureClass.MethodCount);
  PrintMethods(out, "Shared methods", PictureClass.SharedMethods, PictureClass.SharedMethodCount);
  PrintProperties(out, PictureClass);
  PrintConstants(out, PictureClass);
  out << "\n# PictureFactoryZOR\n";
  PrintMethods(out, "Shared methods", FactoryClass.SharedMethods, FactoryClass.SharedMethodCount);
  out << "\n## Events\n\n- `" << FactoryClass.Events[0].Declaration << "`\n";
  return out.str();
}

}
