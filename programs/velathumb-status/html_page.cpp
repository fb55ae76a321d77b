#include "html_page.h"

#include <cerrno>
#include <ctime>

#include "html_style.h"
#include "html_tile.h"
#include "smallest_thumb.h"
#include "text_encoding.h"

namespace vela {

namespace {

std::string Span(const std::string& text) {
  return "<span>" + text + "</span>";
}

std::string DirectoryNumbers(const StatusCounts& counts, const ThumbShares& shares) {
  std::string line = Span(CountText(counts.photos, "photo", "photos"));
  if (counts.incompletePhotos > 0) {
    line += Span(CountText(counts.incompletePhotos, "needs work", "need work"));
  }
  line += Span(CountText(shares.present, "thumbnail present", "thumbnails present"));
  if (shares.missing > 0) {
    line += Span(GroupDigits(shares.missing) + " missing");
  }
  if (shares.failed > 0) {
    line += Span(GroupDigits(shares.failed) + " failed");
  }
  if (counts.videos.value_or(0) > 0) {
    line += Span(CountText(*counts.videos, "video needs work", "videos need work"));
  }
  return "<p class=\"counts\">" + line + "</p>\n";
}

std::string SectionHead(const DirectoryReport& directory, const ThumbShares& shares,
                        int64_t number) {
  const std::string id = "d" + std::to_string(number);
  return "<section aria-labelledby=\"" + id + "\">\n<h2><bdi id=\"" + id + "\">" +
         ToHtml(directory.path) + "</bdi>" +
         (directory.isQueued ? "<span class=\"queued\">Queued</span>" : "") + "</h2>\n" +
         DirectoryNumbers(directory.counts, shares) + ShareBar(shares, "bar thin");
}

std::string Number(const char* label, int64_t number) {
  return "<div><dt>" + std::string(label) + "</dt><dd>" + GroupDigits(number) + "</dd></div>\n";
}

std::string LegendItem(const char* cssClass, const char* label, int64_t part, int64_t total) {
  return std::string("<li><i class=\"") + cssClass + "\"></i>" + label + ' ' + GroupDigits(part) +
         " (" + PercentText(part, total) + ")</li>\n";
}

std::string ShareSummary(const ThumbShares& shares) {
  const int64_t total = shares.Total();
  if (total == 0) {
    return "<p class=\"headline\">There are no thumbnails to make.</p>\n";
  }
  return "<p class=\"headline\"><b>" + PercentText(shares.present, total) + "</b> of " +
         CountText(total, "thumbnail", "thumbnails") + " present</p>\n" + ShareBar(shares, "bar") +
         "<ul class=\"legend\">\n" + LegendItem("done", "Present", shares.present, total) +
         LegendItem("missing", "Missing or outdated", shares.missing, total) +
         LegendItem("failed", "Failed", shares.failed, total) + "</ul>\n";
}

std::string Summary(const StatusTotals& totals, const ThumbShares& shares) {
  std::string summary = "<div class=\"panel\">\n" + ShareSummary(shares) +
                        "<dl class=\"numbers\">\n" + Number("Photos", totals.all.photos) +
                        Number("Photos that need work", totals.all.incompletePhotos) +
                        Number("Directories", totals.directories) +
                        Number("Queued directories", totals.queuedDirectories);
  if (totals.all.videos) {
    summary += Number("Videos that need work", *totals.all.videos);
  }
  return summary + "</dl>\n</div>\n";
}

std::string Choice(const char* id, const char* label, bool isChosen) {
  return std::string("<label><input type=\"radio\" name=\"show\" id=\"") + id + "\"" +
         (isChosen ? " checked" : "") + ">" + label + "</label>\n";
}

/// Needs no script: the style sheet hides the other photos.
std::string Choices() {
  return "<fieldset class=\"show\"><legend>Show</legend>\n" +
         Choice("show-all", "All photos", true) + Choice("show-work", "Need work", false) +
         Choice("show-failed", "Failed", false) + "</fieldset>\n";
}

/// Whatever a name on the page contains, the policy allows no script and no loading.
std::string PageHead() {
  return std::string(
             "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
             "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; "
             "img-src data:; style-src 'unsafe-inline'; base-uri 'none'; form-action 'none'\">\n"
             "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
             "<meta name=\"color-scheme\" content=\"light dark\">\n"
             "<title>Thumbnail status</title>\n<style>") +
         kHtmlStyle + "</style>\n</head>\n<body>\n";
}

std::string PageHeader(const StatusTotals& totals, const ThumbShares& shares) {
  return "<header>\n<h1>Thumbnail status</h1>\n<p class=\"lead\">" +
         CountText(totals.directories, "directory", "directories") + ", " +
         TimeElement(std::time(nullptr)) + "</p>\n" + Summary(totals, shares) +
         (totals.all.photos > 0 ? Choices() : std::string()) + "</header>\n<main>\n";
}

constexpr const char* kPageEnd =
    "</main>\n<footer>Each photo is shown by its smallest thumbnail. Times are local times."
    "</footer>\n</body>\n</html>\n";

}  // namespace

HtmlPage::HtmlPage(const std::string& path)
    : place_(path),
      body_(place_, NewFile::Kind::kScratch),
      photos_(place_, NewFile::Kind::kScratch) {}

HtmlPage::~HtmlPage() = default;

/// Does nothing after an error of the page; lack of memory for the page must not end the scan.
template <typename Step>
void HtmlPage::Do(const Step& step) {
  if (Error() != 0) {
    return;
  }
  try {
    step();
  } catch (...) {
    error_ = ENOMEM;
  }
}

int HtmlPage::Error() const {
  for (const int error : {place_.Error(), error_, body_.Error(), photos_.Error()}) {
    if (error != 0) {
      return error;
    }
  }
  return 0;
}

void HtmlPage::BeginDirectory() {
  Do([&] {
    photos_.Clear();
    directoryShares_ = ThumbShares();
  });
}

void HtmlPage::TakePhoto(const PhotoReport& photo) {
  Do([&] {
    directoryShares_.Add(SharesOf(photo));
    photos_.Append(PhotoTile(photo, ReadSmallestThumb(photo.path)));
  });
}

void HtmlPage::EndDirectory(const DirectoryReport& directory) {
  Do([&] {
    shares_.Add(directoryShares_);
    body_.Append(SectionHead(directory, directoryShares_, ++sections_));
    if (directory.counts.photos == 0) {
      body_.Append("<p class=\"empty\">No photos</p>\n</section>\n");
      return;
    }
    body_.Append("<ul class=\"grid\">\n");
    body_.AppendAllOf(photos_);
    body_.Append("</ul>\n</section>\n");
  });
}

void HtmlPage::TakeTotals(const StatusTotals& totals) {
  totals_ = totals;
}

int HtmlPage::Finish() {
  Do([&] {
    NewFile page(place_, NewFile::Kind::kResult);
    page.Append(PageHead());
    page.Append(PageHeader(totals_, shares_));
    page.AppendAllOf(body_);
    page.Append(kPageEnd);
    error_ = page.MoveToPlace();
  });
  return Error();
}

}  // namespace vela
