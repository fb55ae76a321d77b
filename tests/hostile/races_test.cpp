// Attackers that wait for the moment between two steps of the program. Each test repeats its race
// often enough to win it, as the attacker sees each file of a metadata directory come and go.
#include <sys/inotify.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <functional>

#include "hostile/hostile_test.h"
#include "support/folder_watch.h"

namespace vela_test::hostile {

namespace {

/// A way to put something of the attacker's under a name, whether it exists or is free.
struct Trap {
  const char* description;
  std::function<bool(const std::string& path)> replace;
  std::function<bool(const std::string& path)> take;
};

const std::string kNewFile = std::string(kVictim) + "/new";

const std::vector<Trap>& Traps() {
  static const std::vector<Trap> rows = {
      {"link", [](const std::string& path) { return ReplaceByLink(kPrivateText, path); },
       [](const std::string& path) { return Link(kPrivateText, path); }},
      {"dangling link", [](const std::string& path) { return ReplaceByLink(kNewFile, path); },
       [](const std::string& path) { return Link(kNewFile, path); }},
      {"hard link", [](const std::string& path) { return ReplaceByHardLink(kSharedText, path); },
       [](const std::string& path) { return HardLink(kSharedText, path); }},
      {"named pipe", ReplaceByFifo, Fifo}};
  return rows;
}

class Races : public HostileTest {
 protected:
  static constexpr int kPhotosInARound = 4;

  void SetUp() override {
    HostileTest::SetUp();
    MakeDirectoryOf(kAttacker, InPhotos("d"));
  }

  /// Photos in the attacker's directory without thumbnails, their metadata directories made.
  /// Dated in the future, so that the program also sets the times of thumbnails.
  Strings FreshPhotos(int count, const std::function<void(const std::string&)>& make) {
    RemoveTree(InPhotos("d/@eaDir"));
    Strings folders;
    for (int i = 0; i < count; ++i) {
      const std::string photo = InPhotos("d/" + std::to_string(i) + ".jpg");
      RemoveTree(photo);
      make(photo);
      SetFileTimeFromNow(photo, 1000);
      GiveTo(kAttacker, photo.c_str());
      MakeMetadataDir(photo);
      folders.push_back(MetadataDirOf(photo));
    }
    return folders;
  }

  /// Repeats a race with each trap until one has done harm.
  void Repeat(int rounds, const std::function<void(const Trap&)>& round) {
    for (int i = 0; i < rounds; ++i) {
      for (const Trap& trap : Traps()) {
        SCOPED_TRACE("round " + std::to_string(i) + " with a " + trap.description);
        round(trap);
        ExpectVictimUnchanged();
        if (HasFailure()) {
          return;
        }
      }
    }
  }

