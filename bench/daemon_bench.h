// What the index daemon can do and what it costs.
#pragma once

namespace vela_bench {

/// Measures how many requests the daemon answers on one core, and what it adds to a photo that is
/// up to date; prints both.
void MeasureDaemon();

}  // namespace vela_bench
