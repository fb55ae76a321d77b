#include "converter_commands.h"

#include <iterator>

#include "timed_run.h"

namespace vela_bench {

namespace {

constexpr char kDecoder[] = "/usr/bin/djpeg";
constexpr char kEncoder[] = "/usr/bin/cjpeg";
constexpr char kVips[] = "/usr/bin/vipsthumbnail";

struct Output {
  int side;
  const char* quality;
  const char* unsharp;
};

constexpr Output kOutputs[] = {{1280, "90", "0x0.8+0.5+0.01"}, {800, "85", "0x0.6+0.7+0.01"},
                               {640, "85", "0x0.5+0.7+0.01"},  {320, "88", "0x0.7+0.5+0.01"},
                               {160, "85", "0x0.5+0.7+0.01"},  {120, "85", "0x0.5+0.7+0.01"}};
constexpr size_t kLast = std::size(kOutputs) - 1;

void Append(Command& command, const Command& more) {
  command.insert(command.end(), more.begin(), more.end());
}

std::string BoxOf(const Output& output) {
  return std::to_string(output.side) + "x" + std::to_string(output.side);
}

std::string PathOf(const Output& output, const std::string& directory) {
  return directory + "/" + std::to_string(output.side) + ".jpg";
}

Command OptionsOf(const Output& output) {
  const std::string box = BoxOf(output);
  return {"-define",      "jpeg:size=" + box, "-thumbnail",  box + ">",  "-quality",
          output.quality, "+profile",         "!icc,*",      "-flatten", "-auto-orient",
          "-unsharp",     output.unsharp,     "-colorspace", "sRGB"};
}

void AppendLast(Command& command, const std::string& directory) {
  Append(command, OptionsOf(kOutputs[kLast]));
  command.push_back(PathOf(kOutputs[kLast], directory));
}

/// Returns the smallest number of eighths at which the photo is at least one and a half times as
/// large as the first output.
std::string ScaleFor(int width) {
  int eighths = 1;
  while (eighths < 8 && width * eighths / 8 * 2 < kOutputs[0].side * 3) {
    ++eighths;
  }
  return std::to_string(eighths) + "/8";
}

}  // namespace

Command SixOutputs(const std::string& program, const std::string& photo,
                   const std::string& directory) {
  Command command = {program, "-define", "registry:temporary-path=" + directory, photo};
  for (size_t i = 0; i < kLast; ++i) {
    Append(command, i == 0 ? Command{"(", "-clone", "0"} : Command{"(", "+clone"});
    Append(command, OptionsOf(kOutputs[i]));
    Append(command, {"-write", PathOf(kOutputs[i], directory)});
    Append(command, i == 0 ? Command{")", "-delete", "0"} : Command{"+delete", ")"});
  }
  AppendLast(command, directory);
  return command;
}

Command SmallestOutput(const std::string& program, const std::string& photo,
                       const std::string& directory) {
  Command command = {program, "-define", "registry:temporary-path=" + directory, photo};
  AppendLast(command, directory);
  return command;
}

Command LargestByVips(const std::string& photo, const std::string& directory) {
  const Output& output = kOutputs[0];
  return {kVips,    photo,
          "--size", BoxOf(output) + ">",
          "-o",     directory + "/vips.jpg[Q=" + output.quality + "]"};
}

std::vector<Command> DecodeAndEncodes(const std::string& photo, int width,
                                      const std::string& directory) {
  std::vector<Command> commands = {
      {kDecoder, "-scale", ScaleFor(width), "-outfile", "/dev/null", photo}};
  for (const Output& output : kOutputs) {
    const std::string pixels = directory + "/" + std::to_string(output.side) + ".ppm";
    TimedRun({kDecoder, "-outfile", pixels, PathOf(output, directory)});
    commands.push_back({kEncoder, "-optimize", "-dct", "fast", "-quality", output.quality,
                        "-outfile", "/dev/null", pixels});
  }
  return commands;
}

}  // namespace vela_bench