  /// Repeats a race for the content of the private photo until some of it has been revealed.
  void RepeatForContent(int rounds, const std::function<void()>& round) {
    for (int i = 0; i < rounds && !HasFailure(); ++i) {
      SCOPED_TRACE("round " + std::to_string(i));
      round();
      ExpectNothingRevealed();
    }
  }
};

void MakeSmallPhoto(const std::string& path) {
  MakeJpeg(path, RecipeOf(160, 120));
}

/// The arguments of all converters that are running.
Strings ConverterArguments() {
  Strings arguments;
  for (const pid_t converter : ProcessesNamed("convert-thumb")) {
    std::ifstream line("/proc/" + std::to_string(converter) + "/cmdline");
    for (std::string argument; std::getline(line, argument, '\0');) {
      arguments.push_back(argument);
    }
  }
  return arguments;
}

}  // namespace

TEST_F(Races, FinishedOutputReplacedBeforeItIsRenamed) {
  if (!CanDistinguishOwners()) {
    return;
  }
  Repeat(Rounds(5), [this](const Trap& trap) {
    const FolderWatch watch(FreshPhotos(kPhotosInARound, MakeSmallPhoto), IN_CLOSE_WRITE);
    const UserProcess attacker(kAttacker, [&] {
      watch.Follow([&](const std::string& path, uint32_t) {
        if (IsTempOutput(path)) {
          trap.replace(path);
        }
      });
    });
    RunInTime({InPhotos("d")});
  });
}

// The name is free when it is chosen, and the file appears later.
TEST_F(Races, OutputNameTakenBeforeTheConverterOpensIt) {
  Repeat(Rounds(5), [this](const Trap& trap) {
    const FolderWatch watch(FreshPhotos(kPhotosInARound, MakeSmallPhoto),
                            IN_CREATE | IN_DELETE | IN_MOVED_TO);
    const UserProcess attacker(kAttacker, [&] {
      watch.Follow([&](const std::string& path, uint32_t event) {
        const bool isTrial = path.find("/VELAPHOTO.tmp.") != std::string::npos &&
                             path.find('.', path.rfind(".tmp.") + 5) == std::string::npos;
        if (isTrial && event != IN_MOVED_TO) {
          trap.replace(path + ".jpg");
        }
      });
    });
    RunInTime({InPhotos("d")});
  });
}

// The same for outputs whose names are first seen on the converter's command line.
TEST_F(Races, OutputNameOfTheCommandLineTaken) {
  Repeat(Rounds(3), [&](const Trap& trap) {
    FreshPhotos(kPhotosInARound, MakeSmallPhoto);
    const UserProcess attacker(kAttacker, [&] {
      for (;;) {
        for (const std::string& argument : ConverterArguments()) {
          if (IsTempOutput(argument)) {
            trap.take(argument);
          }
        }
      }
    });
    RunInTime({InPhotos("d")});
  });
}

// Between the removal of an old marker and the making of the new one.
TEST_F(Races, FailureMarkerTakenBeforeItIsMade) {
  constexpr int kBrokenPhotos = 12;
  const auto makeBroken = [](const std::string& path) { WriteFile(path, "\xff\xd8\xff broken"); };
  Repeat(Rounds(2), [&](const Trap& trap) {
    Strings markers;
    for (const std::string& folder : FreshPhotos(kBrokenPhotos, makeBroken)) {
      for (const Kind& kind : kinds_) {
        markers.push_back(folder + "/VELAPHOTO_THUMB_" + kind.name + ".fail");
      }
    }
    const UserProcess attacker(kAttacker, [&] {
      for (;;) {
        for (const std::string& marker : markers) {
          trap.take(marker);
        }
      }
    });
    RunInTime({InPhotos("d")});
  });
}

// A decoded raw photo and an embedded preview, between the decoder and the converter.
TEST_F(Races, DecodedPhotoReplacedBeforeItIsWritten) {
  if (!CanDistinguishOwners()) {
    return;
  }
  const std::string photo = InPhotos("d/a.dng");
  int number = 0;
  Repeat(Rounds(3), [&](const Trap& trap) {
    RemoveTree(InPhotos("d/@eaDir"));
    MakeRawPhoto(photo, ++number % 2 == 0 ? RawRecipeOf() : RawRecipeOf(160, 120));
    SetFileTimeFromNow(photo, 1000);
    MakeMetadataDir(photo);
    const FolderWatch watch({MetadataDirOf(photo)}, IN_CREATE | IN_OPEN | IN_CLOSE_WRITE);
    const UserProcess attacker(kAttacker, [&] {
      watch.Follow([&](const std::string& path, uint32_t) {
        if (path.find("RAW") != std::string::npos && path.find(".new") == std::string::npos) {
          trap.replace(path);
        }
      });
    });
    RunInTime({InPhotos("d")});
  });
}

TEST_F(Races, PhotoReplacedByAPipeAfterItsConversion) {
  for (int i = 0; i < Rounds(10) && !HasFailure(); ++i) {
    const Strings folders = FreshPhotos(kPhotosInARound, MakeSmallPhoto);
    const UserProcess attacker(kAttacker, [&] {
      Strings waiting = folders;
      while (!waiting.empty()) {
        const std::string folder = waiting.back();
        if (access((folder + "/VELAPHOTO_THUMB_XL.jpg").c_str(), F_OK) == 0) {
          ReplaceByFifo(InPhotos("d/") + folder.substr(folder.rfind('/') + 1));
          waiting.pop_back();
        } else {
          std::rotate(waiting.begin(), waiting.end() - 1, waiting.end());
        }
      }
    });
    RunInTime({InPhotos("d")});
  }
}

// The thumbnail from which the later phases are made.
TEST_F(Races, ReferenceThumbReplacedByALinkToAPrivatePhoto) {
  if (!CanDistinguishOwners()) {
    return;
  }
  RepeatForContent(Rounds(5), [this] {
    const FolderWatch watch(FreshPhotos(kPhotosInARound, MakeSmallPhoto), IN_MOVED_TO);
    const UserProcess attacker(kAttacker, [&] {
      watch.Follow([](const std::string& path, uint32_t) {
        if (path.find("_XL.jpg") != std::string::npos && path.find(".new") == std::string::npos) {
          ReplaceByLink(kPrivatePhoto, path);
        }
      });
    });
    RunInTime({InPhotos("d")});
  });
}

TEST_F(Races, PhotoReplacedByALinkToAPrivatePhoto) {
  if (!CanDistinguishOwners()) {
    return;
  }
  RepeatForContent(Rounds(5), [this] {
    FreshPhotos(kPhotosInARound, MakeSmallPhoto);
    const std::string photo = InPhotos("d/0.jpg");
    CopyFile(photo, InPhotos("d/original"));
    const UserProcess attacker(kAttacker, [&] {
      for (;;) {
        ReplaceByLink(kPrivatePhoto, photo);
        ReplaceByHardLink(InPhotos("d/original"), photo);
      }
    });
    RunInTime({InPhotos("d")});
  });
}

// Folders come and go during a whole run: once checked is not enough.
TEST_F(Races, FoldersReplacedByLinksDuringARun) {
  if (!CanDistinguishOwners()) {
    return;
  }
  constexpr int kManyPhotos = 50;
  for (int i = 0; i < Rounds(2) && !HasFailure(); ++i) {
    const Strings folders = FreshPhotos(kManyPhotos, MakeSmallPhoto);
    const auto swapFolders = [&folders] {
      for (;;) {
        for (const std::string& folder : folders) {
          std::rename(folder.c_str(), (folder + ".away").c_str());
          Link(std::string(kVictimMetadata) + "/a.jpg", folder);
          unlink(folder.c_str());
          std::rename((folder + ".away").c_str(), folder.c_str());
        }
      }
    };
    const UserProcess first(kAttacker, swapFolders);
    const UserProcess second(kAttacker, swapFolders);
    RunInTime({InPhotos("d")}, std::chrono::seconds(60));
    ExpectVictimUnchanged();
  }
}

TEST_F(Races, MetadataDirectoryReplacedByALinkDuringARun) {
  if (!CanDistinguishOwners()) {
    return;
  }
  for (int i = 0; i < Rounds(3) && !HasFailure(); ++i) {
    FreshPhotos(10, [](const std::string& path) { MakeJpeg(path, RecipeOf(160, 120)); });
    GiveTo(kAttacker, InPhotos("d/@eaDir").c_str());
    const std::string root = InPhotos("d/@eaDir");
    const UserProcess attacker(kAttacker, [&] {
      for (;;) {
        std::rename(root.c_str(), (root + ".away").c_str());
        Link(kVictimMetadata, root);
        usleep(300);
        unlink(root.c_str());
        std::rename((root + ".away").c_str(), root.c_str());
        usleep(300);
      }
    });
    for (int run = 0; run < 3; ++run) {
      RunInTime({InPhotos("d")}, std::chrono::seconds(60));
    }
    ExpectVictimUnchanged();
  }
}

}  // namespace vela_test::hostile
