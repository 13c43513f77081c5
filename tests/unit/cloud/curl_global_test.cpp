// What a process does once: each question is asked in a child of its own.
#include <curl/curl.h>
#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "cloud/handler.h"
#include "http/handle_pool.h"
#include "support/bare_driver.h"
#include "support/scratch.h"
#include "support/wire_server.h"

namespace ZYROCloud {

/** Number of the first step that did not hold, 0 for none. */
int FirstWrong(const std::vector<bool>& steps) {
    for (size_t i = 0; i < steps.size(); ++i) {
        if (!steps[i]) {
            return static_cast<int>(i) + 1;
        }
    }
    return 0;
}

TEST(CurlGlobal, BeforeItIsSetUpThereIsNothing) {
    EXPECT_EQ(nullptr, Cloud::_gShare_handle);
    EXPECT_EQ(nullptr, Cloud::_glockarray);
    EXPECT_FALSE(Cloud::_gblInitCurlGlobal);
    EXPECT_EQ(nullptr, LiveShare());
    Cloud::CleanupCurlGlobal();
    EXPECT_FALSE(Cloud::_gblInitCurlGlobal);
}

TEST(CurlGlobal, IsSetUpOnce) {
    EXPECT_EQ(0, scratch::InChild([] {
                  Cloud::InitCurlGlobal();
                  void* const share = Cloud::_gShare_handle;
                  void* const locks = Cloud::_glockarray;
                  Cloud::InitCurlGlobal();
                  return FirstWrong({share != nullptr, locks != nullptr, Cloud::_gblInitCurlGlobal,
                                     share == Cloud::_gShare_handle, locks == Cloud::_glockarray,
                                     LiveShare() == share});
              }));
}

TEST(CurlGlobal, CleanupLeavesTheShareHandleStale) {
    EXPECT_EQ(0, scratch::InChild([] {
                  Cloud::InitCurlGlobal();
                  void* const share = Cloud::_gShare_handle;
                  Cloud::CleanupCurlGlobal();
                  return FirstWrong({Cloud::_gShare_handle == share, !Cloud::_gblInitCurlGlobal,
                                     Cloud::_glockarray == nullptr});
              }));
}

TEST(CurlGlobal, AStaleShareIsKeptButNoHandlerGetsIt) {
    EXPECT_EQ(0, scratch::InChild([] {
                  Cloud::InitCurlGlobal();
                  void* const share = Cloud::_gShare_handle;
                  Cloud::CleanupCurlGlobal();
                  Cloud::InitCurlGlobal();
                  bare::PlainDriver cloud;
                  return FirstWrong({Cloud::_gShare_handle == share, LiveShare() == nullptr,
                                     Cloud::_gblInitCurlGlobal, cloud.GetAPIHandler() != nullptr,
                                     cloud.Init(), cloud.GetAPIHandler()->Init()});
              }));
}

TEST(CurlGlobal, AShareThatADriverStillHoldsOutlivesTheCleanup) {
    EXPECT_EQ(0, scratch::InChild([] {
                  Cloud::InitCurlGlobal();
                  bare::PlainDriver cloud;
                  const bool begun = cloud.Init() && cloud.GetAPIHandler()->Init();
                  Cloud::CleanupCurlGlobal();
                  return FirstWrong(
                      {begun, LiveShare() == Cloud::_gShare_handle, cloud.GetAPIHandler()->Init()});
              }));
}

/** Fetches from the server by name, so that each request looks the name up. */
bool Fetch(const std::string& url) {
    bare::PlainDriver cloud;
    APIHandler* const api = cloud.GetAPIHandler();
    return cloud.Init() && api->Init() && api->SetURL(url, false) && api->Process(0) &&
           api->GetResponse() == "hello";
}

TEST(CurlGlobal, CleanupClosesTheHandlesThatWait) {
    EXPECT_EQ(0, scratch::InChild([] {
                  Cloud::InitCurlGlobal();
                  HandlePool& pool = HandlePool::Instance();
                  {
                      bare::PlainDriver cloud;
                      cloud.GetAPIHandler()->GetCurlHandler();
                  }
                  const bool kept = pool.Idle() == 1;
                  {
                      bare::PlainDriver lent;
                      lent.GetAPIHandler()->GetCurlHandler();
                      Cloud::CleanupCurlGlobal();
                  }
                  return FirstWrong({kept, pool.Idle() == 0});
              }));
}

// For the sanitizers: without locks the common store breaks here.
TEST(CurlGlobal, TwoThreadsShareNamesAndSessions) {
    constexpr int kRequests = 40;
    const wire::Script script = {wire::ReadRequest(), wire::Send(wire::Answer(200, "hello"))};
    wire::WireServer server(std::vector<wire::Script>(2 * kRequests, script));
    const std::string url = "http://localhost:" + std::to_string(server.Port()) + "/";
    Cloud::InitCurlGlobal();
    int done[2] = {0, 0};
    std::vector<std::thread> threads;
    for (int& count : done) {
        threads.emplace_back([&count, &url] {
            for (int i = 0; i < kRequests; ++i) {
                count += Fetch(url) ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(kRequests, done[0]);
    EXPECT_EQ(kRequests, done[1]);
    Cloud::CleanupCurlGlobal();
}

}  // namespace ZYROCloud
