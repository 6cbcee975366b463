#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <new>

#include "picturezor/host.h"
#include "session.h"

namespace picturezor::cli {

namespace {

int Complain(Session& session, std::string text, int code) {
  session.Bar.Clear();
  std::ranges::replace(text, '\n', ' ');
  std::fprintf(stderr, "picturezor: %s\n", text.c_str());
  return code;
}

int Run(int count, char** arguments) {
  Session session;
  session.Stores.MemoryLimit = DefaultMemoryLimit();
  session.Stores.TempDirectory = DefaultTempDirectory();
  CLI::App app("Scales, converts and combines PNG, JPEG and TIFF images, also ones larger than memory.",
               "picturezor");
  app.set_version_flag("--version", "picturezor " PICTUREZOR_VERSION);
  app.require_subcommand(1);
  app.footer(
      "picturezor COMMAND --help tells the options of a command, with examples.\n\n"
      "Exit codes: 0 done; 1 compare found a difference; 2 it can't be done (the reason is on standard\n"
      "error); 3 the command line is wrong.\n\n"
      "The module PictureZOR.so is looked for beside the program, then in the library directory beside\n"
      "it; the environment variable PICTUREZOR_MODULE names another one.");
  for (const auto add : {AddScale, AddConvert, AddCrop, AddCombine, AddChannels, AddFilter, AddMirror,
                         AddRotate, AddCompare, AddInfo, AddThumbnail, AddShow})
    add(app, session);
  try {
    app.parse(count, arguments);
  } catch (const CLI::Success& help) {
    return app.exit(help);
  } catch (const CLI::ParseError& error) {
    std::string command;
    for (const CLI::App* chosen : app.get_subcommands()) command = " " + chosen->get_name();
    return Complain(session, std::string(error.what()) + " (see picturezor" + command + " --help)",
                    WrongUsage);
  } catch (const Failure& failure) {
    return Complain(session, failure.what(), WrongUsage);
  }
  try {
    if (!session.Quiet) session.Bar.Enable();
    CatchSignals(Failed);
    Host::Load();
    const int code = session.Work();
    session.Bar.Clear();
    if (std::fflush(stdout) != 0) return Complain(session, "standard output can't be written", Failed);
    return code;
  } catch (const UsageFailure& failure) {
    return Complain(session, failure.what(), WrongUsage);
  } catch (const std::bad_alloc&) {
    return Complain(session, "not enough memory", Failed);
  } catch (const std::exception& failure) {
    return Complain(session, failure.what(), Failed);
  }
}

}

}

int main(int count, char** arguments) { return picturezor::cli::Run(count, arguments); }
