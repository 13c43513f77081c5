// A server that leads on to another one: each is checked for itself, and nothing that the second
// shows is saved, or removed, under the name of the first.
#include <gmock/gmock.h>

#include "unit/mount/ssl_fixture.h"

namespace ZYROVFS {
namespace {

class Redirect : public SslPeer {
  protected:
    /** A server that answers every request with the address of `there`. */
    static tls::ServerOptions LeadsTo(const std::string& there, const tls::Identity& identity) {
        tls::ServerOptions options;
        options.identity = identity;
        options.answer = [there](const tls::Request&) {
            return tls::Response{302, {{"Location", there}}, ""};
        };
        return options;
    }

    static tls::Identity Signed(const std::string& name) {
        tls::CertSpec spec;
        spec.common_names = {name};
        spec.dns_names = {name};
        return tls::Make(spec, &Authority());
    }

    const tls::Identity other_ = tls::Make({});
};

TEST_F(Redirect, ForceSavesTheCertificateOfTheServerThatWasAskedFor) {
    for (const tls::Identity& behind : {other_, signed_}) {
        const tls::TlsServer second(behind);
        const tls::TlsServer first(LeadsTo(second.Url(), own_));
        const Answer answer = Force(Davs(first));
        EXPECT_TRUE(answer.ok) << answer;
        EXPECT_EQ(answer.code, VFS_ERR_NONE);
        EXPECT_EQ(ReadFile(File(first)), own_.certificate);
        EXPECT_FALSE(fs::exists(File(second)));
    }
}

TEST_F(Redirect, ForceSendsNothingToAnUntrustedServerBehindTheFirst) {
    const tls::TlsServer second(other_);
    const tls::TlsServer first(LeadsTo(second.Url(), own_));
    EXPECT_TRUE(Force(Davs(first)).ok);
    EXPECT_EQ(first.Requests().size(), 1U);
    EXPECT_TRUE(second.Requests().empty());
}

TEST_F(Redirect, ToAnUntrustedServerIsToldWithItsCertificateAndCostsTheFirstNothing) {
    tls::CertSpec spec;
    spec.common_names = {"second.example"};
    const tls::TlsServer second(tls::Make(spec));
    const tls::TlsServer first(LeadsTo(second.Url(), own_));
    Save(first, own_.certificate);
    const Answer answer = Ask(Davs(first));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_EQ(answer.detail["subject"], "second.example");
    EXPECT_EQ(ReadFile(File(first)), own_.certificate) << "it has not changed";
    EXPECT_TRUE(second.Requests().empty());
}

TEST_F(Redirect, OfAServerThatTheBundleKnowsToAnUntrustedOneLeavesNoLink) {
    const tls::TlsServer second(other_);
    const tls::TlsServer first(LeadsTo(second.Url(), signed_));
    EXPECT_EQ(Ask(Davs(first)).code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_THAT(Names(), testing::IsEmpty());
}

TEST_F(Redirect, OfAPinnedServerToOneThatTheBundleKnowsIsTrusted) {
    const tls::TlsServer second(signed_);
    const tls::TlsServer first(LeadsTo(second.Url(), own_));
    Save(first, own_.certificate);
    const Answer answer = Ask(Davs(first));
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(second.Requests().size(), 1U);
    EXPECT_EQ(Names().size(), 1U) << "nobody has decided about the second";
}

TEST_F(Redirect, OfAPinnedServerToACertificateForAnotherNameIsRefused) {
    const tls::TlsServer second(Signed("other.example"));
    const tls::TlsServer first(LeadsTo(second.Url(), own_));
    Save(first, own_.certificate);
    const Answer answer = Ask(Davs(first));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_TRUE(second.Requests().empty());
}

TEST_F(Redirect, ToAServerWithAPinOfItsOwnAsksForThatPin) {
    const tls::TlsServer second(other_);
    for (const tls::Identity& identity : {own_, signed_}) {
        const tls::TlsServer first(LeadsTo(second.Url(), identity));
        Save(first, identity.certificate);
        Save(second, other_.certificate);
        EXPECT_TRUE(Ask(Davs(first)).ok);
        Save(second, own_.certificate);
        const Answer answer = Ask(Davs(first));
        EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
        EXPECT_TRUE(fs::exists(File(second))) << "a redirect takes nobody's trust away";
    }
}

TEST_F(Redirect, ToAPinnedServerIsNotCheckedByThePinOfTheFirst) {
    const tls::TlsServer second(own_);
    const tls::TlsServer first(LeadsTo(second.Url(), own_));
    Save(first, own_.certificate);
    Save(second, other_.certificate);
    EXPECT_EQ(Ask(Davs(first)).code, VFS_ERR_CERT_UNTRUSTED);
}

}  // namespace
}  // namespace ZYROVFS
