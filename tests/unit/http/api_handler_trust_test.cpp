// No connection and no TLS session outlives the trust that it was made with.
#include <functional>

#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"
#include "unit/mount/ssl_fixture.h"

namespace ZYROCloud {
namespace {

constexpr uid_t kBob = 4568;

/** A server whose connections stay. */
tls::ServerOptions Open(const tls::Identity& identity) {
    tls::ServerOptions options;
    options.identity = identity;
    options.manner = tls::Manner::kKeepOpen;
    return options;
}

class Trust : public SslPeer {
  protected:
    void SetUp() override {
        curl_seam::Now() = {};
        SslPeer::SetUp();
        HandlePool::Instance().Empty();
        share_ = curl_share_init();
        curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS);
        curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
    }
    void TearDown() override {
        curl_seam::Now() = {};
        HandlePool::Instance().Empty();
        EXPECT_EQ(curl_share_cleanup(share_), CURLSHE_OK);
    }

    /** One request by a driver that lives no longer. */
    bool Fetch(const tls::TlsServer& server, bool expect = true) {
        APIHandler api(share_);
        if (expect) {
            api.ExpectVFSURL(Davs(server), "amy", "password");
        }
        return Fetch(api, server);
    }

    static bool Fetch(APIHandler& api, const tls::TlsServer& server) {
        api.SetErrorHandler(new DavErrorHandler);
        if (!api.Init() || !api.SetUserPwOpt("amy", "password")) {
            return false;
        }
        api.SetVFSURL(Davs(server));
        return api.Process(0);
    }

    static long NewConnections(APIHandler& api) {
        long number = -1;
        curl_easy_getinfo(api.GetCurlHandler(), CURLINFO_NUM_CONNECTS, &number);
        return number;
    }

