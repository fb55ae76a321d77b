// What the converter costs beside ImageMagick with the same arguments, and beside the floor: a
// scaled decode and the encodes alone, as djpeg and cjpeg do them.
//
// usage: convert_thumb_bench CONVERT-THUMB DIRECTORY
//
// Makes photos of 3 to 48 megapixels in the directory and leaves them there. Times are those of the
// fastest of several runs, the programs in turn.

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using Command = std::vector<std::string>;

constexpr char kImageMagick[] = "/usr/bin/convert-im6.q16";
constexpr char kDecoder[] = "/usr/bin/djpeg";
constexpr char kEncoder[] = "/usr/bin/cjpeg";
constexpr int kRounds = 5;

struct Cost {
  double wallSeconds = 0;
  double cpuSeconds = 0;
  double peakMebibytes = 0;
};

struct Size {
  int width;
  int height;
};

struct Output {
  const char* name;
  int side;
  const char* quality;
  const char* unsharp;
};

constexpr Size kSizes[] = {{2048, 1536}, {3264, 2448}, {4000, 3000}, {6000, 4000}, {8000, 6000}};
constexpr Output kOutputs[] = {
    {"1280", 1280, "90", "0x0.8+0.5+0.01"}, {"800", 800, "85", "0x0.6+0.7+0.01"},
    {"640", 640, "85", "0x0.5+0.7+0.01"},   {"320", 320, "88", "0x0.7+0.5+0.01"},
    {"160", 160, "85", "0x0.5+0.7+0.01"},   {"120", 120, "85", "0x0.5+0.7+0.01"}};

[[noreturn]] void Fail(const std::string& message) {
  std::fprintf(stderr, "convert_thumb_bench: %s\n", message.c_str());
  std::exit(EXIT_FAILURE);
}

