#include <gmock/gmock.h>

#include <string>

#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

using Utils::ConvDavProtocol;
using Utils::DecodeURI;
using Utils::GetBaseURI;
using Utils::GetHostWithPort;
using Utils::GetProtocol;
using Utils::GetURIParts;

const std::string kUnchanged = "as it was";

TEST(DecodeURI, UndoesEscapes) {
    EXPECT_EQ(DecodeURI("/a%20b%2Fc"), "/a b/c");
    EXPECT_EQ(DecodeURI("%E4%BD%A0"), "\xE4\xBD\xA0");
    EXPECT_EQ(DecodeURI("%FF%80"), "\xFF\x80");
    EXPECT_EQ(DecodeURI("%41%"), "A%") << "what is no escape stays";
    EXPECT_EQ(DecodeURI("%zz"), "%zz");
}

TEST(DecodeURI, NullAndEmptyGiveEmptyText) {
    EXPECT_EQ(DecodeURI(nullptr), "");
    EXPECT_EQ(DecodeURI(""), "");
}

TEST(DecodeURI, OneTrailingSlashIsDropped) {
    EXPECT_EQ(DecodeURI("abc/"), "abc");
    EXPECT_EQ(DecodeURI("ab/"), "ab");
    EXPECT_EQ(DecodeURI("abc//"), "abc/");
    EXPECT_EQ(DecodeURI("ab%2F"), "ab") << "also one that was escaped";
}

TEST(DecodeURI, TextOfOneOrTwoCharactersKeepsItsSlash) {
    EXPECT_EQ(DecodeURI("/"), "/");
    EXPECT_EQ(DecodeURI("a/"), "a/");
    EXPECT_EQ(DecodeURI("//"), "//");
}

struct Parts {
    const char* uri;
    const char* base;
    const char* rest;
};

TEST(GetURIParts, BaseIsAllUpToThePathAndRestIsThePathWithItsSlash) {
    const Parts rows[] = {
        {"sftp://amy@nas.example:2222/a/b", "sftp://amy@nas.example:2222", "/a/b"},
        {"sftp://nas.example/a/b/", "sftp://nas.example", "/a/b/"},
        {"ftp://amy@10.0.0.7/", "ftp://amy@10.0.0.7", "/"},
        {"ftp://amy@10.0.0.7", "ftp://amy@10.0.0.7", ""},
        {"dav://h:8080/x%20y?q#f", "dav://h:8080", "/x%20y?q#f"},
        {"smb://srv/share/\xE4\xBD\xA0", "smb://srv", "/share/\xE4\xBD\xA0"},
        {"google://amy@gmail.com/root", "google://amy@gmail.com", "/root"},
        {"sftp://[::1]:2222/p", "sftp://[::1]:2222", "/p"},
        {"sftp://[fe80::1]/p", "sftp://[fe80::1]", "/p"},
    };
    for (const Parts& row : rows) {
        std::string base, rest;
        EXPECT_TRUE(GetURIParts(row.uri, base, rest)) << row.uri;
        EXPECT_EQ(base, row.base) << row.uri;
        EXPECT_EQ(rest, row.rest) << row.uri;
    }
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
}

TEST(GetURIParts, PasswordIsNoPartOfAnId) {
    std::string base, rest;
    EXPECT_TRUE(GetURIParts("ftp://amy:secret@h/a", base, rest));
    EXPECT_EQ(base, "ftp://amy@h");
}

TEST(GetURIParts, EscapesInUserOrHostShiftTheCut) {
    std::string base, rest;
    EXPECT_TRUE(GetURIParts("ftp://a%20b@h/path", base, rest));
    EXPECT_EQ(base, "ftp://a b@h");
    EXPECT_EQ(rest, "@h/path") << "two characters short of the path";
    EXPECT_TRUE(GetURIParts("ftp://amy@h%20st/path", base, rest));
    EXPECT_EQ(base, "ftp://amy@h st");
    EXPECT_EQ(rest, "st/path");
}

TEST(GetURIParts, DefaultPortIsNotPrintedAndThenThePathBeginsWithIt) {
    std::string base, rest;
    EXPECT_TRUE(GetURIParts("http://h:80/a", base, rest));
    EXPECT_EQ(base, "http://h");
    EXPECT_EQ(rest, ":80/a");
}

TEST(GetURIParts, BaseLongerThanTheTextLeavesNoRest) {
    std::string base, rest = kUnchanged;
    EXPECT_TRUE(GetURIParts("x:", base, rest)) << seams::LogDump();
    EXPECT_EQ(rest, "") << base;
}

TEST(GetURIParts, OutputsMayBeTheInput) {
    std::string text = "sftp://amy@h:22/a/b";
    std::string base;
    EXPECT_TRUE(GetURIParts(text.c_str(), base, text));
    EXPECT_EQ(base, "sftp://amy@h:22");
    EXPECT_EQ(text, "/a/b");

    text = "sftp://amy@h:22/a/b";
    std::string rest;
    EXPECT_TRUE(GetURIParts(text.c_str(), text, rest));
    EXPECT_EQ(text, "sftp://amy@h:22");
    EXPECT_EQ(rest, "/a/b");
}

