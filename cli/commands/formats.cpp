#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>

#include "session.h"

namespace picturezor::cli {

namespace {

int Formats() {
  std::printf("%-10s %-5s %-6s %-5s %-6s %-5s %-6s %-6s %-7s %s\n", "type", "reads", "writes", "gray",
              "alpha", "CMYK", "pages", "parts", "stream", "names");
  for (const FileType* type : FileTypes()) {
    std::string names;
    for (const std::string_view ending : type->Extensions) names.append(ending).push_back(' ');
    const auto yes = [](bool has) { return has ? "yes" : "-"; };
    const auto holds = [&](auto matches) { return yes(std::ranges::any_of(type->Holds, matches)); };
    std::printf("%-10s %-5s %-6s %-5s %-6s %-5s %-6s %-6s %-7s %s\n", type->Name, "yes", yes(type->Create),
                holds([](Format format) { return WithoutAlpha(format) == Format::G; }), holds(HasAlpha),
                holds([](Format format) { return WithoutAlpha(format) == Format::CMYK; }), yes(type->Several),
                yes(type->Parts), yes(type->InOrder), names.c_str());
  }
  return Done;
}

}

void AddFormats(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("formats", "List the file types that are built in");
  command->footer(
      "gray, alpha and CMYK: what the type can be written with. pages: FILE[2] selects the second image.\n"
      "parts: a region can be read without the rest. stream: - needs no temporary file.");
  command->callback([&session] {
    session.NeedsModule = false;
    session.Work = Formats;
  });
}

}
