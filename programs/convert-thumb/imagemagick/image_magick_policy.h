// What ImageMagick is allowed to do.
#pragma once

namespace vela {

/// Directory of the policy that limits ImageMagick to photos.
constexpr char kPolicyDirectory[] = "/usr/vela/share/imagemagick";

/// Sets the environment so that ImageMagick reads this policy, before and after that of the system,
/// and no other configuration of the user. Returns false, after a call of ReportFailure, when the
/// policy is not installed.
bool UsePolicy();

}  // namespace vela
