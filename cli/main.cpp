#include <malloc.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <new>

#include "picturezor/host.h"
#include "session.h"

namespace picturezor::cli {

namespace {

/// Where the right usage of the chosen command stands.
std::string See(const CLI::App& app) {
  std::string command;
  for (const CLI::App* chosen = &app; !chosen->get_subcommands().empty();) {
    chosen = chosen->get_subcommands().front();
    command += " " + chosen->get_name();
  }
  return " (see picturezor" + command + " --help)";
}

/// Bands of rows, some megabytes each, come and go on all threads. By default the allocator takes each from
/// the system and gives it back, and so every page is cleared and faulted in again for every band.
void KeepBandsForTheNext() {
#ifdef __GLIBC__
  mallopt(M_MMAP_THRESHOLD, 32 << 20);
  mallopt(M_TRIM_THRESHOLD, 64 << 20);
  mallopt(M_ARENA_MAX, 1);
#endif
}

int Run(int count, char** arguments) {
  KeepBandsForTheNext();
  Session session;
  session.Stores.MemoryLimit = DefaultMemoryLimit();
  session.Stores.TempDirectory = DefaultTempDirectory();
  CLI::App app("Scale, convert and combine images, including images larger than memory.", "picturezor");
  app.set_version_flag("--version", "picturezor " PICTUREZOR_VERSION);
  app.require_subcommand(1);
  app.footer(
      "picturezor COMMAND --help lists the options of a command, with examples.\n\n"
      "Exit codes: 0 success; 1 compare found a difference; 2 failure (the reason is on standard error);\n"
      "3 the command line is invalid.\n\n"
      "The module PictureZOR.so is looked for beside the program, then in the library directory beside\n"
      "it; the environment variable PICTUREZOR_MODULE names another one.");
  for (const auto add : {AddSteps, AddRun, AddChannels, AddCompare, AddInfo, AddFormats, AddThumbnail,
                         AddShow, AddTiles, AddView, AddCompletion})
    add(app, session);
  try {
    app.parse(count, arguments);
  } catch (const CLI::Success& help) {
    return app.exit(help);
  } catch (const CLI::ParseError& error) {
    return session.Complain(error.what() + See(app), WrongUsage);
  } catch (const Failure& failure) {
    return session.Complain(failure.what(), WrongUsage);
  }
  try {
    if (!session.Quiet) session.Bar.Enable();
    CatchSignals(Failed);
    if (session.NeedsModule) Host::Load();
    const int code = session.Work();
    session.Bar.Clear();
    if (std::fflush(stdout) != 0) return session.Complain("standard output can't be written", Failed);
    return code;
  } catch (const UsageFailure& failure) {
    return session.Complain(failure.what() + See(app), WrongUsage);
  } catch (const std::bad_alloc&) {
    return session.Complain("not enough memory", Failed);
  } catch (const std::exception& failure) {
    return session.Complain(failure.what(), Failed);
  }
}

}

}

int main(int count, char** arguments) { return picturezor::cli::Run(count, arguments); }
