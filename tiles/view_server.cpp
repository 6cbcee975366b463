#include "view_server.h"

#include <httplib.h>

#include <charconv>
#include <functional>
#include <map>
#include <mutex>
#include <set>

#include "failure.h"
#include "named.h"
#include "page.h"
#include "pages.h"
#include "shown_picture.h"

namespace picturezor::tiles {

namespace {

using files::Failure;
using httplib::Request;
using httplib::Response;
using std::filesystem::path;

constexpr std::size_t MostRequestBytes = 64 << 10;
/// Pixels of a part that can be saved from the page.
constexpr std::int64_t MostSavedPixels = 100'000'000;
constexpr std::int32_t ThumbnailEdge = 128;
/// A page holds a few connections open.
constexpr std::size_t ServingThreads = 8;

enum Status : int { BadRequest = 400, Forbidden = 403, NotFound = 404, CantBeDone = 422, NotYet = 503 };

/// What a request asks for isn't there, or makes no sense.
struct Refusal {
  int Code;
  std::string Reason;
};

template <class Number>
Number Parsed(const std::string& text) {
  Number number{};
  const char* end = text.data() + text.size();
  const auto [rest, failed] = std::from_chars(text.data(), end, number);
  if (failed != std::errc() || rest != end) throw Refusal{BadRequest, "not a number"};
  return number;
}

double Parameter(const Request& request, const char* name, double otherwise, double least, double most) {
  if (!request.has_param(name)) return otherwise;
  const auto number = Parsed<double>(request.get_param_value(name));
  if (!(number >= least && number <= most))
    throw Refusal{BadRequest, std::string(name) + " is out of its range"};
  return number;
}

Adjustments AdjustmentsOf(const Request& request) {
  Adjustments a;
  a.AutoLevel = Parameter(request, "level", 0, 0, 1) == 1;
  a.Gamma = Parameter(request, "gamma", a.Gamma, 0.01, 100);
  a.Gain = Parameter(request, "gain", a.Gain, 0, 1);
  a.Bias = Parameter(request, "bias", a.Bias, 0.01, 1);
  a.Radius = Parameter(request, "radius", a.Radius, 1, 50);
  a.Amount = Parameter(request, "amount", a.Amount, -1, 10);
  return a;
}

Rect RectangleOf(const Request& request, const flow::Shape& shape) {
  const auto number = [&](const char* name) {
    return std::int64_t(Parameter(request, name, -1, -1, INT32_MAX));
  };
  const std::int64_t x = number("x"), y = number("y"), width = number("width"), height = number("height");
  if (x < 0 || y < 0 || width < 1 || height < 1 || x + width > shape.Width || y + height > shape.Height)
    throw Refusal{BadRequest, "the rectangle doesn't lie within the picture"};
  if (width * height > MostSavedPixels)
    throw Refusal{CantBeDone, "the page saves 100 megapixels at most; the command has no such limit"};
  return {std::int32_t(x), std::int32_t(y), std::int32_t(width), std::int32_t(height)};
}

/// The bytes of a picture without loss where its colours allow that.
struct Encoded {
  std::string Content, MediaType;
};
Encoded Encode(const Picture& picture, Format pixels) {
  const bool png = files::WithoutAlpha(pixels) != Format::CMYK;
  const files::FileType& type = files::TypeByName(png ? "png" : "jpg");
  files::OutputBytes output("part");
  files::ImageInfo info;
  info.Width = picture.Width();
  info.Height = picture.Height();
  info.Pixels = files::StorableFormat("part", type, pixels);
  constexpr int littleEffort = 1;
  files::WriteOptions options;
  options.Level = png ? std::optional(littleEffort) : std::nullopt;
  options.Threads = 1;
  const auto writer = type.Create(output.Descriptor(), output.Target(), info, options);
  files::Silence silence;
  files::WriteFrom(picture, *writer, info.Pixels, silence);
  writer->Finish();
  output.Commit();
  return {std::string(output.Result.begin(), output.Result.end()), png ? "image/png" : "image/jpeg"};
}

std::string NameOfFormat(Format format) {
  switch (files::WithoutAlpha(format)) {
    case Format::G: return "gray";
    case Format::RGB: return "rgb";
    default: return "cmyk";
  }
}

std::string Quoted(const std::string& text) { return '"' + QuotedForJSON(text) + '"'; }

}

struct ViewServer::Implementation {
  explicit Implementation(const ViewOptions& options) : Options(options), Shown(options.Files.size()) {
    Server.new_task_queue = [] { return new httplib::ThreadPool(ServingThreads); };
    Server.set_payload_max_length(MostRequestBytes);
    Server.set_default_headers(
        {{"X-Content-Type-Options", "nosniff"},
         {"Cross-Origin-Resource-Policy", "same-origin"},
         {"Content-Security-Policy",
          "default-src 'self'; img-src 'self' data: blob:; style-src 'self' 'unsafe-inline'"}});
    Server.set_pre_routing_handler([this](const Request& request, Response& response) {
      // A page from elsewhere whose name has been turned to this address asks under that name.
      if (Hosts.contains(request.get_header_value("Host")))
        return httplib::Server::HandlerResponse::Unhandled;
      response.status = Forbidden;
      response.set_content("this address isn't served here\n", "text/plain");
      return httplib::Server::HandlerResponse::Handled;
    });
    AddRoutes();
    Port = Server.bind_to_any_port(options.Listen);
    if (Port < 1) throw Failure(options.Listen, "no port can be had at this address");
    for (const std::string& name : {options.Listen, std::string("127.0.0.1"), std::string("localhost")})
      Hosts.insert(name + ":" + std::to_string(Port));
  }

