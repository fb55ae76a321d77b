// The page as a browser shows it.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "chromium.h"
#include "html_page_photos.h"
#include "support/files.h"
#include "support/images.h"
#include "support/quadrants.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

using HtmlPageInBrowser = SandboxTest;

constexpr BrowserView kPhone = {360, 800};
constexpr BrowserView kDesktop = {1280, 900};
constexpr BrowserView kDarkDesktop = {1280, 900, true};

constexpr uint32_t kFailedColour = 0xc62834;
constexpr uint32_t kMissingColour = 0xc98a00;

/// A photo whose smallest thumbnail shows the quadrants.
PhotoReport WithPicture(const PhotoReport& photo, int width = 120, int height = 90) {
  const std::string thumb = ThumbOf(photo, kS);
  WriteFile(thumb, "");  // makes the directories
  JpegRecipe recipe;
  recipe.width = width;
  recipe.height = height;
  MakeJpeg(thumb, recipe);
  return photo;
}

PhotoReport FailedPhoto() {
  return WithFailures(Missing({kXL}, "b.jpg"), {kXL}, 1700000000);
}

/// Lays out the part below the window as well, which the browser otherwise postpones.
constexpr const char* kLayOutAll =
    "doc.head.insertAdjacentHTML('beforeend','<style>.tile{content-visibility:visible}</style>')";

/// A page with every kind of content, including long names.
void WriteFullPage() {
  const PhotoReport lost =
      WithFailures(Missing(AllSizes(), std::string(250, 'w')), AllSizes(), 1700000000);
  WritePage({{"/photos/" + std::string(250, 'm') + '/' + std::string(250, 'n'),
              true,
              {WithPicture(CompletePhoto("a.jpg")), WithPicture(FailedPhoto()), lost,
               Missing(AllSizes(), "c d.jpg"), Outdated(AllSizes(), "e.jpg")},
              1234567}});
}

uint32_t ColourOf(char letter) {
  for (const NamedColour& colour : kNamedColours) {
    if (colour.letter == letter) {
      return static_cast<uint32_t>(colour.rgb[0]) << 16 |
             static_cast<uint32_t>(colour.rgb[1]) << 8 | colour.rgb[2];
    }
  }
  ADD_FAILURE() << letter;
  return 0;
}

/// Pixels of a quadrant: a JPEG does not keep colours exactly.
int QuadrantPixelsIn(const Screenshot& picture, char letter) {
  return picture.CountOf(ColourOf(letter), 12);
}

TEST_F(HtmlPageInBrowser, TheThumbnailsAreVisible) {
  WritePage({{"/photos", false, {WithPicture(CompletePhoto("a.jpg"))}}});
  for (const BrowserView& view : {kPhone, kDesktop}) {
    const Screenshot picture = TakeScreenshot(kPage, view);
    ASSERT_EQ(picture.Width(), view.width);
    ASSERT_EQ(picture.Height(), view.height);
    for (const char letter : {'R', 'G', 'B', 'Y'}) {
      EXPECT_GT(QuadrantPixelsIn(picture, letter), 2000) << letter << view.width;
    }
  }
}

TEST_F(HtmlPageInBrowser, WithoutAThumbThereAreNoPictures) {
  WritePage({{"/photos", false, {CompletePhoto("a.jpg")}}});
  const Screenshot picture = TakeScreenshot(kPage, kDesktop);
  for (const char letter : {'R', 'G', 'B', 'Y'}) {
    EXPECT_LT(QuadrantPixelsIn(picture, letter), 50) << letter;
  }
}

TEST_F(HtmlPageInBrowser, APortraitPictureStaysInItsBox) {
  WritePage({{"/photos", false, {WithPicture(CompletePhoto("a.jpg"), 60, 120)}}});
  EXPECT_THAT(EvaluateInPage(kPage, {"all('.pic img')[0].getBoundingClientRect().height<="
                                     "all('.pic')[0].getBoundingClientRect().height",
                                     "all('.pic')[0].getBoundingClientRect().height<"
                                     "all('.pic')[0].getBoundingClientRect().width"}),
              ElementsAre("true", "true"));
}

