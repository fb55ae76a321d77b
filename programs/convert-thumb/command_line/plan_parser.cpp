#include "command_line/plan_parser.h"

#include <strings.h>

#include <utility>

#include "command_line/option_values.h"

namespace vela {

namespace {

constexpr char kScratchDefine[] = "registry:temporary-path=";
constexpr char kSizeHintDefine[] = "jpeg:size=";
constexpr char kFirstPage[] = "[0]";

bool StartsWith(const std::string& text, const std::string& beginning) {
  return text.compare(0, beginning.size(), beginning) == 0;
}

/// The arguments that are still to be read.
class Arguments {
 public:
  explicit Arguments(const std::vector<std::string>& arguments) : arguments_(arguments) {}

  bool AtEnd() const { return next_ == arguments_.size(); }
  bool IsLast() const { return next_ + 1 == arguments_.size(); }
  const std::string* Peek() const { return AtEnd() ? nullptr : &arguments_[next_]; }
  const std::string* Take() { return AtEnd() ? nullptr : &arguments_[next_++]; }

  /// Takes the argument when it reads `text`.
  bool TakeText(const char* text) {
    const bool is = !AtEnd() && arguments_[next_] == text;
    next_ += is ? 1 : 0;
    return is;
  }

 private:
  const std::vector<std::string>& arguments_;
  size_t next_ = 0;
};

/// Collects the options of one output.
class OutputOptions {
 public:
  /// Takes one option with its value; false when it is not understood.
  bool Take(Arguments& arguments) {
    const std::string& option = *arguments.Take();
    if (option == "-flatten") {
      return AddStep(Step::Kind::kFlatten);
    }
    if (option == "-auto-orient") {
      return AddStep(Step::Kind::kAutoOrient);
    }
    const std::string* const value = arguments.Take();
    return value != nullptr && TakeValue(option, *value);
  }

  /// The output when all it needs is known.
  std::optional<OutputPlan> Finish(const std::string& pathArgument) {
    std::optional<std::string> path = ParseOutputPath(pathArgument);
    if (!path || plan_.box.width == 0 || plan_.quality == 0) {
      return std::nullopt;
    }
    plan_.path = std::move(*path);
    return std::move(plan_);
  }

 private:
  bool TakeValue(const std::string& option, const std::string& value) {
    if (option == "-define") {
      // The size of the decoded picture follows from the thumbnail itself.
      return StartsWith(value, kSizeHintDefine);
    }
    if (option == "-thumbnail") {
      return TakeBox(value);
    }
    if (option == "-quality") {
      plan_.quality = ParseWholeNumber(value, 1, 100).value_or(0);
      return plan_.quality != 0;
    }
    if (option == "+profile") {
      // Scaling to a thumbnail has already dropped what this would remove.
      return value == "!icc,*" && plan_.box.width != 0;
    }
    return TakeStep(option, value);
  }

  bool TakeBox(const std::string& value) {
    const std::optional<ThumbnailBox> box = ParseThumbnailBox(value);
    if (!box || plan_.box.width != 0) {
      return false;
    }
    plan_.box = *box;
    return true;
  }

  bool TakeStep(const std::string& option, const std::string& value) {
    Step step;
    if (option == "-rotate") {
      const std::optional<int> turns = ParseQuarterTurns(value);
      step.kind = Step::Kind::kTurn;
      step.quarterTurns = turns.value_or(0);
      return turns && AddStep(step);
    }
    if (option == "-unsharp") {
      const std::optional<UnsharpMask> mask = ParseUnsharpMask(value);
      step.kind = Step::Kind::kSharpen;
      step.unsharp = mask.value_or(UnsharpMask());
      return mask && AddStep(step);
    }
    return option == "-colorspace" && strcasecmp(value.c_str(), "sRGB") == 0 &&
           AddStep(Step::Kind::kConvertToSrgb);
  }

  bool AddStep(Step::Kind kind) {
    Step step;
    step.kind = kind;
    return AddStep(step);
  }

  /// A step in front of the scaling would see the whole photo, which is never decoded here.
  bool AddStep(const Step& step) {
    if (plan_.box.width == 0) {
      return false;
    }
    plan_.steps.push_back(step);
    return true;
  }

