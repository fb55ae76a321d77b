// The converter's pictures compared with ImageMagick's: inputs of every kind, with all the sets of
// arguments that velathumb passes. The results are stored for the table in docs/.

#include <gtest/gtest.h>

#include <algorithm>
#include <optional>

#include "converter_fixture.h"
#include "likeness/exceptions.h"
#include "likeness/output.h"
#include "likeness/result.h"
#include "likeness/source.h"
#include "likeness/vectors.h"
#include "support/files.h"
#include "support/image_checks.h"

namespace vela_test {
namespace {

constexpr double kLeastDecibels = 36;

/// Both programs' runs of one line.
struct Runs {
  int ourExit = 0;
  int theirExit = 0;
  std::string ourDirectory;
  std::string theirDirectory;
  std::string messages;
};

std::string SizeText(int width, int height) {
  return std::to_string(width) + "x" + std::to_string(height);
}

std::string SizeOf(const std::optional<OutputPicture>& picture) {
  return picture ? SizeText(picture->width, picture->height) : "";
}

class Likeness : public ConverterTest, public ::testing::WithParamInterface<LikenessSource> {
 protected:
  void TearDown() override { KeepResults(TestNameOf(GetParam()), results_); }

  Runs RunBoth(const std::string& path, const std::string& vector) const {
    Runs runs;
    runs.ourDirectory = directory_ + "/ours_" + vector;
    runs.theirDirectory = directory_ + "/theirs_" + vector;
    const CommandLine line = LineWithOutputsIn(runs.ourDirectory, path, vector);
    const ProgramResult ours = RunProgram(ConvertThumbPath(), line.Arguments());
    const ProgramResult theirs = RunReference(LineWithOutputsIn(runs.theirDirectory, path, vector),
                                              line.outputs.back().path);
    runs.ourExit = ours.exitCode;
    runs.theirExit = theirs.exitCode;
    runs.messages = "ours: " + ours.err + "\ntheirs: " + theirs.err;
    return runs;
  }

  /// A picture that is listed as another one has to be one in some run.
  void ExpectOtherPictures() const {
    ASSERT_EQ(leastOfOtherPictures_.has_value(), isListedAsOtherPicture_);
    EXPECT_LT(leastOfOtherPictures_.value_or(0), kLeastDecibels);
  }

  void Compare(const Runs& runs, const std::string& vector) {
    const KnownDifference known =
        KnownDifferenceOf(GetParam().format, GetParam().description, vector);
    isListedAsOtherPicture_ |= known.kind == LikenessException::kOtherPicture;
    LikenessResult result;
    result.format = GetParam().format;
    result.description = GetParam().description;
    result.vector = vector;
    result.ourExit = runs.ourExit;
    result.theirExit = runs.theirExit;
    result.remark = known.why;
    if (runs.ourExit == 0 && runs.theirExit == 0) {
      CompareOutputs(runs, known, result);
    } else {
      result.ourSize = ExpectPicturesWithoutOthers(runs);
      results_.push_back(result);
    }
    ExpectVerdict(runs, known);
  }

 private:
  CommandLine LineWithOutputsIn(const std::string& outputDirectory, const std::string& path,
                                const std::string& vector) const {
    MakeDirectories(outputDirectory);
    const bool firstPage = GetParam().firstPage;
    CommandLine line =
        Line(path + (firstPage ? "[0]" : ""), OutputsOf(vector, GetParam().isLarge), "");
    for (size_t i = 0; i < line.outputs.size(); ++i) {
      line.outputs[i].path = outputDirectory + "/" + std::to_string(i) + ".jpg";
    }
    return line;
  }

  static void ExpectVerdict(const Runs& runs, const KnownDifference& known) {
    const bool oursFails = runs.ourExit != 0;
    const bool theirsFails = runs.theirExit != 0;
    // A difference that no longer exists has to be removed from the list.
    EXPECT_EQ(!oursFails && theirsFails, known.kind == LikenessException::kSucceeds)
        << runs.messages;
    EXPECT_EQ(oursFails && !theirsFails, known.kind == LikenessException::kFails) << runs.messages;
  }

