// How the measurements are named: ROW/ours/SIZE and ROW/limit/SIZE, which scripts/bench pairs.
#ifndef BENCH_BENCH_NAMES_H
#define BENCH_BENCH_NAMES_H

#include <benchmark/benchmark.h>
#include <string>

template <typename Ours, typename Limit>
void BenchPair(const std::string &row, const std::vector<int64_t> &sizes, Ours ours, Limit limit) {
    for (const int64_t size : sizes) {
        benchmark::RegisterBenchmark((row + "/ours").c_str(), ours)->Arg(size)->UseRealTime();
        benchmark::RegisterBenchmark((row + "/limit").c_str(), limit)->Arg(size)->UseRealTime();
    }
}

#endif
