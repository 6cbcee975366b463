#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>

#include "session.h"
#include "view_server.h"

namespace picturezor::cli {

namespace {

struct ViewOptions {
  tiles::ViewOptions Viewing;
  bool NoOpen = false;
};

/// Where there is a desktop.
void OpenInBrowser(const std::string& address) {
  if (!std::getenv("DISPLAY") && !std::getenv("WAYLAND_DISPLAY")) return;
  if (fork() != 0) return;
  execlp("xdg-open", "xdg-open", address.c_str(), nullptr);
  _exit(Failed);
}

int View(Session& session, ViewOptions options) {
  options.Viewing.Stores = session.Stores;
  tiles::ViewServer server(options.Viewing);
  std::printf("%s\n", server.Address().c_str());
  std::fflush(stdout);
  if (!options.NoOpen) OpenInBrowser(server.Address());
  server.Run();
  return Done;
}

}

void AddView(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("view", "View images of any size in the browser");
  command->footer(
      "The address of the page is printed, and opened in the browser if there is a desktop. Only this\n"
      "machine can reach it, unless --listen says otherwise. Ctrl-C ends the viewer, and nothing is left\n"
      "behind.\n\n"
      "Examples:\n"
      "  picturezor view scan.tif\n"
      "  picturezor view --no-open photos/*.jpg");
  auto options = std::make_shared<ViewOptions>();
  command->add_option("FILE", options->Viewing.Files, "Images to show")->required()->type_name("");
  command->add_flag("--no-open", options->NoOpen, "Print the address, but don't open it");
  command
      ->add_option("--listen", options->Viewing.Listen,
                   "Address to listen on, 127.0.0.1 by default. Anyone who can reach it sees the images")
      ->type_name("ADDRESS");
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return View(session, *options); }; });
}

}