TEST_F(HtmlPageInBrowser, StatesHaveTheirColours) {
  const PhotoReport complete = CompletePhoto("a.jpg");
  WritePage({{"/photos", false, {complete}}});
  const Screenshot plain = TakeScreenshot(kPage, kDesktop);  // the legend shows the colours as well
  WritePage({{"/photos", false, {complete, FailedPhoto()}}});
  EXPECT_GT(TakeScreenshot(kPage, kDesktop).CountOf(kFailedColour),
            plain.CountOf(kFailedColour) + 1000);
  WritePage({{"/photos", false, {complete, Missing({kL}, "c.jpg")}}});
  EXPECT_GT(TakeScreenshot(kPage, kDesktop).CountOf(kMissingColour),
            plain.CountOf(kMissingColour) + 500);
}

TEST_F(HtmlPageInBrowser, TheReasonOfAFailureIsReadable) {
  WriteFullPage();
  const std::vector<std::string> answers =
      EvaluateInPage(kPage, {kLayOutAll, "all('.tile.failed .note')[0].innerText",
                             "all('.tile.failed .note').every(n=>n.clientHeight>0&&n.scrollHeight<="
                             "n.clientHeight+1&&n.getBoundingClientRect().bottom<="
                             "n.parentElement.getBoundingClientRect().bottom)"});
  EXPECT_THAT(answers[1], HasSubstr(PercentEncoded("XL\u00a0(1280×1280)")));
  EXPECT_EQ(answers[2], "true");
}

TEST_F(HtmlPageInBrowser, ThePartsOfTheBarAreAsWideAsTheirShares) {
  const PhotoReport photo = WithFailures(Missing({kS, kM}), {kS}, 1700000000);
  PhotoReport other = WithState(CompletePhoto("b.jpg"), ThumbState::kNotWanted, AllSizes());
  WritePage({{"/photos", false, {photo, other}}});
  const std::string width = "getBoundingClientRect().width";
  EXPECT_THAT(EvaluateInPage(kPage, {"Math.abs(all('.bar .present')[0]." + width +
                                         "/all('.bar .missing')[0]." + width + "-4)<0.1",
                                     "Math.abs(all('.bar .failed')[0]." + width +
                                         "/all('.bar .missing')[0]." + width + "-1)<0.1"}),
              ElementsAre("true", "true"));
}

TEST_F(HtmlPageInBrowser, NothingIsWiderThanAPhone) {
  WriteFullPage();
  const std::string tooWide =
      "all('body *').filter(e=>e.getBoundingClientRect().right>360.5)"
      ".map(e=>e.outerHTML.slice(0,80)).join()";
  EXPECT_THAT(EvaluateInPage(kPage,
                             {kLayOutAll, "view.innerWidth", "doc.documentElement.scrollWidth",
                              "doc.body.scrollWidth", tooWide},
                             kPhone),
              ElementsAre("undefined", "360", "360", "360", ""));
}

TEST_F(HtmlPageInBrowser, APhoneShowsPhotosSideBySide) {
  WriteFullPage();
  EXPECT_THAT(EvaluateInPage(kPage,
                             {"view.getComputedStyle(all('.grid')[0]).gridTemplateColumns.split"
                              "(' ').length"},
                             kPhone),
              ElementsAre("2"));
}

TEST_F(HtmlPageInBrowser, TheColoursFollowThePreferredScheme) {
  WriteFullPage();
  const Screenshot light = TakeScreenshot(kPage, kDesktop);
  const Screenshot dark = TakeScreenshot(kPage, kDarkDesktop);
  EXPECT_EQ(light.At(2, 2), 0xf3f5f7u);
  EXPECT_EQ(dark.At(2, 2), 0x10141au);
}

/// Whether all texts have the contrast of 4.5 to their background that WCAG requires.
constexpr const char* kLeastContrast =
    "(()=>{const parts=c=>c.match(/[\\d.]+/g).map(Number);"
    "const light=c=>parts(c).slice(0,3).map(v=>v/255).map(v=>v<=0.03928?v/12.92:"
    "((v+0.055)/1.055)**2.4).reduce((s,v,i)=>s+v*[0.2126,0.7152,0.0722][i],0);"
    "const isSolid=c=>parts(c).length<4||parts(c)[3]>0;"
    "const behind=e=>{for(;e;e=e.parentElement){const c=view.getComputedStyle(e).backgroundColor;"
    "if(isSolid(c))return c}return 'rgb(255,255,255)'};"
    "return Math.min(...all('h1,h2,p,li,dt,dd,label,legend,strong,.queued,.none,footer').map(e=>{"
    "const a=light(view.getComputedStyle(e).color),b=light(behind(e));"
    "return (Math.max(a,b)+0.05)/(Math.min(a,b)+0.05)}))>=4.5})()";

