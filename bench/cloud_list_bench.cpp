// Listing a big folder of each service, by its driver and by the flat function that fills a
// backend's cache, against what neither can avoid: transfer and parse of the same pages, which are
// held until the last one has come, as the items of a listing are.
#include <benchmark/benchmark.h>

#include <cstring>

#include "gvfs_services.h"

namespace {

using bench::RecordedListing;
using bench::Service;

/** The service and the folder's size decide what is recorded: callers ask for pages of their own.
 */
const RecordedListing& Listing(const Service& service, const benchmark::State& state) {
    static std::map<std::pair<const Service*, unsigned>, std::unique_ptr<RecordedListing>> listings;
    const auto items = static_cast<unsigned>(state.range(0));
    auto& listing = listings[{&service, items}];
    if (listing == nullptr) {
        listing = std::make_unique<RecordedListing>(service, items);
    }
    return *listing;
}

/** Has `once`, which answers bool, list the folder again and again. */
template <typename Once>
void Repeat(benchmark::State& state, Once once) {
    for (auto _ : state) {
        if (!once()) {
            state.SkipWithError("not listed");
            break;
        }
    }
    state.counters["per_entry"] = benchmark::Counter(
        static_cast<double>(state.range(0)) * static_cast<double>(state.iterations()),
        benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

void ByDriver(benchmark::State& state, const Service& service) {
    const RecordedListing& listing = Listing(service, state);
    Repeat(state, [&] {
        const auto driver = listing.MakeDriver();
        Json::Value out;
        return driver != nullptr && listing.List(*driver, out);
    });
}

/** A cache of its own for each listing, as a mount begins with one. */
void IntoCache(benchmark::State& state, const Service& service) {
    bench::Connect(service, Listing(service, state));
    Repeat(state, [&] {
        bench::UniqueCache cache = bench::MakeCache();
        const bool listed = bench::ListTop(service, cache.get()) == state.range(0);
        // The end of a cache is no part of a listing.
        state.PauseTiming();
        cache.reset();
        state.ResumeTiming();
        return listed;
    });
}

void Bare(benchmark::State& state, const Service& service) {
    const bench::Replay& replay = Listing(service, state).Pages();
    Repeat(state, [&] { return bench::TransferAndParse(replay); });
}

using Call = void (*)(benchmark::State&, const Service&);

void Register(const std::string& name, Call call, const Service& service, int most) {
    for (const Call each : {call, static_cast<Call>(Bare)}) {
        auto* const registered = benchmark::RegisterBenchmark(
            (each == call ? name : name + "_bare").c_str(), each, service);
        for (int items = 1000; items <= most; items *= 10) {
            registered->Arg(items);
        }
        registered->Unit(benchmark::kMillisecond);
    }
}

}  // namespace

int main(int argc, char** argv) {
    for (const Service& service : bench::Services()) {
        const std::string name = service.name;
        Register("list_" + name, ByDriver, service, 100000);
        // A backend gets Google's items in pages of 100: the simulation takes long to record more.
        Register("gvfs_list_" + name, IntoCache, bench::AsBackendsList(name),
                 name == "google" ? 10000 : 100000);
    }
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
