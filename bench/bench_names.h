// How the measurements are named: ROW/ours/SIZE and ROW/limit/SIZE, which scripts/bench pairs.
#pragma once

#include <benchmark/benchmark.h>
#include <string>

namespace vesk {
template <typename Ours, typename Limit>
void BenchPair(const std::string &row, const std::vector<int64_t> &sizes, Ours ours, Limit limit) {
    for (const int64_t size : sizes) {
        benchmark::RegisterBenchmark((row + "/ours").c_str(), ours)->Arg(size)->UseRealTime();
        benchmark::RegisterBenchmark((row + "/limit").c_str(), limit)->Arg(size)->UseRealTime();
    }
}
} // namespace vesk
