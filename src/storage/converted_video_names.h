// The converted videos: their file names in the metadata directory of their source.
#pragma once

namespace vela {

/// The file names of a converted video.
struct ConvertedVideoName {
  const char* name;     ///< the one that is written
  const char* oldName;  ///< its older form, with a colon, also accepted
};

inline constexpr ConvertedVideoName kHighVideo = {"VELAPHOTO_FILM_H.mp4", "VELAPHOTO:FILM_H.mp4"};
inline constexpr ConvertedVideoName kMediumVideo = {"VELAPHOTO_FILM_M.mp4", "VELAPHOTO:FILM_M.mp4"};
inline constexpr ConvertedVideoName kLowVideo = {"VELAPHOTO_FILM_L.mp4", "VELAPHOTO:FILM_L.mp4"};
inline constexpr ConvertedVideoName kMobileVideo = {"VELAPHOTO_FILM_MOBILE.mp4",
                                                    "VELAPHOTO:FILM_MOBILE.mp4"};
inline constexpr ConvertedVideoName kConvertedMpeg4Video = {"VELAPHOTO_FILM_CONVERT_MPEG4.mp4",
                                                            "VELAPHOTO:FILM_CONVERT_MPEG4.mp4"};
inline constexpr ConvertedVideoName kH264Video = {"VELAPHOTO_FILM_H264.mp4",
                                                  "VELAPHOTO:FILM_H264.mp4"};
/// Without an extension in both forms.
inline constexpr ConvertedVideoName kIphoneVideo = {"VELAPHOTO_FILM_MOBILE_IPHONE",
                                                    "VELAPHOTO:FILM_MOBILE_IPHONE"};
inline constexpr ConvertedVideoName kMpeg4Video = {"VELAPHOTO_FILM_MPEG4.mp4",
                                                   "VELAPHOTO:FILM_MPEG4.mp4"};
inline constexpr ConvertedVideoName kFlashVideo = {"VELAPHOTO_FILM.flv", "VELAPHOTO:FILM.flv"};

/// The converted videos that have the orientation of their source, in lookup order.
inline constexpr ConvertedVideoName kOrientedVideos[] = {kHighVideo, kMediumVideo, kLowVideo,
                                                         kMobileVideo};

}  // namespace vela
