// Faults in a run. Whatever happens, the photos stay as they are, no thumbnail is half written, and
// the next runs leave the same files as if nothing had happened.
#include <algorithm>
#include <cstring>

#include "hostile/fault_trials.h"
#include "support/named_case.h"

namespace vela_test::hostile {

namespace {

struct Row : NamedCase {
  FaultRange range;
  bool firstPhasesDone;  ///< whether an undisturbed run comes before
};

const Row kRows[] = {
    {{"ErrorsOfTheProgram"}, {CallScope::kProgram, FaultKind::kErrors, 60}, false},
    {{"ErrorsOfTheProgramInPhase2"}, {CallScope::kProgram, FaultKind::kErrors, 20}, true},
    {{"ErrorsOfTools"}, {CallScope::kTools, FaultKind::kErrors, 40}, false},
    {{"ErrorsOfToolsInPhase2"}, {CallScope::kTools, FaultKind::kErrors, 10}, true},
    {{"KillsOfTheProgram"}, {CallScope::kProgram, FaultKind::kKills, 50}, false},
    {{"KillsOfTheProgramInPhase2"}, {CallScope::kProgram, FaultKind::kKills, 15}, true},
    {{"KillsOfTools"}, {CallScope::kTools, FaultKind::kKills, 25}, false},
    {{"KillsOfToolsInPhase2"}, {CallScope::kTools, FaultKind::kKills, 10}, true},
};

/// How much of the result a fault may still determine.
enum class Effect {
  kNone,
  kMode,    ///< a thumbnail whose mode could not be set is used as it is
  kPicture  ///< a decoder makes what it can of a photo that it cannot read completely
};

}  // namespace

class Faults : public FaultTrials, public ::testing::WithParamInterface<Row> {
 protected:
  void SetUp() override {
    HostileTest::SetUp();
    MakeJpeg(jpeg_, RecipeOf(160, 120));
    MakeRawPhoto(raw_, RawRecipeOf());
    photos_ = PhotosBelow(kPhotos);
    Make();
    Make();
    undisturbed_ = RecordTree(kPhotos, RecordDetail::kNone);
    pictures_ = Pictures();
  }

  std::string Path() const override { return VelathumbPath(); }
  Strings Arguments() const override { return ArgumentsFor({kPhotos}); }

  void Begin() override {
    for (const std::string& path :
         {InPhotos("@eaDir"), std::string(kQueue), std::string(kPhotoProgress)}) {
      RemoveTree(path);
    }
    if (GetParam().firstPhasesDone) {
      Make();
    }
  }

  void Check(const CallFault& fault) override {
    const Effect effect = EffectOf(fault);
    ExpectOnlyFinishedThumbs(effect);
    EXPECT_TRUE(PhotosBelow(kPhotos) == photos_) << "the run touched a photo";
    Make();
    Make();
    for (const std::string& photo : {jpeg_, raw_}) {
      EXPECT_TRUE(HasThumbs(photo, kinds_));
    }
    if (effect != Effect::kPicture) {
      EXPECT_EQ(Pictures(), pictures_);
    }
    if (effect == Effect::kMode) {
      EXPECT_EQ(ListTree(kPhotos), TreeOf(undisturbed_));
    } else {
      EXPECT_THAT(Differences(undisturbed_, RecordTree(kPhotos, RecordDetail::kNone)), IsEmpty());
    }
    EXPECT_THAT(PidFiles(), IsEmpty());
  }

 private:
  Effect EffectOf(const CallFault& fault) const {
    const bool setsMode = std::strstr(fault.made.call->name, "chmod") != nullptr;
    if (setsMode && !fault.kill) {
      return Effect::kMode;
    }
    const bool isDecoder = GetParam().range.scope == CallScope::kTools && fault.made.object == raw_;
    return isDecoder ? Effect::kPicture : Effect::kNone;
  }

  /// The thumbnails that exist are complete in every respect.
  void ExpectOnlyFinishedThumbs(Effect effect) const {
    for (const std::string& photo : {jpeg_, raw_}) {
      for (const Kind& kind : kinds_) {
        const std::string thumb = ThumbOf(photo, kind);
        std::string why;
        EXPECT_TRUE(!Exists(thumb) || DecodeJpeg(thumb, &why)) << thumb << ": " << why;
        EXPECT_TRUE(!Exists(thumb) || effect == Effect::kMode || ModeOf(thumb) == 0777)
            << thumb << " has mode " << std::oct << ModeOf(thumb);
      }
    }
  }

  /// Size and picture of each thumbnail. The bytes may differ: a thumbnail that is made again alone
  /// is scaled in other steps than one that is made together with others.
  std::map<std::string, std::string> Pictures() const {
    std::map<std::string, std::string> pictures;
    for (const std::string& photo : {jpeg_, raw_}) {
      for (const Kind& kind : kinds_) {
        const std::string thumb = ThumbOf(photo, kind);
        const auto image = DecodeJpeg(thumb);
        pictures[thumb] = image ? std::to_string(image->Width()) + "x" +
                                      std::to_string(image->Height()) + " " + QuadrantLetters(thumb)
                                : "none";
      }
    }
    return pictures;
  }

  /// The paths of a record as ListTree gives them.
  static Strings TreeOf(const TreeRecord& record) {
    Strings paths;
    for (const auto& [path, description] : record) {
      if (!path.empty()) {
        paths.push_back(description.front() == '4' ? path + "/" : path);
      }
    }
    std::sort(paths.begin(), paths.end());
    return paths;
  }

  const std::string jpeg_ = InPhotos("a.jpg");
  const std::string raw_ = InPhotos("b.dng");
  std::map<std::string, PhotoState> photos_;
  TreeRecord undisturbed_;
  std::map<std::string, std::string> pictures_;
};

TEST_P(Faults, LeaveNothingBehind) {
  TryFaults(GetParam().range);
}

INSTANTIATE_TEST_SUITE_P(All, Faults, ::testing::ValuesIn(kRows), CaseName());

}  // namespace vela_test::hostile
