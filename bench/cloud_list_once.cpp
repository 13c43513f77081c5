// bench_cloud_list_once COUNT SERVICE...: lists a folder of that many items, and tells what the
// items take of memory and what the listing took at its peak.
#include <malloc.h>

#include <cstdio>
#include <cstdlib>

#include "cloud_replay.h"

namespace {

size_t Held() {
    const struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

bool Measure(const bench::Service& service, unsigned items) {
    const bench::RecordedListing listing(service, items);
    const auto driver = listing.MakeDriver();
    Json::Value out;
    bench::ResetPeak();
    const size_t held = Held();
    const long peak = bench::PeakMemory();
    if (!driver || !listing.List(*driver, out)) {
        std::fprintf(stderr, "not listed: %s\n", service.name);
        return false;
    }
    const size_t after = Held();
    std::printf("  %-9s %u items in %zu pages: %zu bytes an item, peak %ld bytes an item\n",
                service.name, items, listing.Pages().Exchanges().size(), (after - held) / items,
                ((bench::PeakMemory() - peak) << 10) / static_cast<long>(items));
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    bool good = argc > 2;
    for (int i = 2; i < argc; ++i) {
        good = Measure(bench::FindService(argv[i]),
                       static_cast<unsigned>(std::strtoul(argv[1], nullptr, 10))) &&
               good;
    }
    return good ? 0 : 1;
}
