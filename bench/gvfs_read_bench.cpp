// 200 pieces of 64 KiB from one open file of each service, against one libcurl handle that is used
// again for the same requests. CPU is that of the reading thread; the service has its own.
#include <benchmark/benchmark.h>

#include <json/reader.h>

#include <cstring>
#include <map>
#include <sstream>

#include "gvfs_services.h"

namespace {

using bench::Service;

constexpr long long kPiece = 65536;
constexpr long long kPieces = 200;
// Services are asked for one byte more than a piece.
constexpr long long kSize = kPieces * (kPiece + 1);
constexpr const char* kName = "item.bin";

/** One file of a service, and its record as a backend opens it. */
struct File {
    explicit File(const Service& service)
        : simulated(service), access(simulated.Grant()), server_id(bench::ServerId(service)) {
        simulated.amy->AddPattern(simulated.amy->Root(), kName, kSize);
        bench::Connect(service, access);
        const bench::UniqueCache cache = bench::MakeCache();
        const auto keep = [](GFileInfo* item, void* to) {
            *static_cast<GFileInfo**>(to) = g_file_info_dup(item);
        };
        const bench::Backend& backend = bench::FindBackend(service.name);
        backend.list(server_id.c_str(), cache.get(), backend.top, keep, &info);
    }

    std::string Id() const { return g_file_info_get_attribute_string(info, "id::file"); }

    const bench::Simulated simulated;
    const bench::Access access;
    const std::string server_id;
    GFileInfo* info = nullptr;
};

const File& FileOf(const Service& service) {
    static std::map<std::string, std::unique_ptr<File>> files;
    auto& file = files[service.name];
    if (file == nullptr) {
        file = std::make_unique<File>(service);
    }
    return *file;
}

void Read(benchmark::State& state, const Service& service) {
    const File& file = FileOf(service);
    const bench::Backend& backend = bench::FindBackend(service.name);
    bench::Connect(service, file.access);
    std::string room(kPiece + 1, '\0');
    for (auto _ : state) {
        ZYROCloud_Handle* const handle =
            ZYROCloud_Cloud_Handle_New(file.server_id.c_str(), file.Id().c_str(), file.info);
        long long all = 0;
        char* dest = room.data();
        for (long long got = 1; got > 0;) {
            got = backend.read(file.server_id.c_str(), handle, &dest, kPiece);
            all += got;
        }
        ZYROCloud_Cloud_Handle_Free(handle, nullptr);
        if (all != kSize) {
            state.SkipWithError("not read");
            break;
        }
    }
}

// --- the same by libcurl -------------------------------------------------------------------------

/** Where the bytes are, as the service's driver asks for them. */
std::string UrlOf(const Service& service, const File& file) {
    const std::string name = service.name;
    if (name == "dropbox") {
        return file.access.hosts.at("content") + "/2/files/download";
    }
    if (name == "google") {
        Json::Value description;
        std::istringstream(g_file_info_get_attribute_string(file.info, "standard::description")) >>
            description;
        return description["downloadUrl"].asString();
    }
    return file.access.hosts.at("api") + (name == "box" ? "/2.0/" : "/v5.0/") + file.Id() +
           "/content";
}

struct Received {
    std::string room = std::string(kPiece + 1, '\0');
    size_t used = 0;
};

size_t Take(char* data, size_t size, size_t count, void* to) {
    auto& received = *static_cast<Received*>(to);
    if (size * count > received.room.size() - received.used) {
        return 0;
    }
    memcpy(received.room.data() + received.used, data, size * count);
    received.used += size * count;
    return size * count;
}

void Read_bare(benchmark::State& state, const Service& service) {
    const File& file = FileOf(service);
    const bool posts = strcmp(service.name, "dropbox") == 0;
    curl_slist* headers =
        curl_slist_append(nullptr, ("Authorization: Bearer " + file.access.token).c_str());
    if (posts) {
        headers = curl_slist_append(headers, "Content-Type: application/octet-stream");
        headers = curl_slist_append(headers,
                                    ("Dropbox-API-Arg: {\"path\":\"" + file.Id() + "\"}").c_str());
    }
    for (auto _ : state) {
        const std::unique_ptr<CURL, void (*)(CURL*)> curl(curl_easy_init(), curl_easy_cleanup);
        Received received;
        curl_easy_setopt(curl.get(), CURLOPT_URL, UrlOf(service, file).c_str());
        curl_easy_setopt(curl.get(), CURLOPT_HTTPHEADER, headers);
        curl_easy_setopt(curl.get(), CURLOPT_FOLLOWLOCATION, 1L);
        curl_easy_setopt(curl.get(), CURLOPT_FAILONERROR, 1L);
        curl_easy_setopt(curl.get(), CURLOPT_WRITEFUNCTION, Take);
        curl_easy_setopt(curl.get(), CURLOPT_WRITEDATA, &received);
        if (posts) {
            // With a body of its own, libcurl would take the range for that of an upload.
            curl_easy_setopt(curl.get(), CURLOPT_CUSTOMREQUEST, "POST");
        }
        for (long long from = 0; from < kSize; from += kPiece + 1) {
            received.used = 0;
            const std::string range = std::to_string(from) + "-" + std::to_string(from + kPiece);
            curl_easy_setopt(curl.get(), CURLOPT_RANGE, range.c_str());
            if (curl_easy_perform(curl.get()) != CURLE_OK || received.used != kPiece + 1) {
                state.SkipWithError("not read");
                break;
            }
        }
    }
    curl_slist_free_all(headers);
}

}  // namespace

int main(int argc, char** argv) {
    for (const Service& any : bench::Services()) {
        const Service& service = bench::AsBackendsList(any.name);
        const std::string name = std::string("gvfs_read_") + service.name;
        benchmark::RegisterBenchmark(name.c_str(), Read, service)->Unit(benchmark::kMillisecond);
        benchmark::RegisterBenchmark((name + "_bare").c_str(), Read_bare, service)
            ->Unit(benchmark::kMillisecond);
    }
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
