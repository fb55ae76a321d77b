// Compares the converter with ImageMagick (same arguments), with vipsthumbnail (largest output
// only) and with a floor: only a scaled decode and the encodes, by djpeg and cjpeg.
//
// usage: convert_thumb_bench CONVERT-THUMB DIRECTORY
//
// Creates its photos in the directory and keeps them.

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "converter_commands.h"
#include "converter_photos.h"
#include "one_processor.h"
#include "timed_run.h"

namespace vela_bench {

namespace {

struct Paths {
  std::string converter;
  std::string directory;
};

/// The cost of the six outputs of one photo.
struct Comparison {
  Cost converter;
  Cost imageMagick;
  Cost vips;
  std::optional<Cost> floor;
};

/// Runs the commands of a subject one after another.
Cost RunAll(const std::vector<Command>& commands) {
  Cost sum;
  for (const Command& command : commands) {
    const Cost cost = TimedRun(command);
    sum.wallSeconds += cost.wallSeconds;
    sum.cpuSeconds += cost.cpuSeconds;
    sum.peakMebibytes = std::max(sum.peakMebibytes, cost.peakMebibytes);
  }
  return sum;
}

std::function<Cost()> Subject(std::vector<Command> commands) {
  return [commands = std::move(commands)] { return RunAll(commands); };
}

Comparison Compare(const BenchPhoto& photo, const Paths& paths) {
  constexpr int kRounds = 4;
  const std::string path = MakePhoto(photo, paths.directory);
  const Command ours = SixOutputs(paths.converter, path, paths.directory);
  std::vector<std::function<Cost()>> subjects = {
      Subject({ours}), Subject({SixOutputs(kImageMagick, path, paths.directory)}),
      Subject({LargestByVips(path, paths.directory)})};
  if (IsJpeg(photo)) {
    TimedRun(ours);  // the floor uses its outputs
    subjects.push_back(Subject(DecodeAndEncodes(path, photo.width, paths.directory)));
  }
  const std::vector<Cost> best = LeastOf(kRounds, subjects);
  Comparison comparison{best[0], best[1], best[2], std::nullopt};
  if (IsJpeg(photo)) {
    comparison.floor = best[3];
  }
  return comparison;
}

void PrintHeading(const char* text) {
  std::printf("\n%s\n%-30s %10s %6s %10s %6s %10s\n", text, "", "wall", "times", "CPU", "times",
              "peak");
}

/// "times" is ImageMagick's cost divided by this one.
void PrintCost(const char* name, const Cost& cost, const Cost& imageMagick) {
  std::printf("  %-28s %7.1f ms %6.2f %7.1f ms %6.2f %6.1f MiB\n", name, cost.wallSeconds * 1e3,
              imageMagick.wallSeconds / cost.wallSeconds, cost.cpuSeconds * 1e3,
              imageMagick.cpuSeconds / cost.cpuSeconds, cost.peakMebibytes);
}

void Print(const BenchPhoto& photo, const Comparison& comparison) {
  std::printf("%s\n", photo.description);
  PrintCost("converter", comparison.converter, comparison.imageMagick);
  PrintCost("ImageMagick", comparison.imageMagick, comparison.imageMagick);
  PrintCost("vipsthumbnail, largest alone", comparison.vips, comparison.imageMagick);
  if (comparison.floor) {
    PrintCost("floor", *comparison.floor, comparison.imageMagick);
  }
  std::printf("  %-28s %.3f of the wall time", "converter to vipsthumbnail",
              comparison.converter.wallSeconds / comparison.vips.wallSeconds);
  if (comparison.floor) {
    std::printf(", to the floor %.3f of the CPU time",
                comparison.converter.cpuSeconds / comparison.floor->cpuSeconds);
  }
  std::printf("\n");
}

void MeasureAll(const std::vector<BenchPhoto>& photos, const Paths& paths) {
  for (const BenchPhoto& photo : photos) {
    Print(photo, Compare(photo, paths));
  }
}

/// One small output of a tiny photo, compared with a program that does nothing.
void MeasureStart(const char* extension, const Paths& paths) {
  constexpr int kRuns = 100;
  const std::string photo = MakePhoto({"tiny", 16, 16, extension, false}, paths.directory);
  const Command command = SmallestOutput(paths.converter, photo, paths.directory);
  const CostPair cost = FastestOf(
      kRuns, [&] { return TimedRun(command); }, [] { return TimedRun({"/bin/true"}); });
  std::printf("  tiny %-23s %7.2f ms, /bin/true %.2f ms\n", extension,
              cost.subject.wallSeconds * 1e3, cost.floor.wallSeconds * 1e3);
}

void Measure(const Paths& paths) {
  PrintHeading(("six outputs, " + std::to_string(UsableProcessors()) + " processors").c_str());
  MeasureAll(BaselinePhotos(), paths);
  MeasureAll(OtherPhotos(), paths);
  {
    const OneProcessor here;
    PrintHeading("six outputs, one processor");
    MeasureAll(BaselinePhotos(), paths);
  }
  std::printf("\nstart to end\n");
  MeasureStart("jpg", paths);
  MeasureStart("png", paths);
}

}  // namespace

}  // namespace vela_bench

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: convert_thumb_bench CONVERT-THUMB DIRECTORY\n");
    return 2;
  }
  std::setvbuf(stdout, nullptr, _IOLBF, 0);
  vela_bench::Measure({argv[1], argv[2]});
  return EXIT_SUCCESS;
}
