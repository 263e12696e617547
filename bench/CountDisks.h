// How benchmarks tell what a disk costs.
#pragma once

#include <benchmark/benchmark.h>

namespace Bench {

// Reports the time per disk; the benchmark's first argument is their number.
inline void CountDisks(benchmark::State& state) {
  state.counters["per disk"] =
      benchmark::Counter(static_cast<double>(state.range(0)) * static_cast<double>(state.iterations()),
                         benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

}  // namespace Bench
