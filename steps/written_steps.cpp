#include "written_steps.h"

#include <algorithm>
#include <optional>

namespace picturezor::steps {

namespace {

using files::UsageFailure;

/// Runs some work; what it throws names the step.
template <class Work>
auto Naming(const std::string& step, Work work) {
  try {
    return work();
  } catch (const Unserved& failure) {
    throw Unserved(step + ": " + failure.what());
  } catch (const UsageFailure& failure) {
    throw UsageFailure(step + ": " + failure.what());
  } catch (const files::Failure& failure) {
    throw files::Failure(step + ": " + failure.what());
  }
}

class NamedOperation final : public flow::Operation {
 public:
  NamedOperation(const std::string& name, std::unique_ptr<const Operation> work)
      : Name(name), Work(std::move(work)) {}

  flow::Shape Result(const flow::Shape& source) const override {
    return Naming(Name, [&] { return Work->Result(source); });
  }
  flow::Dependence DependsOn(const flow::Shape& source) const override { return Work->DependsOn(source); }
  int Pictures() const override { return Work->Pictures(); }
  std::optional<Rect> Cuts() const override { return Work->Cuts(); }
  std::optional<flow::Draft> Drafted(const flow::Shape& source) const override {
    auto draft = Naming(Name, [&] { return Work->Drafted(source); });
    if (draft) draft->Rest = std::make_unique<NamedOperation>(Name, std::move(draft->Rest));
    return draft;
  }
  std::optional<int> Turns() const override { return Work->Turns(); }
  std::vector<std::unique_ptr<const Operation>> Parts(const flow::Shape& source) const override {
    auto parts = Work->Parts(source);
    for (auto& part : parts) part = std::make_unique<NamedOperation>(Name, std::move(part));
    return parts;
  }
  Picture Apply(Picture source, const flow::Workplace& at) const override {
    return Naming(Name, [&] { return Work->Apply(std::move(source), at); });
  }

 private:
  const std::string Name;
  const std::unique_ptr<const Operation> Work;
};

/// The options of a step out of its words.
class OptionWords {
 public:
  OptionWords(WrittenStep& step, std::span<const std::string> words) : Of(step), Left(words) {
    while (!Left.empty()) {
      const std::string word = Take();
      if (word.starts_with("--"))
        TakeNamed(word.substr(2));
      else
        TakePlaced(word);
    }
  }

 private:
  std::string Take() {
    const std::string& word = Left.front();
    Left = Left.subspan(1);
    return word;
  }

  void TakeNamed(const std::string& word) {
    const std::size_t equals = std::min(word.find('='), word.size());
    const auto option = std::ranges::find_if(Of.Of->Options, [&](const Option& one) {
      return !one.ByPlace && word.compare(0, equals, one.Name) == 0;
    });
    if (option == Of.Of->Options.end()) throw UsageFailure("it has no option --" + word.substr(0, equals));
    if (equals < word.size()) return Put(*option, word.substr(equals + 1));
    if (option->Of == Kind::Flag) return Put(*option, "true");
    if (Left.empty()) throw UsageFailure(option->Shown() + ": its value is missing");
    Put(*option, Take());
  }

  void TakePlaced(const std::string& word) {
    const auto option = std::ranges::find_if(
        Of.Of->Options, [&](const Option& one) { return one.ByPlace && !Of.Texts.contains(one.Name); });
    if (option == Of.Of->Options.end()) throw UsageFailure("unexpected argument " + word);
    Put(*option, word);
  }

  void Put(const Option& option, const std::string& text) {
    if (!Of.Texts.emplace(option.Name, text).second) throw UsageFailure(option.Shown() + " is given twice");
  }

  WrittenStep& Of;
  std::span<const std::string> Left;
};

std::vector<WrittenStep> Parse(std::span<const std::string> words, const std::string& place,
                               std::size_t before) {
  std::vector<WrittenStep> steps;
  for (std::size_t at = 0;; ++at) {
    const std::size_t end = std::size_t(std::ranges::find(words.subspan(at), ":") - words.begin());
    const auto own = words.subspan(at, end - at);
    at = end;
    const std::string number = place + "step " + std::to_string(before + steps.size() + 1);
    if (own.empty()) throw UsageFailure(number + ": the step is missing");
    const bool grouped = std::ranges::any_of(Groups(), [&](const Group& one) { return own[0] == one.Name; });
    const std::size_t named = grouped && own.size() > 1 ? 2 : 1;
    const std::string name = named == 2 ? own[0] + " " + own[1] : own[0];
    const Step* const step = FindStep(name);
    if (!step) throw UsageFailure(number + ": there is no step " + name);
    steps.push_back({step, number + " (" + name + ")"});
    Naming(steps.back().Name, [&] { OptionWords(steps.back(), own.subspan(named)); });
    if (at == words.size()) return steps;
  }
}

/// The words of a line. Throws UsageFailure for a quote without end.
std::vector<std::string> WordsOf(std::string_view line) {
  std::vector<std::string> words;
  std::optional<std::string> word;
  for (std::size_t at = 0; at < line.size(); ++at) {
    const char c = line[at];
    if (std::isspace(static_cast<unsigned char>(c))) {
      if (word) words.push_back(*std::exchange(word, std::nullopt));
      continue;
    }
    if (c == '#' && !word) break;
    if (!word) word.emplace();
    if (c != '"' && c != '\'') {
      *word += c;
      continue;
    }
    for (++at; at < line.size() && line[at] != c; ++at) {
      if (c == '"' && line[at] == '\\' && at + 1 < line.size()) ++at;
      *word += line[at];
    }
    if (at >= line.size()) throw UsageFailure("a quote isn't closed");
  }
  if (word) words.push_back(*word);
  return words;
}

}

std::vector<WrittenStep> ParseSteps(std::span<const std::string> words) { return Parse(words, "", 0); }

std::vector<WrittenStep> ParseSteps(std::string_view text, const std::string& file) {
  std::vector<WrittenStep> steps;
  for (int number = 1; !text.empty(); ++number) {
    const std::size_t end = std::min(text.find('\n'), text.size());
    const std::string_view line = text.substr(0, end);
    text.remove_prefix(std::min(end + 1, text.size()));
    const std::string place = file + ":" + std::to_string(number);
    const std::vector<std::string> words = Naming(place, [&] { return WordsOf(line); });
    if (words.empty()) continue;
    const auto more = Parse(words, place + ": ", steps.size());
    steps.insert(steps.end(), more.begin(), more.end());
  }
  return steps;
}

flow::Chain MakeChain(std::span<const WrittenStep> steps, const Surroundings& around) {
  flow::Chain chain;
  for (const WrittenStep& step : steps)
    chain.push_back(std::make_unique<NamedOperation>(
        step.Name, Naming(step.Name, [&] { return MakeOperation(*step.Of, step.Texts, around); })));
  return chain;
}

}
