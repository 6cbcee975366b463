#pragma once
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "pictures.h"

namespace picturezor::tiles {

struct ViewOptions {
  std::vector<std::filesystem::path> Files;
  /// The address to listen on.
  std::string Listen = "127.0.0.1";
  files::StoreOptions Stores;
};

/// Shows pictures in browsers. It serves the files that it was given and the page's own, and nothing else:
/// no name of a file comes from a request.
class ViewServer {
 public:
  /// Takes a free port. Throws files::Failure where there is none, or OpenSeadragon isn't there.
  explicit ViewServer(const ViewOptions& options);
  ~ViewServer();
  /// The page's address.
  std::string Address() const;
  /// Serves as long as the process lives.
  void Run();

 private:
  struct Implementation;
  std::unique_ptr<Implementation> Of;
};

}
