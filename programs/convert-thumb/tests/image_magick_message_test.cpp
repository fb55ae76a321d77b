// The reason that is taken from what ImageMagick prints.

#include <gtest/gtest.h>

#include "imagemagick/image_magick_message.h"
#include "support/named_case.h"

namespace vela_test {
namespace {

using vela::MainMessage;

struct Messages : NamedCase {
  const char* printed;
  const char* main;
};

class MainMessageOf : public ::testing::TestWithParam<Messages> {};

TEST_P(MainMessageOf, IsTheMostTellingOne) {
  EXPECT_EQ(MainMessage(GetParam().printed), GetParam().main);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, MainMessageOf,
    ::testing::Values(
        Messages{{"Nothing"}, "", ""}, Messages{{"EmptyLines"}, "\n\n", ""},
        Messages{{"OneError"},
                 "convert-im6.q16: improper image header `/proc/self/fd/3' @ "
                 "error/bmp.c/ReadBMPImage/637.\n",
                 "improper image header"},
        Messages{{"WithoutNewline"}, "convert-thumb: corrupt @ error/gif.c/A/1.", "corrupt"},
        Messages{{"OutputWithPrefix"},
                 "convert-im6.q16: no images defined `jpg:/proc/self/fd/7' @ "
                 "error/convert.c/ConvertImageCommand/3234.\n",
                 "no images defined"},
        Messages{{"ErrorAfterWarning"},
                 "convert-im6.q16: odd `/proc/self/fd/3' @ warning/jpeg.c/A/1.\n"
                 "convert-im6.q16: bad `/proc/self/fd/3' @ error/jpeg.c/B/2.\n",
                 "bad"},
        Messages{{"DecoderAfterConsequence"},
                 "convert-im6.q16: negative or zero image size `/proc/self/fd/3' @ "
                 "error/image.c/CloneImage/794.\n"
                 "convert-im6.q16: Bogus table `/proc/self/fd/3' @ error/jpeg.c/B/2.\n",
                 "Bogus table"},
        Messages{{"FirstOfTwoDecoders"},
                 "convert-im6.q16: one @ error/png.c/A/1.\n"
                 "convert-im6.q16: two @ error/png.c/B/2.\n",
                 "one"},
        Messages{{"OnlyAWarning"}, "convert-im6.q16: odd @ warning/tiff.c/A/1.\n", "odd"},
        Messages{{"NoImageMagick"}, "sh: not found\n", "sh: not found"},
        Messages{{"Version7"},
                 "convert-im7.q16: improper image header '/proc/self/fd/3' @ "
                 "error/bmp.c/ReadBMPImage/700.\n",
                 "improper image header"},
        Messages{{"Version7WithTextAfterTheName"},
                 "convert-im7.q16: unable to open 'jpg:/proc/self/fd/7': No space left on device "
                 "@ error/blob.c/OpenBlob/3596.\n",
                 "unable to open: No space left on device"},
        Messages{{"Version7DecoderAfterConsequences"},
                 "convert-im7.q16: no images '/proc/self/fd/3' @ error/deprecate.c/A/1.\n"
                 "convert-im7.q16: failed '/proc/self/fd/3' @ error/magick-cli.c/B/2.\n"
                 "convert-im7.q16: Bogus table '/proc/self/fd/3' @ error/jpeg.c/C/3.\n",
                 "Bogus table"},
        Messages{{"TextAboutOptions"},
                 "convert-im6.q16: invalid argument for option `-unsharp': foo @ "
                 "error/convert.c/ConvertImageCommand/3104.\n",
                 "invalid argument for option `-unsharp': foo"}),
    CaseName());

}  // namespace
}  // namespace vela_test
