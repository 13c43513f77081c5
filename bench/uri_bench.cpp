// URI work, which every operation on a connection does a few times, against one bare parse and
// print.
#include <benchmark/benchmark.h>
#include <libsoup/soup.h>

#include <string>

#include "zyrovfs/utils.h"

namespace {

constexpr const char* kUri = "sftp://amy@nas.example:2222/documents/2026/letter.odt";

void URIParts(benchmark::State& state) {
    std::string base;
    std::string rest;
    for (auto _ : state) {
        if (!ZYROVFS::Utils::GetURIParts(kUri, base, rest)) {
            state.SkipWithError("not parsed");
        }
    }
}

void URIParts_bare(benchmark::State& state) {
    for (auto _ : state) {
        SoupURI* uri = soup_uri_new(kUri);
        soup_uri_set_path(uri, "");
        char* text = soup_uri_to_string(uri, FALSE);
        benchmark::DoNotOptimize(text);
        g_free(text);
        soup_uri_free(uri);
    }
}

void HostWithPort(benchmark::State& state) {
    std::string host;
    for (auto _ : state) {
        if (!ZYROVFS::Utils::GetHostWithPort(kUri, host)) {
            state.SkipWithError("not parsed");
        }
    }
}

}  // namespace

BENCHMARK(URIParts);
BENCHMARK(URIParts_bare);
BENCHMARK(HostWithPort);