  /// Where only our run succeeds, expects complete pictures. Returns the size of the largest one.
  static std::string ExpectPicturesWithoutOthers(const Runs& runs) {
    if (runs.ourExit != 0) {
      return "";
    }
    const std::vector<std::string> names = ListDirectory(runs.ourDirectory);
    EXPECT_FALSE(names.empty());
    for (const std::string& name : names) {
      EXPECT_TRUE(IsWholeJpeg(runs.ourDirectory + "/" + name)) << name;
    }
    return SizeOf(ReadOutputPicture(runs.ourDirectory + "/0.jpg"));
  }

  void CompareOutputs(const Runs& runs, const KnownDifference& known, LikenessResult result) {
    const std::vector<std::string> names = ListDirectory(runs.theirDirectory);
    EXPECT_EQ(ListDirectory(runs.ourDirectory), names);
    for (const std::string& name : names) {
      result.output = name;
      CompareFiles(runs.ourDirectory + "/" + name, runs.theirDirectory + "/" + name, known, result);
    }
  }

  void CompareFiles(const std::string& ourFile, const std::string& theirFile,
                    const KnownDifference& known, LikenessResult result) {
    const std::optional<OutputPicture> ours = ReadOutputPicture(ourFile);
    const std::optional<OutputPicture> theirs = ReadOutputPicture(theirFile);
    result.ourSize = SizeOf(ours);
    result.theirSize = SizeOf(theirs);
    ExpectSize(ourFile, ours, theirs, known);
    if (HasLikeness(result)) {
      result.differences = Differences(*ours, *theirs);
      result.decibels = ours->components == theirs->components ? Decibels(*ours, *theirs) : 0;
      ExpectLikeness(ourFile, known, result);
    }
    results_.push_back(result);
  }

  void ExpectLikeness(const std::string& file, const KnownDifference& known,
                      const LikenessResult& result) {
    if (known.kind == LikenessException::kOtherPicture) {
      leastOfOtherPictures_ =
          std::min(leastOfOtherPictures_.value_or(result.decibels), result.decibels);
      ASSERT_GT(known.leastDecibels, 0) << "the entry says nothing about the pictures";
      EXPECT_GE(result.decibels, known.leastDecibels) << file << " " << result.ourSize;
    } else {
      EXPECT_GE(result.decibels, kLeastDecibels) << file << " " << result.ourSize;
    }
    EXPECT_EQ(!result.differences.empty(), known.kind == LikenessException::kSurroundings)
        << file << " " << result.differences;
  }

  static void ExpectSize(const std::string& file, const std::optional<OutputPicture>& ours,
                         const std::optional<OutputPicture>& theirs, const KnownDifference& known) {
    ASSERT_TRUE(ours && theirs) << file;
    const bool isTurned = known.kind == LikenessException::kUpright;
    EXPECT_EQ(SizeOf(ours), isTurned ? SizeText(theirs->height, theirs->width) : SizeOf(theirs))
        << file;
  }

  std::vector<LikenessResult> results_;
  bool isListedAsOtherPicture_ = false;
  std::optional<double> leastOfOtherPictures_;
};

TEST_P(Likeness, IsImageMagicks) {
  const LikenessSource& source = GetParam();
  const std::string path = directory_ + "/source." + source.extension;
  source.make(path);
  for (const std::string& vector : source.vectors) {
    SCOPED_TRACE(vector);
    Compare(RunBoth(path, vector), vector);
  }
  ExpectOtherPictures();
}

std::string NameOf(const ::testing::TestParamInfo<LikenessSource>& info) {
  return TestNameOf(info.param);
}

INSTANTIATE_TEST_SUITE_P(Jpeg, Likeness, ::testing::ValuesIn(JpegSources()), NameOf);
INSTANTIATE_TEST_SUITE_P(Png, Likeness, ::testing::ValuesIn(PngSources()), NameOf);
INSTANTIATE_TEST_SUITE_P(Tiff, Likeness, ::testing::ValuesIn(TiffSources()), NameOf);
INSTANTIATE_TEST_SUITE_P(Animation, Likeness, ::testing::ValuesIn(AnimationSources()), NameOf);
INSTANTIATE_TEST_SUITE_P(Other, Likeness, ::testing::ValuesIn(OtherSources()), NameOf);
INSTANTIATE_TEST_SUITE_P(Damaged, Likeness, ::testing::ValuesIn(DamagedSources()), NameOf);
INSTANTIATE_TEST_SUITE_P(Camera, Likeness, ::testing::ValuesIn(CameraFileSources()), NameOf);

// The folder with camera files need not exist.
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(Likeness);

}  // namespace
}  // namespace vela_test
