#include "mount/server_uri.h"

#include <gtest/gtest.h>

#include "mount/glib_handle.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

TEST(ReadableUri, PlainIdsStayAsTheyAre) {
    for (const char* id :
         {"davs://amy@nas.example:5006", "davs://amy@nas.example:5006/a@b:1/c", "dav://nas:80/x@y",
          "ftp://nas", "google://amy@example.org", "google://amy@example.org/mail@home",
          "davs://am%40y@nas:1/x", "sftp://amy@[::1]:22/x", "no uri", "", "://", "ftp://@"}) {
        EXPECT_EQ(ReadableUri(id), id);
    }
}

TEST(ReadableUri, TheUserEndsWithTheLastAtInFrontOfThePath) {
    EXPECT_EQ(ReadableUri("davs://amy@example.org@nas:1"), "davs://amy%40example.org@nas:1");
    EXPECT_EQ(ReadableUri("davs://amy@example.org@nas:1/x@y:2"),
              "davs://amy%40example.org@nas:1/x@y:2");
    EXPECT_EQ(ReadableUri("ftp://@@nas:21"), "ftp://%40@nas:21");
}

TEST(ReadableUri, AnIdEndsWithHostAndPortWhateverTheUserHolds) {
    EXPECT_EQ(ReadableUri("davs://a/b@nas:1"), "davs://a%2Fb@nas:1");
    EXPECT_EQ(ReadableUri("davs://a?b@nas:1"), "davs://a%3Fb@nas:1");
    EXPECT_EQ(ReadableUri("davs://a#b@nas:1"), "davs://a%23b@nas:1");
    EXPECT_EQ(ReadableUri("davs://a@b/c@nas:1"), "davs://a%40b%2Fc@nas:1");
    EXPECT_EQ(ReadableUri("davs:///@[::1]:1"), "davs://%2F@[::1]:1");
}

TEST(ReadableUri, AUrlOfTheWebHasNoSuchUser) {
    for (const char* url :
         {"https://nas/mail@x:80", "HTTP://nas/?a@x:80", "https://amy@nas/b@x:1"}) {
        EXPECT_EQ(ReadableUri(url), url);
    }
    EXPECT_EQ(ReadableUri("https://a@b@nas/c@x:1"), "https://a%40b@nas/c@x:1");
}

TEST(ReadableUri, IsReadTheSameASecondTime) {
    for (const char* id :
         {"davs://a@b/c@nas:1", "davs://a?b#c@[fd00::1]:1", "davs://a@b@nas:1/x"}) {
        EXPECT_EQ(ReadableUri(ReadableUri(id)), ReadableUri(id));
    }
}

TEST(WithoutUser, LeavesServerAndPath) {
    EXPECT_EQ(WithoutUser("davs://a%40b@nas:1/x@y"), "davs://nas:1/x@y");
    EXPECT_EQ(WithoutUser("davs://nas:1/x@y"), "davs://nas:1/x@y");
    EXPECT_EQ(WithoutUser("nothing"), "nothing");
}

std::string ForGio(const std::string& text) {
    const UniqueSoupUri uri(soup_uri_new(text.c_str()));
    return GioUri(uri.get());
}

TEST(GioUri, HasNoEscapesButThoseOfTheUser) {
    EXPECT_EQ(ForGio("dav://amy@nas/my%20files"), "dav://amy@nas/my files");
    EXPECT_EQ(ForGio("dav://dom%5Camy@nas/x"), "dav://dom\\amy@nas/x");
    EXPECT_EQ(ForGio("dav://a%40b%2Fc@nas:1/my%20files"), "dav://a%40b%2Fc@nas:1/my files");
}

/** An id of an odd account goes through all that takes ids apart. */
TEST(OddAccount, IdsKeepTheirHostsAndThemselves) {
    for (const char* user : {"a@b", "a/b", "a?b", "a#b", "a@b/c?d#e"}) {
        const std::string id = std::string("sftp://") + user + "@nas.example:2222";
        std::string out;
        std::string rest;
        EXPECT_TRUE(Utils::GetHostWithPort(id.c_str(), out));
        EXPECT_EQ(out, "nas.example:2222") << user;
        EXPECT_TRUE(Server::GetSFTPHost(id.c_str(), out));
        EXPECT_EQ(out, "[nas.example]:2222") << user;
        EXPECT_TRUE(Utils::GetURIParts(id.c_str(), out, rest));
        EXPECT_EQ(out, id);
        EXPECT_EQ(rest, "");
        EXPECT_TRUE(Utils::GetBaseURI(id.c_str(), out, false));
        EXPECT_EQ(out, "sftp://nas.example:2222") << user;
    }
}

}  // namespace
}  // namespace ZYROVFS