TEST(GetURIParts, NullIsLoggedAndRefused) {
    std::string base = kUnchanged, rest = kUnchanged;
    VFSSetErrEx(VFS_ERR_BUSY, "other.cpp", 1);
    EXPECT_FALSE(GetURIParts(nullptr, base, rest));
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_EQ(base, kUnchanged);
    EXPECT_EQ(rest, kUnchanged);
    EXPECT_EQ(GetError(), VFS_ERR_BUSY) << "no code of its own";
}

TEST(GetURIParts, TextThatIsNoUriIsLoggedAndRefused) {
    for (const char* text :
         {"", "/", "nas.example", "://x", "1ftp://h/", "http://[::1", "ftp://h:port/"}) {
        seams::Reset();
        std::string base = kUnchanged, rest = kUnchanged;
        EXPECT_FALSE(GetURIParts(text, base, rest)) << text;
        EXPECT_TRUE(seams::Logged(std::string("Wrong uri, ") + text)) << seams::LogDump();
        EXPECT_EQ(base, kUnchanged);
        EXPECT_EQ(rest, kUnchanged);
    }
}

TEST(GetURIParts, HugeTextIsTakenApart) {
    const std::string path = "/" + std::string(4 << 20, 'p');
    std::string base, rest;
    EXPECT_TRUE(GetURIParts(("sftp://amy@h" + path).c_str(), base, rest));
    EXPECT_EQ(base, "sftp://amy@h");
    EXPECT_EQ(rest, path);

    const std::string host(1 << 20, 'h');
    EXPECT_TRUE(GetURIParts(("sftp://" + host + "/a").c_str(), base, rest));
    EXPECT_EQ(base, "sftp://" + host);
}

TEST(GetURIParts, BinaryTextDoesNoHarm) {
    std::string base, rest;
    const std::string uri = "ftp://h/\x01\x02\xff\xfe%00tail";
    EXPECT_TRUE(GetURIParts(uri.c_str(), base, rest));
    EXPECT_EQ(base, "ftp://h");
    EXPECT_EQ(rest, uri.substr(7));
    GetURIParts("\xff\xfe\x80://\xff", base, rest);
    GetURIParts("ftp://\xff\xfe@\x80\x81/", base, rest);
    GetURIParts("ftp://%00@%00/", base, rest);
}

TEST(GetBaseURI, UserIsCopiedOnlyWhenAskedFor) {
    std::string base;
    EXPECT_TRUE(GetBaseURI("sftp://amy@h:2222/a", base, true));
    EXPECT_EQ(base, "sftp://amy@h:2222");
    EXPECT_TRUE(GetBaseURI("sftp://amy@h:2222/a", base, false));
    EXPECT_EQ(base, "sftp://h:2222");
}

TEST(GetBaseURI, EscapesAreUndone) {
    std::string base;
    EXPECT_TRUE(GetBaseURI("ftp://a%40b@h%20st/a", base, true));
    EXPECT_EQ(base, "ftp://a@b@h st");
}

TEST(GetBaseURI, NullAndWrongTextAreRefused) {
    std::string base = kUnchanged;
    EXPECT_FALSE(GetBaseURI(nullptr, base, true));
    EXPECT_TRUE(seams::Logged("Wrong parameters"));
    EXPECT_FALSE(GetBaseURI("no uri", base, true));
    EXPECT_TRUE(seams::Logged("Wrong uri, no uri"));
    EXPECT_EQ(base, kUnchanged);
}

TEST(GetBaseURI, LogLinesCarryTheUnitsName) {
    std::string base;
    EXPECT_FALSE(GetBaseURI("no uri", base, true));
    EXPECT_TRUE(seams::LoggedPart("path.cpp:")) << seams::LogDump();
}

TEST(GetBaseURI, PortsThatAreNoneAreWhatTheUriLibraryMakesOfThem) {
    // Validity of a port is the profile's matter; here it only must not do harm.
    for (const char* port :
         {"65536", "-1", "99999999999", "0", "4294967296", "18446744073709551616"}) {
        std::string base;
        if (GetBaseURI((std::string("sftp://h:") + port + "/a").c_str(), base, true)) {
            EXPECT_EQ(base.rfind("sftp://h", 0), 0U) << base;
        } else {
            EXPECT_TRUE(seams::LoggedPart("Wrong uri, ")) << port;
        }
    }
    std::string base;
    EXPECT_TRUE(GetBaseURI("sftp://h:65536/a", base, true));
    EXPECT_EQ(base, "sftp://h:65536");
}

TEST(GetProtocol, IsTheScheme) {
    std::string out;
    EXPECT_TRUE(GetProtocol("davs://amy@h/a", out));
    EXPECT_EQ(out, "davs");
    EXPECT_TRUE(GetProtocol("SFTP://h/", out));
    EXPECT_EQ(out, "sftp");
    EXPECT_TRUE(GetProtocol("localtest:", out));
    EXPECT_EQ(out, "localtest");
}

