// Listing a big Box folder against what cannot be avoided: transfer and parse of the same pages,
// which are held until the last one has come, as the items of a listing are.
#include <benchmark/benchmark.h>
#include <json/reader.h>
#include <json/value.h>

#include <vector>

#include "box_pages.h"

namespace {

const bench::PageServer& Server(unsigned items) {
    static std::map<unsigned, std::unique_ptr<bench::PageServer>> servers;
    servers.clear();  // the last one made is the one that drivers ask
    servers[items] = std::make_unique<bench::PageServer>(bench::RecordPages(items));
    return *servers[items];
}

void Count(benchmark::State& state) {
    state.counters["per_entry"] = benchmark::Counter(
        static_cast<double>(state.range(0)) * static_cast<double>(state.iterations()),
        benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

void ListBox(benchmark::State& state) {
    const auto items = static_cast<unsigned>(state.range(0));
    Server(items);
    for (auto _ : state) {
        const auto box = bench::MakeBox();
        Json::Value out;
        if (!box || !box->ListFolder("", Json::Value(), out) || out.size() != items) {
            state.SkipWithError("not listed");
            break;
        }
    }
    Count(state);
}

void ListBox_bare(benchmark::State& state) {
    const auto items = static_cast<unsigned>(state.range(0));
    const bench::PageServer& server = Server(items);
    Json::CharReaderBuilder rules;
    rules["collectComments"] = false;
    for (auto _ : state) {
        const std::unique_ptr<CURL, void (*)(CURL*)> curl(curl_easy_init(), curl_easy_cleanup);
        unsigned count = 0;
        std::string body;
        std::vector<Json::Value> pages;
        for (unsigned offset = 0; offset < items; offset += bench::kPageSize) {
            Json::Value page;
            const std::unique_ptr<Json::CharReader> reader(rules.newCharReader());
            if (!bench::Fetch(curl.get(), server.Url(offset), body) ||
                !reader->parse(body.data(), body.data() + body.size(), &page, nullptr)) {
                break;
            }
            count += page["entries"].size();
            pages.push_back(std::move(page));
        }
        if (count != items) {
            state.SkipWithError("not listed");
            break;
        }
    }
    Count(state);
}

}  // namespace

BENCHMARK(ListBox)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond);
BENCHMARK(ListBox_bare)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond);
