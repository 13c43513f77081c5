// Listing a big folder of each service against what cannot be avoided: transfer and parse of the
// same pages, which are held until the last one has come, as the items of a listing are.
#include <benchmark/benchmark.h>

#include "cloud_replay.h"

namespace {

const bench::RecordedListing& Listing(const bench::Service& service, unsigned items) {
    static std::map<std::pair<std::string, unsigned>, std::unique_ptr<bench::RecordedListing>>
        listings;
    auto& listing = listings[{service.name, items}];
    if (listing == nullptr) {
        listing = std::make_unique<bench::RecordedListing>(service, items);
    }
    return *listing;
}

void Count(benchmark::State& state) {
    state.counters["per_entry"] = benchmark::Counter(
        static_cast<double>(state.range(0)) * static_cast<double>(state.iterations()),
        benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

void List(benchmark::State& state, const bench::Service& service) {
    const bench::RecordedListing& listing = Listing(service, static_cast<unsigned>(state.range(0)));
    for (auto _ : state) {
        const auto driver = listing.MakeDriver();
        Json::Value out;
        if (!driver || !listing.List(*driver, out)) {
            state.SkipWithError("not listed");
            break;
        }
    }
    Count(state);
}

void List_bare(benchmark::State& state, const bench::Service& service) {
    const bench::Replay& replay = Listing(service, static_cast<unsigned>(state.range(0))).Pages();
    for (auto _ : state) {
        if (!bench::TransferAndParse(replay)) {
            state.SkipWithError("not transferred");
            break;
        }
    }
    Count(state);
}

void Register(const std::string& name, void (*call)(benchmark::State&, const bench::Service&),
              const bench::Service& service) {
    benchmark::RegisterBenchmark(name.c_str(), call, service)
        ->Arg(1000)
        ->Arg(10000)
        ->Arg(100000)
        ->Unit(benchmark::kMillisecond);
}

}  // namespace

int main(int argc, char** argv) {
    for (const bench::Service& service : bench::Services()) {
        const std::string name = std::string("list_") + service.name;
        Register(name, List, service);
        Register(name + "_bare", List_bare, service);
    }
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