TEST(GetProtocol, UriWithoutSchemeIsRefused) {
    std::string out = kUnchanged;
    for (const char* text : {"", "h/a", "//h/a", "/usr"}) {
        seams::Reset();
        EXPECT_FALSE(GetProtocol(text, out)) << text;
        EXPECT_TRUE(seams::Logged(std::string("Wrong uri, ") + text)) << seams::LogDump();
    }
    EXPECT_FALSE(GetProtocol(nullptr, out));
    EXPECT_EQ(out, kUnchanged);
}

TEST(GetHostWithPort, PortIsAppendedWhenThereIsOne) {
    const struct {
        const char* uri;
        const char* host;
    } rows[] = {
        {"sftp://amy@h:2222/a", "h:2222"}, {"dav://h/a", "h"},
        {"dav://h:8080/a", "h:8080"},      {"http://h/a", "h:80"},
        {"https://h/a", "h:443"},          {"https://h:8443/a", "h:8443"},
        {"sftp://h%20st/", "h st"},        {"sftp://[::1]:2222/", "::1:2222"},
        {"sftp://h:65536/", "h:65536"},
    };
    for (const auto& row : rows) {
        std::string out;
        EXPECT_TRUE(GetHostWithPort(row.uri, out)) << row.uri;
        EXPECT_EQ(out, row.host) << row.uri;
    }
}

TEST(GetHostWithPort, UriWithoutHostIsRefused) {
    std::string out = kUnchanged;
    EXPECT_FALSE(GetHostWithPort(nullptr, out));
    EXPECT_FALSE(GetHostWithPort("mailto:amy", out));
    EXPECT_FALSE(GetHostWithPort("h", out));
    EXPECT_EQ(out, kUnchanged);
}

TEST(GetSFTPHost, Port22GivesThePlainHost) {
    std::string host;
    EXPECT_TRUE(Server::GetSFTPHost("sftp://amy@nas.example:22/a", host));
    EXPECT_EQ(host, "nas.example");
    EXPECT_TRUE(Server::GetSFTPHost("sftp://nas.example", host));
    EXPECT_EQ(host, "nas.example");
}

TEST(GetSFTPHost, AnotherPortGivesTheHostInBracketsAndThePort) {
    std::string host;
    EXPECT_TRUE(Server::GetSFTPHost("sftp://amy@nas.example:2222/a", host));
    EXPECT_EQ(host, "[nas.example]:2222");
}

TEST(GetSFTPHost, IPv6HostHasOnePairOfBracketsBeforeThePort) {
    std::string host;
    EXPECT_TRUE(Server::GetSFTPHost("sftp://[fe80::7]:2222/", host));
    EXPECT_EQ(host, "[fe80::7]:2222");
    EXPECT_TRUE(Server::GetSFTPHost("sftp://[fe80::7]/", host));
    EXPECT_EQ(host, "fe80::7");
}

TEST(GetSFTPHost, HostThatHasItsBracketsKeepsThem) {
    std::string host;
    EXPECT_TRUE(Server::GetSFTPHost("sftp://%5Bfe80%3A%3A7%5D:2222/", host)) << seams::LogDump();
    EXPECT_EQ(host, "[fe80::7]:2222");
}

TEST(GetSFTPHost, NullAndWrongTextAreRefused) {
    std::string host = kUnchanged;
    EXPECT_FALSE(Server::GetSFTPHost(nullptr, host));
    EXPECT_TRUE(seams::Logged("Wrong parameters"));
    EXPECT_FALSE(Server::GetSFTPHost("nas.example", host));
    EXPECT_TRUE(seams::Logged("Wrong uri, nas.example"));
    EXPECT_FALSE(Server::GetSFTPHost("mailto:amy", host));
    EXPECT_TRUE(seams::Logged("Wrong uri, mailto:amy"));
    EXPECT_EQ(host, kUnchanged);
}

TEST(ConvDavProtocol, DavBecomesHttp) {
    const struct {
        const char* in;
        const char* out;
    } rows[] = {
        {"dav://h/a", "http://h/a"},
        {"davs://h/a", "https://h/a"},
        {"dav://", "http://"},
        {"davs://", "https://"},
        {"sftp://h/a", "sftp://h/a"},
        {"DAV://h", "DAV://h"},
        {"", ""},
        {"ftp://h/dav://x", "http://h/dav://x"},
        {"ftp://h/davs://x", "https:///davs://x"},
    };
    for (const auto& row : rows) {
        std::string out;
        EXPECT_TRUE(ConvDavProtocol(row.in, out)) << row.in;
        EXPECT_EQ(out, row.out) << row.in;
    }
}

TEST(ConvDavProtocol, TextMayBeConvertedInPlace) {
    std::string text = "davs://h/a";
    EXPECT_TRUE(ConvDavProtocol(text, text));
    EXPECT_EQ(text, "https://h/a");
}

}  // namespace
}  // namespace ZYROVFS
