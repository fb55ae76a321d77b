#include "chromium.h"

#include <gtest/gtest.h>

#include <cctype>
#include <cstdlib>
#include <cstring>
#include <sstream>
#include <utility>

#include "support/files.h"
#include "support/program.h"

namespace vela_test {

namespace {

constexpr const char* kFrame = "/tmp/chromium/frame.html";
constexpr const char* kPicture = "/tmp/chromium/screenshot.png";
constexpr const char* kResultsBegin = "<pre id=\"results\">";

/// The browser's own sandbox needs rights that the tests' sandbox does not have.
std::string RunChromium(const std::string& page, const BrowserView& view,
                        std::vector<std::string> arguments) {
  arguments.insert(
      arguments.begin(),
      {"--headless", "--no-sandbox", "--disable-gpu", "--disable-dev-shm-usage",
       "--disable-background-networking", "--no-first-run", "--hide-scrollbars",
       "--force-device-scale-factor=1", "--user-data-dir=/tmp/chromium/profile",
       "--window-size=" + std::to_string(view.width) + ',' + std::to_string(view.height)});
  if (view.isDark) {
    arguments.emplace_back("--force-dark-mode");
  }
  arguments.push_back("file://" + page);
  MakeDirectories("/tmp/chromium");
  ProgramOptions options;
  options.addedEnvironment = {"HOME=/tmp/chromium", "DBUS_SESSION_BUS_ADDRESS=disabled:"};
  const ProgramResult result = RunProgram("/usr/bin/chromium", arguments, options);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_FALSE(result.timedOut);
  return result.out;
}

/// The browser's window has a least width, which is more than that of a phone; a frame has none.
std::string FrameOf(const std::string& page, const BrowserView& view) {
  return "<!DOCTYPE html><meta charset=\"utf-8\"><body style=\"margin:0\"><iframe id=\"frame\" "
         "style=\"display:block;border:0;width:" +
         std::to_string(view.width) + "px;height:" + std::to_string(view.height) +
         "px\" src=\"file://" + page + "\"></iframe>";
}

Screenshot ReadPicture(const std::string& path) {
  const ProgramResult result =
      RunProgram("/usr/bin/convert", {path, "-alpha", "off", "-depth", "8", "ppm:-"});
  EXPECT_EQ(result.exitCode, 0) << result.err;
  std::istringstream picture(result.out);
  std::string format;
  int width = 0;
  int height = 0;
  int maximum = 0;
  picture >> format >> width >> height >> maximum;
  picture.get();
  EXPECT_EQ(format, "P6");
  EXPECT_EQ(maximum, 255);
  std::string pixels(static_cast<size_t>(width) * static_cast<size_t>(height) * 3, '\0');
  picture.read(pixels.data(), static_cast<std::streamsize>(pixels.size()));
  EXPECT_TRUE(picture.good());
  return Screenshot(width, height, pixels);
}

std::vector<std::string> Lines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) {
    lines.push_back(line);
  }
  return lines;
}

}  // namespace

Screenshot::Screenshot(int width, int height, std::string pixels)
    : width_(width), height_(height), pixels_(std::move(pixels)) {}

uint32_t Screenshot::At(int x, int y) const {
  const size_t pixel =
      (static_cast<size_t>(y) * static_cast<size_t>(width_) + static_cast<size_t>(x)) * 3;
  uint32_t colour = 0;
  for (size_t part = 0; part < 3; ++part) {
    colour = colour << 8 | static_cast<unsigned char>(pixels_.at(pixel + part));
  }
  return colour;
}

int Screenshot::CountOf(uint32_t colour, int tolerance) const {
  int count = 0;
  for (size_t pixel = 0; pixel + 2 < pixels_.size(); pixel += 3) {
    bool isNear = true;
    for (size_t part = 0; part < 3; ++part) {
      const int wanted = static_cast<int>(colour >> (16 - 8 * part) & 0xff);
      const int found = static_cast<unsigned char>(pixels_[pixel + part]);
      isNear = isNear && std::abs(wanted - found) <= tolerance;
    }
    count += isNear ? 1 : 0;
  }
  return count;
}

Screenshot TakeScreenshot(const std::string& page, const BrowserView& view) {
  MakeDirectories("/tmp/chromium");
  RemoveTree(kPicture);
  WriteFile(kFrame, FrameOf(page, view));
  RunChromium(kFrame, view, {std::string("--screenshot=") + kPicture});
  return ReadPicture(kPicture);
}

std::vector<std::string> EvaluateInPage(const std::string& page,
                                        const std::vector<std::string>& expressions,
                                        const BrowserView& size) {
  std::string script =
      "<script>onload=function(){const view=document.getElementById('frame').contentWindow;"
      "const doc=view.document;const all=(s)=>[...doc.querySelectorAll(s)];const results=[];";
  for (const std::string& expression : expressions) {
    script += "results.push(encodeURIComponent(String(" + expression + ")));";
  }
  script +=
      "const pre=document.createElement('pre');pre.id='results';"
      "pre.textContent=results.join('\\n');document.body.append(pre);}</script>";
  WriteFile(kFrame, FrameOf(page, size) + script);
  const std::string out =
      RunChromium(kFrame, size, {"--allow-file-access-from-files", "--dump-dom"});
  const size_t begin = out.find(kResultsBegin);
  const size_t end = out.find("</pre>", begin);
  if (begin == std::string::npos || end == std::string::npos) {
    ADD_FAILURE() << "the browser gave no results: " << out;
    return std::vector<std::string>(expressions.size());
  }
  const size_t from = begin + std::strlen(kResultsBegin);
  std::vector<std::string> results = Lines(out.substr(from, end - from));
  results.resize(expressions.size());
  return results;
}

std::string DocumentAfterLoading(const std::string& page) {
  return RunChromium(page, BrowserView(), {"--dump-dom"});
}

std::string PercentEncoded(const std::string& text) {
  constexpr const char* kHex = "0123456789ABCDEF";
  std::string encoded;
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte < 0x80 && (std::isalnum(byte) != 0 || std::strchr("-_.!~*'()", c) != nullptr)) {
      encoded += c;
    } else {
      encoded += {'%', kHex[byte >> 4], kHex[byte & 15]};
    }
  }
  return encoded;
}

}  // namespace vela_test
