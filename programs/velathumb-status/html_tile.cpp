#include "html_tile.h"

#include <algorithm>
#include <array>
#include <functional>
#include <optional>

#include "html_counts.h"
#include "size_class_text.h"
#include "storage/thumb_size_class.h"
#include "text_encoding.h"

namespace vela {

namespace {

constexpr const char* kNoBreakSpace = "\u00a0";

/// Returns a text like "XL (1280×1280)" that is not broken into lines.
std::string SizeText(const EAThumbInfo& row) {
  std::string pixels = row.sizeString;
  pixels.replace(pixels.find('x'), 1, "×");
  return std::string(SizeClassName(row)) + kNoBreakSpace + '(' + pixels + ')';
}

/// Returns the sizes for which `isWanted` returns true, separated by commas.
std::string SizeList(const std::function<bool(size_t)>& isWanted) {
  std::string list;
  for (const EA_THUMB_SIZE size : kThumbSizesSmallestFirst) {
    if (isWanted(static_cast<size_t>(size))) {
      list += (list.empty() ? "" : ", ") + SizeText(rgEAThumbInfo[size]);
    }
  }
  return list;
}

bool HasFailed(const PhotoReport& photo, size_t size) {
  return photo.thumbs.IsLacking(size) && photo.failures[size].has_value();
}

/// Returns whether every thumbnail of the photo was tried and failed.
bool IsUnconvertible(const PhotoReport& photo, const std::string& thumb) {
  const ThumbShares shares = SharesOf(photo);
  const auto& states = photo.thumbs.states;
  return thumb.empty() && shares.failed > 0 && shares.failed == shares.Total() &&
         std::count(states.begin(), states.end(), ThumbState::kOutdated) == 0;
}

std::string Note(const std::string& html) {
  return "<p class=\"note\">" + html + "</p>\n";
}

std::string UnconvertibleNote(const PhotoReport& photo) {
  return Note("The photo could not be converted, since " +
              TimeElement(photo.FirstFailure().value_or(0)));
}

std::string ReasonNote(const PhotoReport& photo) {
  return photo.reason.empty() ? std::string() : Note("Reason: " + ToHtml(photo.reason));
}

/// Returns a note for each time at which sizes failed: those that failed together share a note.
std::string FailureNotes(const PhotoReport& photo) {
  std::string notes;
  std::array<bool, kThumbSizeCount> isNamed = {};
  for (const EA_THUMB_SIZE first : kThumbSizesSmallestFirst) {
    if (!HasFailed(photo, static_cast<size_t>(first)) || isNamed[static_cast<size_t>(first)]) {
      continue;
    }
    const time_t since = *photo.failures[static_cast<size_t>(first)];
    const std::string sizes = SizeList([&](size_t size) {
      const bool isOne = HasFailed(photo, size) && photo.failures[size] == since;
      isNamed[size] = isNamed[size] || isOne;
      return isOne;
    });
    notes += Note("Could not be made: " + sizes + ", since " + TimeElement(since));
  }
  return notes;
}

std::string StateNote(const PhotoReport& photo, ThumbState state, const char* label) {
  const std::string sizes = SizeList(
      [&](size_t size) { return photo.thumbs.states[size] == state && !HasFailed(photo, size); });
  return sizes.empty() ? std::string() : Note(label + (": " + sizes));
}

std::string Notes(const PhotoReport& photo, const std::string& thumb) {
  if (photo.thumbs.lookup != PhotoLookup::kDone) {
    return Note("The photo could not be looked up");
  }
  if (IsUnconvertible(photo, thumb)) {
    return UnconvertibleNote(photo) + ReasonNote(photo);
  }
  return FailureNotes(photo) + ReasonNote(photo) +
         StateNote(photo, ThumbState::kMissing, "Missing") +
         StateNote(photo, ThumbState::kOutdated, "Outdated");
}

/// The mark of a tile: its style and its text.
struct Mark {
  const char* cssClass;
  const char* label;  ///< null for a photo that is done
};

Mark MarkOf(const PhotoReport& photo) {
  const ThumbShares shares = SharesOf(photo);
  const auto& states = photo.thumbs.states;
  if (photo.thumbs.lookup != PhotoLookup::kDone) {
    return {"unknown", "Unknown"};
  }
  if (shares.failed > 0) {
    return {"failed", "Failed"};
  }
  if (shares.missing == 0) {
    return {"done", nullptr};
  }
  const bool isMissing = std::count(states.begin(), states.end(), ThumbState::kMissing) > 0;
  return {"missing", isMissing ? "Missing" : "Outdated"};
}

/// Gives the size of the box; the style sheet fits the picture into it.
std::string Picture(const std::string& thumb, const std::string& name) {
  if (thumb.empty()) {
    return "<span class=\"none\">No thumbnail</span>";
  }
  return "<img src=\"data:image/jpeg;base64," + ToBase64(thumb) + "\" alt=\"Thumbnail of " + name +
         "\" width=\"160\" height=\"120\" loading=\"lazy\" decoding=\"async\">";
}

}  // namespace

std::string PhotoTile(const PhotoReport& photo, const std::string& thumb) {
  const Mark mark = MarkOf(photo);
  const std::string name = ToHtml(photo.Name());
  std::string tile = std::string("<li class=\"tile ") + mark.cssClass + "\">\n<div class=\"pic\">";
  tile += Picture(thumb, name);
  if (mark.label != nullptr) {
    tile += std::string("<strong class=\"mark\">") + mark.label + "</strong>";
  }
  tile += "</div>\n<p class=\"name\" title=\"" + name + "\"><bdi>" + name + "</bdi></p>\n";
  return tile + Notes(photo, thumb) + "</li>\n";
}

std::string TimeElement(time_t time) {
  struct tm local = {};
  char machine[64] = "";
  char human[64] = "";
  if (localtime_r(&time, &local) == nullptr ||
      std::strftime(machine, sizeof machine, "%Y-%m-%dT%H:%M:%S%z", &local) == 0 ||
      std::strftime(human, sizeof human, "%Y-%m-%d %H:%M", &local) == 0) {
    return std::to_string(time);
  }
  return std::string("<time datetime=\"") + machine + "\">" + human + "</time>";
}

}  // namespace vela
