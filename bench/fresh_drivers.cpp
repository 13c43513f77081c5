// 1,000 changes over TLS by the flat functions that backends call, each of which makes a driver
// from the stored profile, against one libcurl handle that is reused for the same requests; and a
// few with no connection kept:
//   bench_fresh_drivers [ROUNDS [CALLS]]
// CPU is that of the calling thread; the simulated service has threads of its own.
#include <curl/curl.h>
#include <sys/resource.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

#include "profiles.h"
#include "tls_box.h"
#include "zyrovfs/error.h"
#include "zyrovfs/zyrocloud.h"

namespace {

using bench::TlsBox;

/** What three calls change: each takes a file of its own. */
struct Target {
    std::string folder;  ///< to be made
    std::string file;    ///< id, to be renamed and deleted
    std::string name;
};

/** One way to make the three changes; false ends the program. */
using Change = std::function<bool(const Target&)>;

[[noreturn]] void Fail(const std::string& text) {
    std::fprintf(stderr, "%s, code %d\n", text.c_str(), ZYROVFS::GetError());
    std::exit(1);
}

bool ByFreshDrivers(const Target& target) {
    const char* const id = TlsBox::kServerId;
    const std::string file = "files/" + target.file;
    int err = 0;
    return ZYROCloud_Cloud_CreateFolder(id, "", "folders/0", target.folder.c_str(), &err) != 0 &&
           ZYROCloud_Cloud_Rename(id, "", file.c_str(), target.name.c_str(), &err) != 0 &&
           ZYROCloud_Cloud_Delete(id, "", file.c_str(), &err) != 0;
}

bool WithoutKeptConnections(const Target& target) {
    const bool done = ByFreshDrivers(target);
    ZYROCloud_Cloud_CleanupCurlGlobal();
    ZYROCloud_Cloud_InitCurlGlobal();
    return done;
}

class Bare {
  public:
    explicit Bare(TlsBox& box)
        : host_(box.Host()),
          headers_(curl_slist_append(nullptr, ("Authorization: Bearer " + box.Token()).c_str())) {
        headers_ = curl_slist_append(headers_, "Content-Type: application/json");
    }
    Bare(const Bare&) = delete;
    Bare& operator=(const Bare&) = delete;
    ~Bare() {
        curl_easy_cleanup(curl_);
        curl_slist_free_all(headers_);
    }

    bool Make(const Target& target) {
        const std::string file = "/2.0/files/" + target.file;
        return Send("POST", "/2.0/folders",
                    R"({"name":")" + target.folder + R"(","parent":{"id":"0"}})") &&
               Send("PUT", file, R"({"name":")" + target.name + R"("})") &&
               Send("DELETE", file + "?recursive=true", "");
    }

  private:
    static size_t Append(char* data, size_t size, size_t count, void* out) {
        static_cast<std::string*>(out)->append(data, size * count);
        return size * count;
    }

    bool Send(const char* method, const std::string& path, const std::string& body) {
        answer_.clear();
        curl_easy_reset(curl_);
        curl_easy_setopt(curl_, CURLOPT_URL, (host_ + path).c_str());
        curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, headers_);
        curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, Append);
        curl_easy_setopt(curl_, CURLOPT_WRITEDATA, &answer_);
        curl_easy_setopt(curl_, CURLOPT_FAILONERROR, 1L);
        if (!body.empty()) {
            curl_easy_setopt(curl_, CURLOPT_COPYPOSTFIELDS, body.c_str());
        }
        curl_easy_setopt(curl_, CURLOPT_CUSTOMREQUEST, method);
        return curl_easy_perform(curl_) == CURLE_OK;
    }

    const std::string host_;
    CURL* curl_ = curl_easy_init();
    curl_slist* headers_;
    std::string answer_;
};

struct Cost {
    double cpu;  ///< seconds
    double wall;
    size_t connections;
};

double ThreadCpu() {
    rusage usage{};
    getrusage(RUSAGE_THREAD, &usage);
    const auto seconds = [](const timeval& t) {
        return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_usec) * 1e-6;
    };
    return seconds(usage.ru_utime) + seconds(usage.ru_stime);
}

std::vector<Target> Prepare(TlsBox& box, size_t count) {
    static size_t number = 0;
    cloudsim::Account& amy = box.Amy();
    for (const cloudsim::Item& item : amy.List(amy.Root())) {
        amy.Remove(item.id);
    }
    amy.AddMany(amy.Root(), count, 1);
    std::vector<Target> targets;
    for (const cloudsim::Item& item : amy.List(amy.Root())) {
        const std::string text = std::to_string(number++);
        targets.push_back({"folder " + text, item.id, "file " + text});
    }
    return targets;
}

Cost Measure(TlsBox& box, size_t calls, const Change& change) {
    const std::vector<Target> targets = Prepare(box, calls / 3);
    const size_t connections = box.Connections();
    const auto begin = std::chrono::steady_clock::now();
    const double cpu = ThreadCpu();
    for (const Target& target : targets) {
        if (!change(target)) {
            Fail("a change failed");
        }
    }
    const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - begin;
    return {ThreadCpu() - cpu, wall.count(), box.Connections() - connections};
}

double Median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    return values[values.size() / 2];
}

void Print(const char* name, const std::vector<Cost>& costs, size_t calls) {
    std::vector<double> cpu;
    std::vector<double> wall;
    size_t connections = 0;
    for (const Cost& cost : costs) {
        cpu.push_back(cost.cpu * 1e6 / static_cast<double>(calls));
        wall.push_back(cost.wall * 1e6 / static_cast<double>(calls));
        connections = std::max(connections, cost.connections);
    }
    std::printf("  %-28s cpu %8.1f us  wall %8.1f us a call   connections at most %zu\n", name,
                Median(cpu), Median(wall), connections);
}

double Ratio(const std::vector<Cost>& ours, const std::vector<Cost>& theirs) {
    std::vector<double> ratios;
    for (size_t i = 0; i < ours.size(); ++i) {
        ratios.push_back(ours[i].cpu / theirs[i].cpu);
    }
    return Median(ratios);
}

}  // namespace

int main(int argc, char** argv) {
    constexpr size_t kUnkept = 30;
    const int rounds = argc > 1 ? std::atoi(argv[1]) : 9;
    const size_t calls = argc > 2 ? std::strtoul(argv[2], nullptr, 10) : 999;
    TlsBox box;
    if (!bench::StoreCloud(TlsBox::kServerId, "box", box.Token())) {
        Fail("the profile cannot be stored");
    }
    setenv("ZYROVFS_UID", std::to_string(bench::kUid).c_str(), 1);
    ZYROCloud_Cloud_InitCurlGlobal();
    std::vector<Cost> fresh, bare, unkept;
    for (int i = 0; i < rounds; ++i) {
        Bare handle(box);
        fresh.push_back(Measure(box, calls, ByFreshDrivers));
        bare.push_back(Measure(box, calls, [&](const Target& t) { return handle.Make(t); }));
        unkept.push_back(Measure(box, kUnkept, WithoutKeptConnections));
    }
    Print("fresh drivers", fresh, calls);
    Print("one reused handle", bare, calls);
    Print("no connection kept", unkept, kUnkept);
    std::printf("  fresh drivers against one reused handle: cpu %.2f\n", Ratio(fresh, bare));
    ZYROCloud_Cloud_CleanupCurlGlobal();
    return 0;
}
