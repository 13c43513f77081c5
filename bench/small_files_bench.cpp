// 2,000 files of 4 KiB through one driver object, over TLS with verification, against one libcurl
// handle that is reused for the same requests. A driver that did not keep its connections would
// load the CA bundle anew for each file.
#include <benchmark/benchmark.h>
#include <curl/curl.h>
#include <json/value.h>

#include <memory>
#include <string>
#include <vector>

#include "tls_box.h"
#include "zyrovfs/cloud_utils.h"

namespace {

using ZYROCloud::Cloud;

constexpr size_t kFiles = 2000;
constexpr long long kSize = 4096;

/** The simulated service with its files. */
class Account {
  public:
    Account() {
        cloudsim::Account& amy = box_.Amy();
        amy.AddMany(amy.Root(), kFiles, kSize);
        for (const cloudsim::Item& item : amy.List(amy.Root())) {
            urls_.push_back(box_.Host() + "/2.0/files/" + item.id + "/content");
        }
    }

    const std::vector<std::string>& Urls() const { return urls_; }
    const std::string& Token() const { return box_.Token(); }
    size_t Connections() const { return box_.Connections(); }

  private:
    bench::TlsBox box_;
    std::vector<std::string> urls_;
};

Account& TheAccount() {
    static Account account;
    return account;
}

/** One handshake per host is what there should be: the API's and that of the content. */
void Count(benchmark::State& state, size_t before) {
    state.counters["connections"] = static_cast<double>(TheAccount().Connections() - before) /
                                    static_cast<double>(state.iterations());
    state.counters["per_entry"] =
        benchmark::Counter(static_cast<double>(kFiles) * static_cast<double>(state.iterations()),
                           benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

void SmallFiles(benchmark::State& state) {
    const Account& account = TheAccount();
    const size_t before = account.Connections();
    Json::Value profile;
    profile["access_token"] = account.Token();
    profile["server_id"] = bench::TlsBox::kServerId;
    char buffer[kSize + 1];
    for (auto _ : state) {
        const std::unique_ptr<Cloud> box(
            ZYROCloud::Utils::CreateCloudByConfig(ZYROCloud::CLOUD_TYPE_BOX, 0, profile));
        for (const std::string& url : account.Urls()) {
            long long got = 0;
            if (!Cloud::DownloadFileToBuffer(box.get(), url, buffer, 0, kSize, &got, nullptr,
                                             nullptr, nullptr) ||
                got != kSize) {
                state.SkipWithError("not downloaded");
                return;
            }
        }
    }
    Count(state, before);
}

size_t Append(char* data, size_t size, size_t count, void* out) {
    static_cast<std::string*>(out)->append(data, size * count);
    return size * count;
}

void SmallFiles_bare(benchmark::State& state) {
    const Account& account = TheAccount();
    const size_t before = account.Connections();
    const std::string authorization = "Authorization: Bearer " + account.Token();
    const std::string range = "0-" + std::to_string(kSize);
    for (auto _ : state) {
        const std::unique_ptr<CURL, void (*)(CURL*)> curl(curl_easy_init(), curl_easy_cleanup);
        curl_slist* const headers = curl_slist_append(nullptr, authorization.c_str());
        std::string body;
        curl_easy_setopt(curl.get(), CURLOPT_HTTPHEADER, headers);
        curl_easy_setopt(curl.get(), CURLOPT_RANGE, range.c_str());
        curl_easy_setopt(curl.get(), CURLOPT_FOLLOWLOCATION, 1L);
        curl_easy_setopt(curl.get(), CURLOPT_WRITEFUNCTION, Append);
        curl_easy_setopt(curl.get(), CURLOPT_WRITEDATA, &body);
        for (const std::string& url : account.Urls()) {
            body.clear();
            curl_easy_setopt(curl.get(), CURLOPT_URL, url.c_str());
            if (curl_easy_perform(curl.get()) != CURLE_OK || body.size() != size_t{kSize}) {
                state.SkipWithError("not downloaded");
                break;
            }
        }
        curl_slist_free_all(headers);
    }
    Count(state, before);
}

}  // namespace

BENCHMARK(SmallFiles)->Unit(benchmark::kMillisecond);
BENCHMARK(SmallFiles_bare)->Unit(benchmark::kMillisecond);