TEST_F(HtmlPageInBrowser, TextsHaveEnoughContrast) {
  WriteFullPage();
  EXPECT_THAT(EvaluateInPage(kPage, {kLeastContrast}, kDesktop), ElementsAre("true"));
  EXPECT_THAT(EvaluateInPage(kPage, {kLeastContrast}, kDarkDesktop), ElementsAre("true"));
}

TEST_F(HtmlPageInBrowser, PhotosCanBeFiltered) {
  WriteFullPage();
  const std::string shown =
      "all('.tile').filter(t=>view.getComputedStyle(t).display!=='none').length";
  const auto choose = [](const std::string& id) {
    return "doc.getElementById('" + id + "').click()";
  };
  EXPECT_THAT(EvaluateInPage(kPage, {shown, choose("show-work"), shown, choose("show-failed"),
                                     shown, choose("show-all"), shown}),
              ElementsAre("5", "undefined", "4", "undefined", "2", "undefined", "5"));
}

TEST_F(HtmlPageInBrowser, HostileNamesAreShownAndRunNothing) {
  const std::vector<std::string> names = {
      "<script>document.title='run'<_script>",
      "\"><img src=x onerror=\"document.title='run'\">",
      "' onload='document.title=1' x='",
      "<_title><b>bold<b",
      "-->\n<!--&lt;&amp;",
      "<svg onload=document.title=2>",
  };
  std::vector<PhotoReport> photos;
  photos.reserve(names.size() + 1);
  for (const std::string& name : names) {
    photos.push_back(WithPicture(CompletePhoto(name)));
  }
  photos.push_back(CompletePhoto("bad\xff\xfe.jpg"));
  const std::string directory = "/photos/</h2><script>document.title='run'</script>\"'&amp;";
  WritePage({{directory, false, photos}});
  std::vector<std::string> expressions = {
      "doc.title",
      "doc.scripts.length",
      "all('img').length",
      "all('*').filter(e=>[...e.attributes].some(a=>a.name.startsWith('on'))).length",
      "all('svg,h2 *:not(bdi),.name *:not(bdi)').length",
      "all('h2 bdi')[0].textContent"};
  std::vector<std::string> expected = {"Thumbnail%20status",     "0", "6", "0", "0",
                                       PercentEncoded(directory)};
  for (size_t i = 0; i < photos.size(); ++i) {
    const std::string name = "all('.name')[" + std::to_string(i) + ']';
    expressions.push_back(name + ".textContent");
    expressions.push_back(name + ".title");
    const std::string shown = i < names.size() ? names[i] : "bad\uFFFD\uFFFD.jpg";
    expected.push_back(PercentEncoded(shown));
    expected.push_back(PercentEncoded(shown));
  }
  EXPECT_EQ(EvaluateInPage(kPage, expressions), expected);
  EXPECT_THAT(DocumentAfterLoading(kPage), HasSubstr("<title>Thumbnail status</title>"));
}

TEST_F(HtmlPageInBrowser, APageWithTwoThousandPhotosIsShown) {
  const std::string picture = ReadFile(ThumbOf(WithPicture(CompletePhoto("0")), kS));
  std::vector<PhotoReport> photos;
  for (int i = 0; i < 2000; ++i) {
    photos.push_back(CompletePhoto(std::to_string(i)));
    // Bytes behind a picture do not change it, but make it another one for the browser.
    WriteFile(ThumbOf(photos.back(), kS), picture + std::string(3000, 'x') + std::to_string(i));
  }
  WritePage({{"/photos", false, photos}});
  EXPECT_THAT(EvaluateInPage(kPage,
                             {"all('.tile').length",
                              "all('img').filter(i=>i.complete&&i.naturalWidth===120).length",
                              "doc.documentElement.scrollWidth"},
                             kPhone),
              ElementsAre("2000", "2000", "360"));
  EXPECT_GT(QuadrantPixelsIn(TakeScreenshot(kPage, kPhone), 'R'), 2000);
}

TEST_F(HtmlPageInBrowser, AThumbThatIsNotAnImageIsShownAsItsName) {
  const PhotoReport photo = CompletePhoto("broken.jpg");
  WriteFile(ThumbOf(photo, kS), ThumbBytes("no picture"));
  WritePage({{"/photos", false, {photo}}});
  EXPECT_THAT(EvaluateInPage(kPage, {"all('img')[0].naturalWidth", "all('img')[0].alt"}),
              ElementsAre("0", PercentEncoded("Thumbnail of broken.jpg")));
}

}  // namespace
}  // namespace vela_test