    CURLSH* share_ = nullptr;
};

TEST_F(Trust, AKeptConnectionOfAPinnedServerIsUsedAgainWhileThePinStands) {
    const tls::TlsServer server(Open(own_));
    Save(server, own_.certificate);
    EXPECT_TRUE(Fetch(server)) << seams::LogDump();
    APIHandler api(share_);
    api.ExpectVFSURL(Davs(server), "amy", "password");
    EXPECT_TRUE(Fetch(api, server));
    EXPECT_EQ(NewConnections(api), 0);
}

TEST_F(Trust, APinThatWasRemovedEndsTheTrust) {
    for (const bool expect : {true, false}) {
        const tls::TlsServer server(Open(own_));
        Save(server, own_.certificate);
        APIHandler api(share_);
        EXPECT_TRUE(Fetch(api, server)) << seams::LogDump();
        EXPECT_TRUE(Fetch(server));
        unlink(File(server).c_str());
        EXPECT_FALSE(Fetch(api, server)) << "in a driver that had a connection";
        EXPECT_FALSE(Fetch(server, expect)) << "in another driver";
        EXPECT_EQ(server.Requests().size(), 2U);
    }
}

TEST_F(Trust, APinThatWasChangedEndsTheTrust) {
    for (const bool expect : {true, false}) {
        const tls::TlsServer server(Open(own_));
        Save(server, own_.certificate);
        APIHandler api(share_);
        EXPECT_TRUE(Fetch(api, server)) << seams::LogDump();
        EXPECT_TRUE(Fetch(server));
        Save(server, tls::Make({}).certificate);
        EXPECT_FALSE(Fetch(api, server));
        EXPECT_FALSE(Fetch(server, expect));
        EXPECT_EQ(server.Requests().size(), 2U);
        Save(server, own_.certificate);
        EXPECT_TRUE(Fetch(api, server)) << "and comes back with the pin";
        EXPECT_TRUE(Fetch(server));
    }
}

TEST_F(Trust, APinOfOneUserIsNoPinOfAnother) {
    for (const bool expect : {true, false}) {
        const tls::TlsServer server(Open(own_));
        Save(server, own_.certificate);
        APIHandler api(share_);
        EXPECT_TRUE(Fetch(api, server));
        EXPECT_TRUE(Fetch(server));
        setenv("ZYROVFS_UID", std::to_string(kBob).c_str(), 1);
        EXPECT_FALSE(Fetch(api, server));
        EXPECT_FALSE(Fetch(server, expect));
        EXPECT_EQ(server.Requests().size(), 2U);
        setenv("ZYROVFS_UID", std::to_string(kAmy).c_str(), 1);
    }
}

TEST_F(Trust, ALinkThatWasRemovedOrBecameAPinEndsTheTrust) {
    const tls::TlsServer server(Open(signed_));
    for (const std::string& text : {std::string(), tls::Make({}).certificate}) {
        const size_t before = server.Requests().size();
        fs::create_directories(folder_);
        fs::create_symlink(paths::kCaBundle, File(server));
        APIHandler api(share_);
        EXPECT_TRUE(Fetch(api, server)) << seams::LogDump();
        EXPECT_TRUE(Fetch(server));
        unlink(File(server).c_str());
        if (!text.empty()) {
            Save(server, text);
        }
        EXPECT_FALSE(Fetch(api, server));
        EXPECT_FALSE(Fetch(server));
        EXPECT_EQ(server.Requests().size(), before + 2);
        unlink(File(server).c_str());
    }
}

TEST_F(Trust, APinnedServerIsNotTrustedByTheServices) {
    const tls::TlsServer server(Open(own_));
    Save(server, own_.certificate);
    APIHandler api(share_);
    EXPECT_TRUE(Fetch(api, server));
    EXPECT_TRUE(api.Init());
    api.SetURL(server.Url(), false);
    EXPECT_FALSE(api.Process(0));
    Conversation<> talk;
    talk.api.SetShareCurlHandler(share_);
    EXPECT_TRUE(talk.api.Init());
    EXPECT_FALSE(talk.Get(server.Url()));
    EXPECT_EQ(server.Requests().size(), 1U);
}

/** In a process that has checked another server by the CA bundle before. */
bool AfterTheBundle(const std::function<bool()>& body) {
    const tls::TlsServer known(tls::Make({}, &Authority()));
    const fresh::Answer answer = fresh::Ask([&] {
        return Utils::VerifyCert(nullptr, nullptr, known.Url().c_str(), paths::kCaBundle) && body();
    });
    EXPECT_TRUE(answer.finished) << answer;
    return answer.ok;
}

TEST_F(Trust, APinnedServerIsTrustedByItsPinAlsoAfterAnotherWasCheckedByTheBundle) {
    const tls::TlsServer genuine(Open(own_));
    Save(genuine, own_.certificate);
    EXPECT_TRUE(AfterTheBundle([&] { return Fetch(genuine); }));
    tls::CertSpec spec;
    spec.dns_names = {"other.example"};
    for (const tls::Identity& shown : {signed_, tls::Make(spec, &Authority())}) {
        const tls::TlsServer impostor(Open(shown));
        Save(impostor, own_.certificate);
        EXPECT_FALSE(AfterTheBundle([&] { return Fetch(impostor); }));
        EXPECT_TRUE(impostor.Requests().empty());
    }
}

TEST_F(Trust, AnIpv6ServerThatTheMountTrustsIsTrustedByTheTransfer) {
    tls::ServerOptions options = Open(own_);
    options.ipv6 = true;
    const tls::TlsServer server(options);
    const std::string url = "davs://[::1]:" + std::to_string(server.Port()) + "/dav/";
    EXPECT_TRUE(
        fresh::Ask([&] { return Utils::SSLVerifyPeer(nullptr, nullptr, url.c_str(), true); }).ok);
    APIHandler api(share_);
    api.SetErrorHandler(new DavErrorHandler);
    EXPECT_TRUE(api.Init());
    api.SetVFSURL(url);
    EXPECT_TRUE(api.Process(0)) << seams::LogDump();
}

TEST_F(Trust, AServerWithoutAPortInItsAddressIsFoundUnderTheMountsName) {
    tls::ServerOptions options = Open(own_);
    options.port = 443;
    const tls::TlsServer server(options);
    EXPECT_TRUE(fresh::Ask([] {
                    return Utils::SSLVerifyPeer(nullptr, nullptr, "davs://localhost/", true);
                }).ok);
    APIHandler api(share_);
    api.SetErrorHandler(new DavErrorHandler);
    EXPECT_TRUE(api.Init());
    api.SetVFSURL("davs://localhost/file");
    EXPECT_TRUE(api.Process(0)) << seams::LogDump();
}

/** One request as to a service. */
bool Ask(const tls::TlsServer& server, CURLSH* share) {
    APIHandler api(share);
    api.SetErrorHandler(new BoxErrorHandler);
    return api.Init() && api.SetURL(server.Url(), false) && api.Process(0);
}

TEST_F(Trust, ARootThatWasRemovedFromTheBundleEndsTheTrust) {
    const tls::TlsServer server(Open(signed_));
    APIHandler held(share_);
    held.SetErrorHandler(new BoxErrorHandler);
    EXPECT_TRUE(held.Init() && held.SetURL(server.Url(), false) && held.Process(0));
    EXPECT_TRUE(Ask(server, share_)) << seams::LogDump();
    std::ofstream(paths::kCaBundle) << tls::MakeAuthority("Another CA").certificate;
    EXPECT_FALSE(Ask(server, share_));
    EXPECT_TRUE(held.Init() && held.SetURL(server.Url(), false));
    EXPECT_FALSE(held.Process(0));
    EXPECT_EQ(server.Requests().size(), 2U);
    TrustAuthority();
    EXPECT_TRUE(Ask(server, share_));
}

TEST_F(Trust, ServicesResumeTheSessionsOfOneAnother) {
    const tls::TlsServer server(Open(signed_));
    EXPECT_TRUE(Ask(server, share_));
    const std::vector<long> cached = curl_seam::Values(CURLOPT_SSL_SESSIONID_CACHE);
    EXPECT_THAT(cached, ElementsAre(1));
}

TEST_F(Trust, TheParsedBundleIsKeptSinceNoDirectoryStandsBesideIt) {
    const tls::TlsServer server(Open(signed_));
    EXPECT_TRUE(Ask(server, share_));
    const std::vector<long> paths = curl_seam::Values(CURLOPT_CAPATH);
    ASSERT_EQ(paths.size(), 2U);
    EXPECT_EQ(paths.back(), 0);
    EXPECT_NE(curl_seam::Values(CURLOPT_CA_CACHE_TIMEOUT).back(), 0);
}

TEST_F(Trust, AServerThatHasGoneDoesNotKillTheProcessWhenItsConnectionIsClosed) {
    tls::TlsServer server(Open(signed_));
    EXPECT_TRUE(Ask(server, share_));
    EXPECT_EQ(HandlePool::Instance().Idle(), 1U);
    server.Restart(signed_);
    HandlePool::Instance().Empty();
    EXPECT_TRUE(Ask(server, share_));
    server.Restart(signed_);
    EXPECT_TRUE(Ask(server, share_)) << "and a dead one is replaced";
}

}  // namespace
}  // namespace ZYROCloud
