// Small files that require much memory or time.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vela_test {

/// Files of these formats whose header claims a size, in pixels, followed by almost no data. JPEG
/// and GIF allow sides of up to 65,535 pixels.
std::string ClaimingJpeg(uint32_t width, uint32_t height);
std::string ClaimingPng(uint32_t width, uint32_t height);
std::string ClaimingGif(uint32_t width, uint32_t height);
std::string ClaimingTiff(uint32_t width, uint32_t height);
std::string ClaimingWebp(uint32_t width, uint32_t height);
std::string ClaimingPpm(uint32_t width, uint32_t height);
std::string ClaimingBmp(uint32_t width, uint32_t height);
std::string ClaimingPsd(uint32_t width, uint32_t height);

/// A complete black picture of three bytes per pixel, whose file is a thousandth of that size.
std::string BlackPng(uint32_t width, uint32_t height);

/// An animation of that many complete frames.
std::string LongGif(uint32_t width, uint32_t height, size_t frames);

/// A small grey TIFF whose last page is followed by page `loopTo`, counted from 0; by none if there
/// is no such page.
std::string ManyPagesTiff(size_t pages, size_t loopTo);

/// A small grey TIFF with nested pages, that many deep.
std::string NestedTiff(size_t depth);

/// `jpeg`, a progressive one, with its last scan `times` times.
std::string RepeatLastScan(const std::string& jpeg, size_t times);

}  // namespace vela_test
