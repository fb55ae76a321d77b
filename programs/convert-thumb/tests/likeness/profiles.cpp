#include "likeness/profiles.h"

#include <lcms2.h>

#include <array>

#include "support/colour_profile.h"

namespace vela_test {
namespace {

constexpr cmsCIExyY kDaylight = {0.3127, 0.3290, 1.0};

std::string RgbProfile(const cmsCIExyYTRIPLE& primaries, double gamma) {
  cmsToneCurve* const curve = cmsBuildGamma(nullptr, gamma);
  std::array<cmsToneCurve*, 3> curves = {curve, curve, curve};
  const cmsHPROFILE profile = cmsCreateRGBProfile(&kDaylight, &primaries, curves.data());
  cmsFreeToneCurve(curve);
  return ProfileBytes(profile);
}

/// The colour of inks printed on white; `toLab` is a transform from RGB.
cmsInt32Number LabOfInks(const cmsUInt16Number* inks, cmsUInt16Number* lab, void* toLab) {
  constexpr double kFull = 65535;
  std::array<double, 3> rgb = {};
  for (size_t i = 0; i < rgb.size(); ++i) {
    rgb[i] = (1 - inks[i] / kFull) * (1 - inks[3] / kFull);
  }
  cmsCIELab colour;
  cmsDoTransform(toLab, rgb.data(), &colour, 1);
  cmsFloat2LabEncoded(lab, &colour);
  return TRUE;
}

void WriteInkTable(cmsHPROFILE profile) {
  const cmsHPROFILE rgb = cmsCreate_sRGBProfile();
  const cmsHPROFILE lab = cmsCreateLab4Profile(nullptr);
  const cmsHTRANSFORM toLab =
      cmsCreateTransform(rgb, TYPE_RGB_DBL, lab, TYPE_Lab_DBL, INTENT_PERCEPTUAL, 0);
  cmsPipeline* const pipeline = cmsPipelineAlloc(nullptr, 4, 3);
  cmsStage* const table = cmsStageAllocCLut16bit(nullptr, 5, 4, 3, nullptr);
  cmsStageSampleCLut16bit(table, LabOfInks, toLab, 0);
  // The format requires curves around a table; these are linear.
  cmsPipelineInsertStage(pipeline, cmsAT_END, cmsStageAllocToneCurves(nullptr, 4, nullptr));
  cmsPipelineInsertStage(pipeline, cmsAT_END, table);
  cmsPipelineInsertStage(pipeline, cmsAT_END, cmsStageAllocToneCurves(nullptr, 3, nullptr));
  cmsWriteTag(profile, cmsSigAToB0Tag, pipeline);
  cmsPipelineFree(pipeline);
  cmsDeleteTransform(toLab);
  cmsCloseProfile(lab);
  cmsCloseProfile(rgb);
}

void WriteDescription(cmsHPROFILE profile) {
  cmsMLU* const text = cmsMLUalloc(nullptr, 1);
  cmsMLUsetASCII(text, "en", "US", "inks");
  cmsWriteTag(profile, cmsSigProfileDescriptionTag, text);
  cmsMLUfree(text);
}

}  // namespace

std::string WideRgbProfile() {
  return RgbProfile({{0.64, 0.33, 1}, {0.21, 0.71, 1}, {0.15, 0.06, 1}}, 2.19921875);
}

std::string DisplayRgbProfile() {
  return RgbProfile({{0.680, 0.320, 1}, {0.265, 0.690, 1}, {0.150, 0.060, 1}}, 2.2);
}

std::string GreyProfile() {
  cmsToneCurve* const curve = cmsBuildGamma(nullptr, 2.2);
  const cmsHPROFILE profile = cmsCreateGrayProfile(cmsD50_xyY(), curve);
  cmsFreeToneCurve(curve);
  return ProfileBytes(profile);
}

std::string InkProfile() {
  const cmsHPROFILE profile = cmsCreateProfilePlaceholder(nullptr);
  cmsSetProfileVersion(profile, 4.3);
  cmsSetDeviceClass(profile, cmsSigOutputClass);
  cmsSetColorSpace(profile, cmsSigCmykData);
  cmsSetPCS(profile, cmsSigLabData);
  WriteDescription(profile);
  WriteInkTable(profile);
  return ProfileBytes(profile);
}

}  // namespace vela_test
