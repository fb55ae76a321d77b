// Throughput and cost of the index daemon.
#pragma once

namespace vela_bench {

/// Measures how many requests the daemon answers on one processor, and the time that it adds to the
/// processing of a photo that is up to date; prints both.
void MeasureDaemon();

}  // namespace vela_bench
