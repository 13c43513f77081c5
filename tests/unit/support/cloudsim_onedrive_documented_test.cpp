/** What the public documentation says of Live REST, Live login and BITS, and clients count on. */
#include "support/cloudsim_onedrive.h"

namespace {

using cloudsim::ErrorOf;
using cloudsim::Got;
using cloudsim::HeaderOf;
using cloudsim::NamesOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

using Headers = std::vector<std::string>;

struct OneDriveDocumented : cloudsim::OneDriveFixture {
    std::string Url(const std::string& path = "/a.bin") {
        return drive.StorageHost(amy) + "/users/0x" + amy.Id() + "/LiveFolders" + path;
    }
    Got Packet(const std::string& url, const std::string& type, Headers headers,
               const std::string& body = "") {
        headers.push_back("BITS-Packet-Type: " + type);
        client.headers = headers;
        return client.Send("BITS_POST", url, body);
    }
    std::string Begin(const std::string& url) {
        return HeaderOf(
            Packet(url, "Create-Session",
                   {"BITS-Supported-Protocols: {7df0354d-249b-430f-820d-3d2a9bef4931}"}),
            "BITS-Session-Id");
    }
    Got Fragment(const std::string& url, const std::string& session, const std::string& range,
                 const std::string& bytes) {
        return Packet(url, "Fragment",
                      {"BITS-Session-Id: " + session, "Content-Range: Bytes " + range}, bytes);
    }
    Got End(const std::string& url, const std::string& type, const std::string& session) {
        return Packet(url, type, {"BITS-Session-Id: " + session});
    }
};

TEST_F(OneDriveDocumented, FilterAllListsWhatNoFilterLists) {
    amy.AddFolder(amy.Root(), "docs");
    amy.AddFile(amy.Root(), "a.jpg", "");
    amy.AddFile(amy.Root(), "b", "");
    EXPECT_THAT(NamesOf(Get("me/skydrive/files?filter=all").Json()),
                ElementsAre("docs", "a.jpg", "b"));
    EXPECT_THAT(NamesOf(Get("me/skydrive/files?filter=folders").Json()), ElementsAre("docs"));
}

TEST_F(OneDriveDocumented, SomeFoldersHaveFriendlyNames) {
    const std::string id = amy.AddFolder(amy.Root(), "Documents");
    amy.AddFile(id, "a", "x");
    EXPECT_EQ(id, Get("me/skydrive/my_documents").Json()["id"].asString());
    EXPECT_THAT(NamesOf(Get("me/skydrive/my_documents/files").Json()), ElementsAre("a"));
    EXPECT_EQ("resource_not_found", ErrorOf(Get("me/skydrive/my_photos")));
}

TEST_F(OneDriveDocumented, ErrorsComeWith200WhenStatusCodesAreSuppressed) {
    const Got got = Get("file.none?suppress_response_codes=true");
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("resource_not_found", ErrorOf(got));
    EXPECT_EQ(404, Get("file.none?suppress_response_codes=false").status);
}

TEST_F(OneDriveDocumented, AGetMayNameAnotherMethod) {
    const std::string id = amy.AddFile(amy.Root(), "a", "x");
    EXPECT_EQ(204, Get(id + "?method=DELETE").status);
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(OneDriveDocumented, AThrottledRequestIsAnswered420AndItsMessageTellsTheSecondsToWait) {
    drive.LimitRate(1, 100000);
    EXPECT_EQ(200, Get("me").status);
    const Got got = Get("me");
    EXPECT_EQ(420, got.status);
    EXPECT_EQ("request_throttled", ErrorOf(got));
    const std::string wait = HeaderOf(got, "Retry-After");
    EXPECT_THAT(wait, Not(IsEmpty()));
    EXPECT_THAT(got.Json()["error"]["message"].asString(),
                HasSubstr("Wait " + wait + " seconds and try again."));
}

struct OneDriveForm : OneDriveDocumented {
    static std::string Part(const std::string& name, const std::string& bytes) {
        return "--A300x\r\nContent-Disposition: form-data; name=\"file\"; filename=\"" + name +
               "\"\r\nContent-Type: application/octet-stream\r\n\r\n" + bytes + "\r\n";
    }
    Got Post(const std::string& body, const std::string& query = "") {
        client.headers = {"Content-Type: multipart/form-data; boundary=A300x"};
        return Send("POST", "me/skydrive/files" + query, body);
    }
};

TEST_F(OneDriveForm, APostWithOnePartIsAnUploadUnderThePartsFileName) {
    const Got made = Post(Part("HelloWorld.txt", "Hello, World!") + "--A300x--\r\n");
    EXPECT_EQ(201, made.status);
    const std::string id = amy.Find("/HelloWorld.txt");
    EXPECT_EQ(id, made.Json()["id"].asString());
    EXPECT_EQ("HelloWorld.txt", made.Json()["name"].asString());
    EXPECT_TRUE(made.Json()["source"].isString());
    EXPECT_EQ("Hello, World!", amy.Bytes(id));
    EXPECT_EQ(200, Post(Part("HelloWorld.txt", "again") + "--A300x--\r\n").status);
    EXPECT_EQ("again", amy.Bytes(id));
    EXPECT_EQ("resource_already_exists",
              ErrorOf(Post(Part("HelloWorld.txt", "") + "--A300x--\r\n", "?overwrite=false")));
}

TEST_F(OneDriveForm, OnlyOnePartIsSupported) {
    EXPECT_EQ(400, Post(Part("a", "x") + Part("b", "y") + "--A300x--\r\n").status);
    EXPECT_EQ(400, Post(Part("a", "x")).status);
    EXPECT_EQ(400, Post("x").status);
    EXPECT_FALSE(amy.Exists("/a"));
    EXPECT_FALSE(amy.Exists("/b"));
}

struct OneDrivePhotos : OneDriveDocumented {
    /** A PNG file as far as its header, of 4096 x 1024 points, and some more bytes. */
    std::string photo =
        std::string("\x89PNG\r\n\x1a\n\0\0\0\rIHDR\0\0\x10\0\0\0\x04\0", 24) + "points";
    std::string Stored(const std::string& path) {
        EXPECT_EQ(201, Send("PUT", "me/skydrive/files/" + path, photo).status);
        return amy.Bytes(amy.Find("/" + path.substr(0, path.find('?'))));
    }
};

TEST_F(OneDrivePhotos, LargePhotosAreMadeSmallerUnlessTheRequestForbidsIt) {
    EXPECT_EQ(photo, Stored("a.png?downsize_photo_uploads=false"));
    EXPECT_EQ(std::string("\0\0\x08\0\0\0\x02\0", 8), Stored("b.png").substr(16));
    EXPECT_NE(photo, Stored("c.png?downsize_photo_uploads=true"));
}

TEST_F(OneDrivePhotos, OtherFilesStayAsTheyAre) {
    EXPECT_EQ(photo, Stored("a.bin"));
    photo[18] = '\x08';
    EXPECT_EQ(photo, Stored("b.png"));
}

TEST_F(OneDrivePhotos, BitsNeverMakesPhotosSmaller) {
    const std::string session = Begin(Url("/a.png"));
    EXPECT_EQ(200, Fragment(Url("/a.png"), session, "0-29/30", photo).status);
    EXPECT_EQ(200, End(Url("/a.png"), "Close-Session", session).status);
    EXPECT_EQ(photo, amy.Bytes(amy.Find("/a.png")));
}

TEST_F(OneDriveDocumented, ATokenRequestWithoutAGrantTypeIsInvalid) {
    const Got got = client.Send("POST", drive.TokenUrl(), "client_id=x&refresh_token=y");
    EXPECT_EQ(400, got.status);
    EXPECT_EQ("invalid_request", got.Json()["error"].asString());
    const Got other = client.Send("POST", drive.TokenUrl(), "client_id=x&grant_type=password");
    EXPECT_EQ("unsupported_grant_type", other.Json()["error"].asString());
}

TEST_F(OneDriveDocumented, BitsPutsAFileIntoTheFolderWhoseResourceIdIsNamed) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    const std::string resource = folder.substr(folder.rfind('.') + 1);
    const std::string url = drive.StorageHost(amy) + "/items/" + resource + "/new.bin";
    const std::string session = Begin(url);
    EXPECT_EQ(200, Fragment(url, session, "0-3/4", "0123").status);
    EXPECT_EQ(400, End(Url("/new.bin"), "Close-Session", session).status);
    EXPECT_EQ(200, End(url, "Close-Session", session).status);
    EXPECT_EQ("0123", amy.Bytes(amy.Find("/docs/new.bin")));
    const std::string nowhere = drive.StorageHost(amy) + "/items/" + resource + "0/new.bin";
    EXPECT_THAT(Begin(nowhere), IsEmpty());
}

TEST_F(OneDriveDocumented, ABitsSessionThatIsClosedTooEarlyLosesWhatCame) {
    const std::string session = Begin(Url());
    EXPECT_EQ(200, Fragment(Url(), session, "0-3/10", "0123").status);
    EXPECT_EQ(400, End(Url(), "Close-Session", session).status);
    EXPECT_EQ(0u, drive.UploadSessions());
    EXPECT_EQ("0x8020001F",
              HeaderOf(Fragment(Url(), session, "4-9/10", "456789"), "BITS-Error-Code"));
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(OneDriveDocumented, BitsErrorsStandUnderBothOfTheirNamesWithTheServersContext) {
    const Got got = End(Url(), "Close-Session", "{no-such-session}");
    EXPECT_EQ(500, got.status);
    EXPECT_EQ("Ack", HeaderOf(got, "BITS-Packet-Type"));
    EXPECT_EQ("0x8020001F", HeaderOf(got, "BITS-Error"));
    EXPECT_EQ("0x8020001F", HeaderOf(got, "BITS-Error-Code"));
    EXPECT_EQ("0x5", HeaderOf(got, "BITS-Error-Context"));
    EXPECT_EQ("0", HeaderOf(got, "Content-Length"));
}

TEST_F(OneDriveDocumented, EveryBitsAnswerWith200NamesTheSession) {
    const std::string session = Begin(Url());
    EXPECT_EQ(session, HeaderOf(End(Url(), "Ping", session), "BITS-Session-Id"));
    EXPECT_EQ(session, HeaderOf(Fragment(Url(), session, "0-0/1", "x"), "BITS-Session-Id"));
    EXPECT_EQ(session, HeaderOf(End(Url(), "Close-Session", session), "BITS-Session-Id"));
    const std::string other = Begin(Url());
    EXPECT_EQ(other, HeaderOf(End(Url(), "Cancel-Session", other), "BITS-Session-Id"));
}

TEST_F(OneDriveDocumented, ABitsFragmentBehindAGapIsAnsweredWith416AndTheNextByteWanted) {
    const std::string session = Begin(Url());
    Fragment(Url(), session, "0-127/300", std::string(128, 'a'));
    const Got gap = Fragment(Url(), session, "200-299/300", std::string(100, 'c'));
    EXPECT_EQ(416, gap.status);
    EXPECT_EQ("128", HeaderOf(gap, "BITS-Received-Content-Range"));
    const Got next = Fragment(Url(), session, "100-212/300", std::string(113, 'b'));
    EXPECT_EQ(200, next.status);
    EXPECT_EQ("213", HeaderOf(next, "BITS-Received-Content-Range"));
}

}  // namespace
