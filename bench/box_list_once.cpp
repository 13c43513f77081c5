// box_list_once COUNT: lists a Box folder of that many items, and tells what the items take of
// memory and what the listing took at its peak.
#include <json/value.h>
#include <malloc.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>

#include "box_pages.h"

namespace {

size_t Held() {
    const struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

/** Peak of the resident memory since the last ResetPeak, in bytes. */
size_t Peak() {
    std::ifstream status("/proc/self/status");
    std::string word;
    size_t kilobytes = 0;
    while (status >> word && word != "VmHWM:") {
    }
    status >> kilobytes;
    return kilobytes << 10;
}

void ResetPeak() {
    malloc_trim(0);
    std::ofstream("/proc/self/clear_refs") << "5";
}

}  // namespace

int main(int argc, char** argv) {
    const auto items = static_cast<unsigned>(argc > 1 ? std::atoi(argv[1]) : 100000);
    const bench::PageServer server(bench::RecordPages(items));
    const auto box = bench::MakeBox();
    Json::Value out;
    ResetPeak();
    const size_t held = Held();
    const size_t peak = Peak();
    if (!box || !box->ListFolder("", Json::Value(), out) || out.size() != items) {
        std::fprintf(stderr, "not listed\n");
        return 1;
    }
    const size_t after = Held();
    std::printf("listing of %u items of Box: %zu bytes an item, peak %zu bytes an item\n", items,
                (after - held) / items, (Peak() - peak) / items);
    return 0;
}
