// Server::List of saved profiles: the cost of one entry stays what it is as the list grows.
#include <benchmark/benchmark.h>

#include "profiles.h"

namespace {

void ListProfiles(benchmark::State& state) {
    const auto count = state.range(0);
    bench::Fill(static_cast<int>(count));
    for (auto _ : state) {
        Json::Value out;
        if (!ZYROVFS::Server::List(bench::kUid, ZYROVFS::Server::VFS_CONFIG_SERVER, nullptr,
                                   "alias", true, 0, 0, out) ||
            out["total"].asInt64() != count) {
            state.SkipWithError("not listed");
        }
    }
    state.counters["per_entry"] =
        benchmark::Counter(static_cast<double>(count) * static_cast<double>(state.iterations()),
                           benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

}  // namespace

BENCHMARK(ListProfiles)->Arg(100)->Arg(500);