  OutputPlan plan_;
};

/// The options up to "-write", the path and what follows it.
std::optional<OutputPlan> TakeWrittenOutput(Arguments& arguments) {
  OutputOptions options;
  while (!arguments.TakeText("-write")) {
    if (arguments.AtEnd() || !options.Take(arguments)) {
      return std::nullopt;
    }
  }
  const std::string* const path = arguments.Take();
  return path == nullptr ? std::nullopt : options.Finish(*path);
}

std::optional<OutputPlan> TakeFirstOutput(Arguments& arguments) {
  if (!arguments.TakeText("(") || !arguments.TakeText("-clone") || !arguments.TakeText("0")) {
    return std::nullopt;
  }
  std::optional<OutputPlan> output = TakeWrittenOutput(arguments);
  if (!arguments.TakeText(")") || !arguments.TakeText("-delete") || !arguments.TakeText("0")) {
    return std::nullopt;
  }
  return output;
}

std::optional<OutputPlan> TakeMiddleOutput(Arguments& arguments) {
  if (!arguments.TakeText("(") || !arguments.TakeText("+clone")) {
    return std::nullopt;
  }
  std::optional<OutputPlan> output = TakeWrittenOutput(arguments);
  if (!arguments.TakeText("+delete") || !arguments.TakeText(")")) {
    return std::nullopt;
  }
  return output;
}

std::optional<OutputPlan> TakeLastOutput(Arguments& arguments) {
  OutputOptions options;
  while (!arguments.AtEnd() && !arguments.IsLast()) {
    if (!options.Take(arguments)) {
      return std::nullopt;
    }
  }
  const std::string* const path = arguments.Take();
  return path == nullptr ? std::nullopt : options.Finish(*path);
}

bool IsParenthesis(const Arguments& arguments) {
  return !arguments.AtEnd() && *arguments.Peek() == "(";
}

bool TakeOutputs(Arguments& arguments, std::vector<OutputPlan>& outputs) {
  const auto add = [&outputs](std::optional<OutputPlan> output) {
    if (output) {
      outputs.push_back(std::move(*output));
    }
    return output.has_value();
  };
  if (IsParenthesis(arguments) && !add(TakeFirstOutput(arguments))) {
    return false;
  }
  while (IsParenthesis(arguments)) {
    if (!add(TakeMiddleOutput(arguments))) {
      return false;
    }
  }
  return add(TakeLastOutput(arguments));
}

/// The scratch directory is of no use here: nothing is kept outside of memory.
bool SkipScratchDirectory(Arguments& arguments) {
  if (!arguments.TakeText("-define")) {
    return true;
  }
  const std::string* const value = arguments.Take();
  return value != nullptr && StartsWith(*value, kScratchDefine);
}

}  // namespace

std::string SourceFile(const std::string& argument) {
  const size_t suffix = sizeof kFirstPage - 1;
  if (argument.size() > suffix &&
      argument.compare(argument.size() - suffix, suffix, kFirstPage) == 0) {
    return argument.substr(0, argument.size() - suffix);
  }
  return argument;
}

size_t FindSourceArgument(const std::vector<std::string>& arguments) {
  size_t place = 0;
  while (place + 1 < arguments.size() &&
         (arguments[place] == "-define" || arguments[place] == "-rotate")) {
    place += 2;
  }
  return place < arguments.size() ? place : arguments.size();
}

std::optional<std::string> FindScratchDirectory(const std::vector<std::string>& arguments) {
  for (size_t i = 1; i < arguments.size(); ++i) {
    if (arguments[i - 1] == "-define" && StartsWith(arguments[i], kScratchDefine)) {
      return arguments[i].substr(sizeof kScratchDefine - 1);
    }
  }
  return std::nullopt;
}

std::optional<ConversionPlan> ParseConversion(const std::vector<std::string>& arguments) {
  Arguments rest(arguments);
  if (!SkipScratchDirectory(rest)) {
    return std::nullopt;
  }
  const std::string* const source = rest.Take();
  if (source == nullptr || source->empty()) {
    return std::nullopt;
  }
  ConversionPlan plan;
  plan.source = SourceFile(*source);
  plan.firstPageOnly = plan.source.size() < source->size();
  if (!TakeOutputs(rest, plan.outputs)) {
    return std::nullopt;
  }
  return plan;
}

std::optional<TurnPlan> ParseTurn(const std::vector<std::string>& arguments) {
  if (arguments.size() != 4 || arguments[0] != "-rotate" || arguments[2] != arguments[3]) {
    return std::nullopt;
  }
  const int quarterTurns = ParseQuarterTurns(arguments[1]).value_or(0);
  if (quarterTurns == 0) {
    return std::nullopt;
  }
  return TurnPlan{arguments[2], quarterTurns};
}

}  // namespace vela