double Seconds(const timeval& time) {
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

[[noreturn]] void RunInChild(const Command& command) {
  std::vector<char*> arguments;
  for (const std::string& argument : command) {
    arguments.push_back(const_cast<char*>(argument.c_str()));
  }
  arguments.push_back(nullptr);
  dup2(open("/dev/null", O_WRONLY | O_CLOEXEC), STDOUT_FILENO);
  execv(arguments[0], arguments.data());
  _exit(127);
}

Cost Run(const Command& command) {
  const auto start = std::chrono::steady_clock::now();
  const pid_t child = fork();
  if (child < 0) {
    Fail("cannot start a process");
  }
  if (child == 0) {
    RunInChild(command);
  }
  int status = 0;
  rusage usage = {};
  if (wait4(child, &status, 0, &usage) != child || !WIFEXITED(status) || WEXITSTATUS(status) != 0) {
    Fail(command.front() + " failed");
  }
  const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - start;
  return {wall.count(), Seconds(usage.ru_utime) + Seconds(usage.ru_stime),
          static_cast<double>(usage.ru_maxrss) / 1024};
}

/// The commands of a subject one after another.
Cost RunAll(const std::vector<Command>& commands) {
  Cost sum;
  for (const Command& command : commands) {
    const Cost cost = Run(command);
    sum.wallSeconds += cost.wallSeconds;
    sum.cpuSeconds += cost.cpuSeconds;
    sum.peakMebibytes = std::max(sum.peakMebibytes, cost.peakMebibytes);
  }
  return sum;
}

void TakeLess(Cost& best, const Cost& cost) {
  best.wallSeconds = std::min(best.wallSeconds, cost.wallSeconds);
  best.cpuSeconds = std::min(best.cpuSeconds, cost.cpuSeconds);
  best.peakMebibytes = std::max(best.peakMebibytes, cost.peakMebibytes);
}

Command Options(const Output& output) {
  const std::string box = std::to_string(output.side) + "x" + std::to_string(output.side);
  return {"-define",      "jpeg:size=" + box, "-thumbnail",  box + ">",  "-quality",
          output.quality, "+profile",         "!icc,*",      "-flatten", "-auto-orient",
          "-unsharp",     output.unsharp,     "-colorspace", "sRGB"};
}

void Append(Command& command, const Command& more) {
  command.insert(command.end(), more.begin(), more.end());
}

std::string OutputPath(const std::string& directory, const Output& output) {
  return directory + "/" + output.name + ".jpg";
}

Command Conversion(const std::string& program, const std::string& photo,
                   const std::string& directory) {
  Command command = {program, "-define", "registry:temporary-path=" + directory, photo};
  const size_t last = std::size(kOutputs) - 1;
  for (size_t i = 0; i < last; ++i) {
    Append(command, i == 0 ? Command{"(", "-clone", "0"} : Command{"(", "+clone"});
    Append(command, Options(kOutputs[i]));
    Append(command, {"-write", OutputPath(directory, kOutputs[i])});
    Append(command, i == 0 ? Command{")", "-delete", "0"} : Command{"+delete", ")"});
  }
  Append(command, Options(kOutputs[last]));
  command.push_back(OutputPath(directory, kOutputs[last]));
  return command;
}

/// The smallest size in eighths that is half as large again as the largest output.
std::string FloorScale(const Size& size) {
  int eighths = 1;
  while (eighths < 8 && size.width * eighths / 8 * 2 < kOutputs[0].side * 3) {
    ++eighths;
  }
  return std::to_string(eighths) + "/8";
}

/// Needs the outputs of a conversion to be there.
std::vector<Command> Floor(const Size& size, const std::string& photo,
                           const std::string& directory) {
  std::vector<Command> commands = {
      {kDecoder, "-scale", FloorScale(size), "-outfile", "/dev/null", photo}};
  for (const Output& output : kOutputs) {
    const std::string pixels = directory + "/" + output.name + ".ppm";
    Run({kDecoder, "-outfile", pixels, OutputPath(directory, output)});
    commands.push_back({kEncoder, "-optimize", "-dct", "fast", "-quality", output.quality,
                        "-outfile", "/dev/null", pixels});
  }
  return commands;
}

std::string MakePhoto(const Size& size, const std::string& directory) {
  const std::string pixels = std::to_string(size.width) + "x" + std::to_string(size.height);
  const std::string photo = directory + "/" + pixels + ".jpg";
  if (access(photo.c_str(), R_OK) != 0) {
    Run({kImageMagick, "-seed", "1", "-size", pixels, "plasma:sienna-steelblue", "-attenuate",
         "0.2", "+noise", "Gaussian", "-sampling-factor", "2x2", "-quality", "92", photo});
  }
  return photo;
}

void Print(const char* name, const Cost& cost, const Cost& reference) {
  std::printf("  %-12s %7.1f ms  %5.3f   %7.1f ms  %5.3f   %6.1f MiB\n", name,
              cost.wallSeconds * 1000, cost.wallSeconds / reference.wallSeconds,
              cost.cpuSeconds * 1000, cost.cpuSeconds / reference.cpuSeconds, cost.peakMebibytes);
}

void Measure(const Size& size, const std::string& program, const std::string& directory) {
  const std::string photo = MakePhoto(size, directory);
  const Command ours = Conversion(program, photo, directory);
  const Command theirs = Conversion(kImageMagick, photo, directory);
  Cost subject = Run(ours);
  Cost reference = Run(theirs);
  const std::vector<Command> floorCommands = Floor(size, photo, directory);
  Cost floor = RunAll(floorCommands);
  for (int round = 1; round < kRounds; ++round) {
    TakeLess(subject, Run(ours));
    TakeLess(reference, Run(theirs));
    TakeLess(floor, RunAll(floorCommands));
  }
  std::printf("%d x %d (%.0f megapixels)\n", size.width, size.height,
              static_cast<double>(size.width) * size.height / 1e6);
  Print("converter", subject, reference);
  Print("floor", floor, reference);
  Print("ImageMagick", reference, reference);
  std::fflush(stdout);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) {
    Fail("usage: convert_thumb_bench CONVERT-THUMB DIRECTORY");
  }
  std::printf("%-14s %10s  %5s   %10s  %5s   %10s\n", "", "wall", "ratio", "CPU", "ratio", "peak");
  for (const Size& size : kSizes) {
    Measure(size, argv[1], argv[2]);
  }
  return EXIT_SUCCESS;
}
