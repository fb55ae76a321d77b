#include "command_line/command_line.h"

#include <algorithm>
#include <cstdlib>
#include <optional>
#include <utility>

#include "command_line/file_name.h"
#include "command_line/option_values.h"
#include "configuration/profile_values.h"

namespace vela {

namespace {

constexpr char kScratchDefine[] = "registry:temporary-path=";
constexpr char kSizeHintDefine[] = "jpeg:size=";
constexpr char kFirstPage[] = "[0]";

/// Environment variables that set the directory for temporary files, by descending priority.
constexpr const char* kScratchVariables[] = {"MAGICK_TEMPORARY_PATH", "MAGICK_TMPDIR", "TMPDIR"};
constexpr char kDefaultScratchDirectory[] = "/tmp";

bool StartsWith(const std::string& text, const std::string& beginning) {
  return text.compare(0, beginning.size(), beginning) == 0;
}

/// The arguments that have not been parsed yet.
class Arguments {
 public:
  explicit Arguments(const std::vector<std::string>& arguments) : arguments_(arguments) {}

  bool AtEnd() const { return next_ == arguments_.size(); }
  bool IsLast() const { return next_ + 1 == arguments_.size(); }
  const std::string* Peek() const { return AtEnd() ? nullptr : &arguments_[next_]; }
  const std::string* Take() { return AtEnd() ? nullptr : &arguments_[next_++]; }

  /// Takes the next argument if it is `text`.
  bool TakeText(const char* text) {
    const bool matches = !AtEnd() && arguments_[next_] == text;
    next_ += matches ? 1 : 0;
    return matches;
  }

  /// Remembers an option that ends the parsing. Returns false.
  bool Refuse(const std::string& option, const std::string& value) {
    refused_ = option + " " + value;
    return false;
  }
  const std::string& RefusedOption() const { return refused_; }

 private:
  const std::vector<std::string>& arguments_;
  size_t next_ = 0;
  std::string refused_;
};

/// Collects the options of one output.
class OutputOptions {
 public:
  /// Takes one option with its value. Returns false when it is not supported.
  bool Take(Arguments& arguments) {
    const std::string& option = *arguments.Take();
    if (option == "-flatten") {
      return AddStep(Step::Kind::kFlatten);
    }
    if (option == "-auto-orient") {
      return AddStep(Step::Kind::kAutoOrient);
    }
    const std::string* const value = arguments.Take();
    return value != nullptr && (TakeValue(option, *value) || arguments.Refuse(option, *value));
  }

  /// Returns the output; empty when a required option is missing.
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
      // The size to decode at is derived from the thumbnail instead.
      return StartsWith(value, kSizeHintDefine);
    }
    if (option == "-thumbnail") {
      return TakeBox(value);
    }
    if (option == "-quality") {
      plan_.quality = ParseWholeNumber(value, kMinQuality, kMaxQuality).value_or(0);
      return plan_.quality != 0;
    }
    if (option == "+profile") {
      // -thumbnail has already removed these profiles.
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
    return option == "-colorspace" && EqualsIgnoringCase(value, "sRGB") &&
           AddStep(Step::Kind::kConvertToSrgb);
  }

  bool AddStep(Step::Kind kind) {
    Step step;
    step.kind = kind;
    return AddStep(step);
  }

  /// A step before the scaling would need the whole photo, which is never kept in memory.
  bool AddStep(const Step& step) {
    if (plan_.box.width == 0) {
      return false;
    }
    plan_.steps.push_back(step);
    return true;
  }

  OutputPlan plan_;
};

/// Takes the options up to "-write" and the path after it.
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

/// Nothing is stored in the scratch directory: all data is kept in memory.
bool SkipScratchDirectory(Arguments& arguments) {
  if (!arguments.TakeText("-define")) {
    return true;
  }
  const std::string* const value = arguments.Take();
  return value != nullptr && StartsWith(*value, kScratchDefine);
}

/// Empty unless every argument is supported.
std::optional<ConversionPlan> ParseConversion(Arguments& rest) {
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

/// A file is turned in place when it is named both as source and as output.
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

size_t FindSource(const std::vector<std::string>& arguments) {
  size_t index = 0;
  while (index + 1 < arguments.size() &&
         (arguments[index] == "-define" || arguments[index] == "-rotate")) {
    index += 2;
  }
  return std::min(index, arguments.size());
}

std::vector<size_t> FindOutputs(const std::vector<std::string>& arguments) {
  std::vector<size_t> indices;
  for (size_t i = 1; i + 1 < arguments.size(); ++i) {
    if (arguments[i - 1] == "-write") {
      indices.push_back(i);
    }
  }
  if (!arguments.empty()) {
    indices.push_back(arguments.size() - 1);
  }
  return indices;
}

/// The same directory that ImageMagick chooses.
std::string FindScratchDirectory(const std::vector<std::string>& arguments) {
  for (size_t i = 1; i < arguments.size(); ++i) {
    if (arguments[i - 1] == "-define" && StartsWith(arguments[i], kScratchDefine)) {
      return arguments[i].substr(sizeof kScratchDefine - 1);
    }
  }
  for (const char* const variable : kScratchVariables) {
    const char* const directory = std::getenv(variable);
    if (directory != nullptr) {
      return directory;
    }
  }
  return kDefaultScratchDirectory;
}

}  // namespace

bool IsDiscarded(const CommandLine& line) {
  return !line.outputIndices.empty() &&
         std::all_of(line.outputIndices.begin(), line.outputIndices.end(),
                     [&](size_t index) { return line.arguments[index] == kDiscardedOutput; });
}

std::string SourceFile(const std::string& argument) {
  const size_t suffix = sizeof kFirstPage - 1;
  if (argument.size() > suffix &&
      argument.compare(argument.size() - suffix, suffix, kFirstPage) == 0) {
    return argument.substr(0, argument.size() - suffix);
  }
  return argument;
}

CommandLine ParseCommandLine(std::vector<std::string> arguments) {
  CommandLine line;
  Arguments rest(arguments);
  if (std::optional<TurnPlan> turn = ParseTurn(arguments)) {
    line.task = std::move(*turn);
  } else if (std::optional<ConversionPlan> conversion = ParseConversion(rest)) {
    line.task = std::move(*conversion);
  } else {
    line.unsupportedOption = rest.RefusedOption();
  }
  line.sourceIndex = FindSource(arguments);
  if (line.sourceIndex < arguments.size()) {
    line.sourceFile = SourceFile(arguments[line.sourceIndex]);
  }
  line.outputIndices = FindOutputs(arguments);
  line.scratchDirectory = FindScratchDirectory(arguments);
  line.arguments = std::move(arguments);
  return line;
}

}  // namespace vela
