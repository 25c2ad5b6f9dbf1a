// What a deadline costs over the clock read it is made of.

#include "kt48api/internal.h"

#include <benchmark/benchmark.h>

#include <time.h>

namespace {

void BM_AddMsecToCurrenttime(benchmark::State &state) {
    timespec deadline{};
    for (auto _ : state) {
        int rc = AddMsecToCurrenttime(&deadline, 1500);
        benchmark::DoNotOptimize(rc);
        benchmark::DoNotOptimize(deadline);
    }
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_AddMsecToCurrenttime);

void BM_ClockGettimeMonotonic(benchmark::State &state) {
    timespec now{};
    for (auto _ : state) {
        int rc = clock_gettime(CLOCK_MONOTONIC, &now);
        benchmark::DoNotOptimize(rc);
        benchmark::DoNotOptimize(now);
    }
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_ClockGettimeMonotonic);

}  // namespace