  void AddRoutes() {
    const auto text = [this](const char* place, std::string_view content, const char* mediaType) {
      Server.Get(place, [=](const Request&, Response& response) {
        response.set_content(content.data(), content.size(), mediaType);
      });
    };
    text("/", ViewHTML, "text/html; charset=utf-8");
    text("/view.css", ViewCSS, "text/css");
    text("/view.js", ViewJS, "text/javascript");
    text("/pyramid.css", PyramidCSS, "text/css");
    text("/pyramid.js", PyramidJS, "text/javascript");
    Server.Get("/openseadragon/(.+)", [this](const Request& request, Response& response) {
      const auto file = Library.find(request.matches[1]);
      if (file == Library.end()) {
        response.status = NotFound;
        return;
      }
      const std::string ending = path(file->first).extension();
      response.set_content(file->second, ending == ".js"    ? "text/javascript"
                                         : ending == ".png" ? "image/png"
                                                            : "text/plain");
    });
    Add("/pictures", [this](const Request&, Response& response) {
      std::string names;
      for (const path& file : Options.Files)
        names += (names.empty() ? "" : ", ") + Quoted(file.filename().string());
      response.set_content("[" + names + "]", "application/json");
    });
    Add(R"(/pictures/(\d+))", std::bind_front(&Implementation::Describe, this));
    Add(R"(/pictures/(\d+)/state)", [this](const Request& request, Response& response) {
      const ShownPicture::State state = PictureOf(request).Progress();
      response.set_content("{\"rows\": " + std::to_string(state.Rows) +
                               ", \"done\": " + (state.Done ? "true" : "false") +
                               ", \"failed\": " + Quoted(state.Failed) + "}",
                           "application/json");
    });
    Add(R"(/pictures/(\d+)/tile/(\d+)/(\d+)/(\d+))", std::bind_front(&Implementation::SendTile, this));
    Add(R"(/pictures/(\d+)/thumbnail)", std::bind_front(&Implementation::SendThumbnail, this));
    Add(R"(/pictures/(\d+)/pixel)", std::bind_front(&Implementation::SendPixel, this));
    Add(R"(/pictures/(\d+)/part)", std::bind_front(&Implementation::SendPart, this));
    Add(R"(/pictures/(\d+)/command)", std::bind_front(&Implementation::SendCommand, this));
  }

  /// What goes wrong becomes a line of text, and a page shows it.
  void Add(const char* place, const std::function<void(const Request&, Response&)>& handler) {
    Server.Get(place, [handler](const Request& request, Response& response) {
      const auto refuse = [&](int code, const std::string& reason) {
        response.status = code;
        response.set_content(reason, "text/plain; charset=utf-8");
      };
      response.set_header("Cache-Control", "no-store");
      try {
        handler(request, response);
      } catch (const Refusal& refusal) {
        refuse(refusal.Code, refusal.Reason);
      } catch (const std::exception& failure) {
        refuse(CantBeDone, failure.what());
      }
    });
  }

  std::size_t NumberOf(const Request& request) const {
    const auto number = Parsed<std::size_t>(request.matches[1]);
    if (number >= Options.Files.size()) throw Refusal{NotFound, "there is no such picture"};
    return number;
  }

  Opener OpenerOf(std::size_t number) const {
    return [file = Options.Files[number], stores = Options.Stores] {
      return files::OpenNamed(
          file, {.MemoryLimit = stores.MemoryLimit, .Threads = 1, .TempDirectory = stores.TempDirectory});
    };
  }

  /// Opened when somebody looks at it for the first time.
  ShownPicture& PictureOf(const Request& request) {
    const std::size_t number = NumberOf(request);
    const std::lock_guard lock(Access);
    if (!Shown[number]) Shown[number] = std::make_unique<ShownPicture>(OpenerOf(number), Options.Stores);
    return *Shown[number];
  }

  void Describe(const Request& request, Response& response) {
    const flow::Shape& shape = PictureOf(request).About();
    const Grid& grid = PictureOf(request).Cut();
    response.set_content("{\"width\": " + std::to_string(shape.Width) + ", \"height\": " +
                             std::to_string(shape.Height) + ", \"tile\": " + std::to_string(grid.Tile()) +
                             ", \"levels\": " + std::to_string(grid.LevelCount()) +
                             ", \"colours\": " + Quoted(NameOfFormat(shape.Of)) +
                             ", \"alpha\": " + (files::HasAlpha(shape.Of) ? "true" : "false") +
                             ", \"perMetre\": " + PerMetre(shape.Density) + "}",
                         "application/json");
  }

