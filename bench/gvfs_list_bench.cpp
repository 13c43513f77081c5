// Listing a big folder of each service into the cache of a gvfs backend, against transfer and parse
// of the same pages. A cache of its own for each listing, as a mount begins with one.
#include <benchmark/benchmark.h>

#include <cstring>

#include "gvfs_services.h"

namespace {

using bench::RecordedListing;
using bench::Service;

const RecordedListing& Listing(const Service& service, unsigned items) {
    static std::map<std::pair<std::string, unsigned>, std::unique_ptr<RecordedListing>> listings;
    auto& listing = listings[{service.name, items}];
    if (listing == nullptr) {
        listing = std::make_unique<RecordedListing>(service, items);
    }
    return *listing;
}

void Count(benchmark::State& state) {
    state.counters["per_entry"] = benchmark::Counter(
        static_cast<double>(state.range(0)) * static_cast<double>(state.iterations()),
        benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

void List(benchmark::State& state, const Service& service) {
    bench::Connect(service, Listing(service, static_cast<unsigned>(state.range(0))));
    for (auto _ : state) {
        bench::UniqueCache cache = bench::MakeCache();
        if (bench::ListTop(service, cache.get()) != state.range(0)) {
            state.SkipWithError("not listed");
            break;
        }
        // The end of a cache is no part of a listing.
        state.PauseTiming();
        cache.reset();
        state.ResumeTiming();
    }
    Count(state);
}

void List_bare(benchmark::State& state, const Service& service) {
    const bench::Replay& replay = Listing(service, static_cast<unsigned>(state.range(0))).Pages();
    for (auto _ : state) {
        if (!bench::TransferAndParse(replay)) {
            state.SkipWithError("not transferred");
            break;
        }
    }
    Count(state);
}

void Register(const std::string& name, void (*call)(benchmark::State&, const Service&),
              const Service& service) {
    auto* const registered = benchmark::RegisterBenchmark(name.c_str(), call, service)
                                 ->Arg(1000)
                                 ->Arg(10000)
                                 ->Unit(benchmark::kMillisecond);
    // A backend gets Google's items in pages of 100: the simulation takes long to record 1,000.
    if (strcmp(service.name, "google") != 0) {
        registered->Arg(100000);
    }
}

}  // namespace

int main(int argc, char** argv) {
    for (const Service& any : bench::Services()) {
        const Service& service = bench::AsBackendsList(any.name);
        const std::string name = std::string("gvfs_list_") + service.name;
        Register(name, List, service);
        Register(name + "_bare", List_bare, service);
    }
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
