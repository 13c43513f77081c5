// The store against bare jsoncpp doing the same to the same file: parse; parse, change, write anew.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <json/reader.h>
#include <json/writer.h>
#include <unistd.h>

#include <memory>
#include <sstream>

#include "profiles.h"

namespace {

using namespace ZYROVFS::Server;

std::string FilePath() {
    std::string path;
    CfgGetPath(bench::kUid, VFS_CONFIG_SERVER, path);
    return path;
}

Json::Value BareRead(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    const std::string all = text.str();
    Json::Value document;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    reader->parse(all.data(), all.data() + all.size(), &document, nullptr);
    return document;
}

void BareWrite(const Json::Value& document, const std::string& path) {
    Json::StreamWriterBuilder rules;
    rules["indentation"] = "";
    rules["emitUTF8"] = true;
    const std::string text = Json::writeString(rules, document);
    std::string fresh = path + ".XXXXXX";
    const int fd = mkostemp(fresh.data(), O_CLOEXEC);
    if (write(fd, text.data(), text.size()) != static_cast<ssize_t>(text.size()) ||
        fsync(fd) != 0 || close(fd) != 0 || rename(fresh.c_str(), path.c_str()) != 0) {
        std::abort();
    }
}

void GetByID(benchmark::State& state) {
    bench::Fill(static_cast<int>(state.range(0)));
    Json::Value profile;
    for (auto _ : state) {
        if (!CfgGetByID(bench::kUid, VFS_CONFIG_SERVER, bench::Id(3).c_str(), profile)) {
            state.SkipWithError("not found");
        }
    }
}

void GetByID_bare(benchmark::State& state) {
    bench::Fill(static_cast<int>(state.range(0)));
    const std::string path = FilePath();
    for (auto _ : state) {
        const Json::Value document = BareRead(path);
        Json::Value profile = document["servers"][bench::Id(3)];
        benchmark::DoNotOptimize(profile);
    }
}

void SetByID(benchmark::State& state) {
    bench::Fill(static_cast<int>(state.range(0)));
    const Json::Value profile = bench::Profile(3, "");
    for (auto _ : state) {
        std::string id = bench::Id(3);
        if (!CfgSetByID(bench::kUid, VFS_CONFIG_SERVER, id, id, profile)) {
            state.SkipWithError("not written");
        }
    }
}

void SetByID_bare(benchmark::State& state) {
    bench::Fill(static_cast<int>(state.range(0)));
    const Json::Value profile = bench::Profile(3, "");
    const std::string path = FilePath();
    for (auto _ : state) {
        Json::Value document = BareRead(path);
        document["servers"][bench::Id(3)] = profile;
        BareWrite(document, path);
    }
}

// Appending needs a place that is free each time, so each round deletes as well: two of each.
void AppendAndDelete(benchmark::State& state) {
    bench::Fill(static_cast<int>(state.range(0)));
    const Json::Value profile = bench::Profile(9999, "");
    const std::string id = bench::Id(9999);
    for (auto _ : state) {
        if (!CfgAppend(bench::kUid, VFS_CONFIG_SERVER, id.c_str(), profile) ||
            !CfgDeleteByID(bench::kUid, VFS_CONFIG_SERVER, id.c_str())) {
            state.SkipWithError("not written");
        }
    }
}

void AppendAndDelete_bare(benchmark::State& state) {
    bench::Fill(static_cast<int>(state.range(0)));
    const Json::Value profile = bench::Profile(9999, "");
    const std::string id = bench::Id(9999);
    const std::string path = FilePath();
    for (auto _ : state) {
        Json::Value document = BareRead(path);
        document["servers"][id] = profile;
        BareWrite(document, path);
        document = BareRead(path);
        document["servers"].removeMember(id);
        BareWrite(document, path);
    }
}

}  // namespace

BENCHMARK(GetByID)->Arg(10)->Arg(100)->Arg(500);
BENCHMARK(GetByID_bare)->Arg(10)->Arg(100)->Arg(500);
BENCHMARK(SetByID)->Arg(10)->Arg(100)->Arg(500);
BENCHMARK(SetByID_bare)->Arg(10)->Arg(100)->Arg(500);
BENCHMARK(AppendAndDelete)->Arg(10)->Arg(100)->Arg(500);
BENCHMARK(AppendAndDelete_bare)->Arg(10)->Arg(100)->Arg(500);