  void SendTile(const Request& request, Response& response) {
    ShownPicture& picture = PictureOf(request);
    const Grid& grid = picture.Cut();
    const auto zoom = Parsed<int>(request.matches[2]);
    const auto column = Parsed<std::int32_t>(request.matches[3]),
               row = Parsed<std::int32_t>(request.matches[4]);
    const int level = grid.LevelCount() - 1 - zoom;
    if (level < 0 || zoom < 0 || column >= grid.Across(level) || row >= grid.Down(level))
      throw Refusal{NotFound, "there is no such tile"};
    const auto part = picture.PartOf(level, grid.TileAt(level, column, row), AdjustmentsOf(request));
    if (!part) throw Refusal{NotYet, "this part isn't there yet"};
    Send(response, Encode(part->Of, picture.About().Of));
    if (part->Rough) response.set_header("X-Rough", "1");
  }

  static void Send(Response& response, const Encoded& image) {
    response.set_content(image.Content, image.MediaType);
  }

  void SendThumbnail(const Request& request, Response& response) {
    const std::size_t number = NumberOf(request);
    const std::atomic<bool> stop = false;
    const auto plane = RoughPlane(OpenerOf(number), ThumbnailEdge, Options.Stores.TempDirectory, stop);
    if (!plane) throw Refusal{CantBeDone, "a small version would take long"};
    const files::Extent size = plane->Size();
    const Format format = files::Upright(OpenerOf(number)()->Info()).Pixels;
    const Picture small(size.Width, size.Height, format);
    for (std::int32_t y = 0; y < size.Height; ++y)
      small.SetRowInFormat(y, format, {plane->Row(y), plane->BytesOfRow()});
    Send(response, Encode(small, format));
  }

  void SendPixel(const Request& request, Response& response) {
    ShownPicture& picture = PictureOf(request);
    const auto number = [&](const char* name, std::int32_t most) {
      return std::int32_t(Parameter(request, name, 0, 0, most - 1));
    };
    const std::int32_t x = number("x", picture.About().Width), y = number("y", picture.About().Height);
    const auto part = picture.PartOf(0, {x, y, 1, 1});
    if (!part) throw Refusal{NotYet, "this part isn't there yet"};
    std::string samples;
    for (const std::uint8_t sample : part->Of.RowInFormat(0, picture.About().Of))
      samples += (samples.empty() ? "" : ", ") + std::to_string(sample);
    response.set_content("{\"x\": " + std::to_string(x) + ", \"y\": " + std::to_string(y) +
                             ", \"samples\": [" + samples +
                             "], \"rough\": " + (part->Rough ? "true" : "false") + "}",
                         "application/json");
  }

  void SendPart(const Request& request, Response& response) {
    ShownPicture& picture = PictureOf(request);
    const auto part = picture.PartOf(0, RectangleOf(request, picture.About()), AdjustmentsOf(request));
    if (!part || part->Rough) throw Refusal{NotYet, "this part isn't there yet"};
    const Encoded image = Encode(part->Of, picture.About().Of);
    Send(response, image);
    const std::string ending = image.MediaType == "image/png" ? ".png" : ".jpg";
    response.set_header("Content-Disposition", "attachment; filename=\"part" + ending + "\"");
  }

  /// The command line that does to the file what the page shows, and the one that cuts a rectangle out.
  void SendCommand(const Request& request, Response& response) {
    const std::size_t number = NumberOf(request);
    const path& file = Options.Files[number];
    const flow::Shape& shape = PictureOf(request).About();
    std::string steps;
    if (request.has_param("width")) {
      const auto at = [&](const char* name) {
        return std::to_string(std::int64_t(Parameter(request, name, 0, 0, INT32_MAX)));
      };
      steps = "crop --rect " + at("x") + "," + at("y") + "," + at("width") + "," + at("height");
    }
    const std::string adjustments = AdjustmentsOf(request).Steps();
    if (!adjustments.empty()) steps += (steps.empty() ? "" : " : ") + adjustments;
    std::string command;
    if (!steps.empty()) {
      const bool cmyk = files::WithoutAlpha(shape.Of) == Format::CMYK;
      const std::string out = file.stem().string() + "-part" + (cmyk ? ".tif" : ".png");
      command =
          "picturezor run " + QuotedForShell(file.string()) + " -o " + QuotedForShell(out) + " " + steps;
    }
    response.set_content(command, "text/plain; charset=utf-8");
  }

  const ViewOptions Options;
  httplib::Server Server;
  int Port = 0;
  std::set<std::string> Hosts;
  const std::map<std::string, std::string> Library = OpenSeadragonFiles();
  std::mutex Access;
  std::vector<std::unique_ptr<ShownPicture>> Shown;
};

ViewServer::ViewServer(const ViewOptions& options) : Of(std::make_unique<Implementation>(options)) {}
ViewServer::~ViewServer() = default;

std::string ViewServer::Address() const {
  return "http://" + Of->Options.Listen + ":" + std::to_string(Of->Port) + "/";
}

void ViewServer::Run() { Of->Server.listen_after_bind(); }

}
