#include "adjustments.h"

#include <cstdio>

#include "failure.h"
#include "step.h"

namespace picturezor::tiles {

namespace {

std::string Text(double number) {
  char text[32];
  std::snprintf(text, sizeof text, "%.6g", number);
  return text;
}

struct Written {
  const char* Step;
  std::map<std::string, std::string> Options;
};

std::vector<Written> StepsOf(const Adjustments& a) {
  std::vector<Written> steps;
  if (a.Gamma != 1) steps.push_back({"filter gamma", {{"gamma", Text(a.Gamma)}}});
  if (a.Gain != 0.5 || a.Bias != 0.5)
    steps.push_back({"filter gain", {{"gain", Text(a.Gain)}, {"bias", Text(a.Bias)}}});
  if (a.Amount != 0)
    steps.push_back({"filter unsharp", {{"radius", Text(a.Radius)}, {"amount", Text(a.Amount)}}});
  return steps;
}

}

std::string Adjustments::Steps() const {
  std::string text = AutoLevel ? "filter auto-level" : "";
  for (const Written& step : StepsOf(*this)) {
    if (!text.empty()) text += " : ";
    text += step.Step;
    for (const auto& [name, value] : step.Options) text += " --" + name + " " + value;
  }
  return text;
}

flow::Chain Adjustments::Chain(const files::StoreOptions& stores) const {
  flow::Chain chain;
  for (const Written& step : StepsOf(*this))
    chain.push_back(
        steps::MakeOperation(*steps::FindStep(step.Step), step.Options, {.Stores = stores, .Note = {}}));
  return chain;
}

SampleTable AutoLevelTable(const Picture& picture) {
  if (!picture.IsRGB()) throw files::Failure("auto-level supports only RGB");
  const Picture levelled = picture.Clone();
  if (!levelled || !levelled.AutoLevel()) throw files::Failure("the levels can't be stretched");
  // It sends all channels through one table, of which the samples that there are show a part; between them
  // it is a straight line.
  std::array<int, 256> known;
  known.fill(-1);
  for (std::int32_t y = 0; y < picture.Height(); ++y) {
    const Bytes from = picture.RowInFormat(y, Format::RGB), to = levelled.RowInFormat(y, Format::RGB);
    for (std::size_t i = 0; i < from.size(); ++i) known[from[i]] = to[i];
  }
  SampleTable table{};
  int before = -1;
  for (int v = 0; v < 256; ++v) {
    if (known[std::size_t(v)] < 0) continue;
    for (int between = before + 1; between <= v; ++between) {
      const int low = before < 0 ? known[std::size_t(v)] : known[std::size_t(before)];
      const int from = before < 0 ? v - 1 : before;
      table[std::size_t(between)] = std::uint8_t(
          before < 0 ? low : low + (known[std::size_t(v)] - low) * (between - from) / (v - from));
    }
    before = v;
  }
  for (int v = before + 1; v < 256; ++v)
    table[std::size_t(v)] = std::uint8_t(before < 0 ? v : known[std::size_t(before)]);
  return table;
}

std::string QuotedForShell(const std::string& word) {
  const bool plain = !word.empty() && word.find_first_not_of(
                                          "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ"
                                          "0123456789._/+,:=@%-") == word.npos;
  if (plain) return word;
  std::string quoted = "'";
  for (const char c : word) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

}
