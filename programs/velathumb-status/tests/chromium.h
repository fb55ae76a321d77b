// A browser that opens pages and reports what they look like.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace vela_test {

/// How a page is opened.
struct BrowserView {
  int width = 1280;  ///< of the page, pixels
  int height = 900;
  bool isDark = false;  ///< the user prefers dark colours
};

/// What is visible of a page without scrolling.
class Screenshot {
 public:
  Screenshot(int width, int height, std::string pixels);

  int Width() const { return width_; }
  int Height() const { return height_; }
  /// Colour of one pixel as 0xRRGGBB.
  uint32_t At(int x, int y) const;
  /// Pixels whose parts of red, green and blue are each at most `tolerance` from those of `colour`.
  int CountOf(uint32_t colour, int tolerance = 0) const;

 private:
  int width_;
  int height_;
  std::string pixels_;  // three bytes each
};

/// Opens the page and takes a picture of it.
Screenshot TakeScreenshot(const std::string& page, const BrowserView& view = BrowserView());

/// Opens the page and evaluates JavaScript expressions in another page that shows it in a frame;
/// `view` (the frame's window), `doc` (its document) and `all` (all elements of a selector) are
/// known to them. Returns their values as text, percent-encoded as encodeURIComponent does.
std::vector<std::string> EvaluateInPage(const std::string& page,
                                        const std::vector<std::string>& expressions,
                                        const BrowserView& size = BrowserView());

/// Opens the page by itself and returns the document after it has loaded.
std::string DocumentAfterLoading(const std::string& page);

/// Returns the text as encodeURIComponent writes it.
std::string PercentEncoded(const std::string& text);

}  // namespace vela_test
