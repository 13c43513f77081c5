// bench_gvfs_list_once COUNT SERVICE...: lists a folder of that many items into a cache, and tells
// what the cache keeps of an item and what the listing took at its peak, beside that of the driver.
#include <malloc.h>

#include <cstdio>
#include <cstdlib>

#include "gvfs_services.h"

namespace {

size_t Held() {
    const struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

/** Bytes an item that `list` takes at its peak; -1 when it fails. */
template <typename List>
long PeakOf(long items, List list) {
    bench::ResetPeak();
    const long before = bench::PeakMemory();
    return list() ? ((bench::PeakMemory() - before) << 10) / items : -1;
}

bool Measure(const bench::Service& service, unsigned items) {
    const bench::RecordedListing listing(service, items);
    auto driver = listing.MakeDriver();
    const long bare = PeakOf(items, [&] {
        Json::Value out;
        return driver != nullptr && listing.List(*driver, out);
    });
    driver.reset();
    bench::Connect(service, listing);
    const bench::UniqueCache cache = bench::MakeCache();
    const size_t held = Held();
    const long peak = PeakOf(items, [&] { return bench::ListTop(service, cache.get()) == items; });
    if (bare < 0 || peak < 0) {
        std::fprintf(stderr, "not listed: %s\n", service.name);
        return false;
    }
    std::printf("  %-9s %u items: %zu bytes kept an item, peak %ld, the driver's listing %ld\n",
                service.name, items, (Held() - held) / items, peak, bare);
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    bool good = argc > 2;
    for (int i = 2; i < argc; ++i) {
        good = Measure(bench::AsBackendsList(argv[i]),
                       static_cast<unsigned>(std::strtoul(argv[1], nullptr, 10))) &&
               good;
    }
    return good ? 0 : 1;
}
