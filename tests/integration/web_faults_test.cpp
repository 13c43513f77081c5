// What no browser sends, browsers that go away, and pages of other sites and users.
#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <sys/socket.h>

#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace remote_side;
using namespace web_site;
using testing::AnyOf;
using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;

std::string dav_id;

class Site : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote(std::string("start ") + kPassword);
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        StartWebServer();
        Json::Value form;
        form["protocol"] = "dav";
        form["host"] = "127.0.0.1";
        form["port"] = 8080;
        form["user"] = "remo";
        form["password"] = kPassword;
        dav_id = Post("add", form).Json()["connection"].asString();
        ASSERT_FALSE(dav_id.empty());
    }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

std::string At(const std::string& action, const std::string& path) {
    return web_site::At(action, dav_id, path);
}

bool IsThere(const std::string& name) {
    return fs::exists(kRemote + name);
}

/** A form's file, from its first boundary to its content. */
std::string Opening(const std::string& boundary) {
    return "--" + boundary +
           "\r\nContent-Disposition: form-data; name=\"file\"; filename=\"x\"\r\n"
           "Content-Type: application/octet-stream\r\n\r\n";
}

std::string Closing(const std::string& boundary) {
    return "\r\n--" + boundary + "--\r\n";
}

/** A body as it stands, with this boundary in the header; `size` empty: not known. */
Answer Send(const std::string& name, const std::string& boundary, const std::string& body,
            const std::string& size = "") {
    std::ofstream("/run/form", std::ios::binary) << body;
    std::ofstream("/run/headers") << "Content-Type: multipart/form-data; boundary=\"" << boundary
                                  << "\"\n";
    return Ask(kOurs + " -H @/run/headers --data-binary @/run/form",
               At("upload", "/" + name) + (size.empty() ? "" : "&size=" + size));
}

TEST(WebFaults, BoundariesMayBeOfAnyCharactersAndOfSeventy) {
    for (const std::string& boundary : std::vector<std::string>{
             std::string(70, 'b'), ".*[a-z]+?(^|,)x", "----WebKitFormBoundary7MA4", "a b:c=d/e"}) {
        const std::string bytes = Noise(200000);
        const Answer answer =
            Send("odd.bin", boundary, Opening(boundary) + bytes + Closing(boundary));
        EXPECT_EQ(answer.status, 200) << boundary << answer.body;
        EXPECT_TRUE(machine::Read(kRemote + "odd.bin") == bytes) << boundary;
        fs::remove(kRemote + "odd.bin");
    }
    EXPECT_EQ(Send("odd.bin", std::string(71, 'b'), "x").status, 400);
    EXPECT_EQ(Send("odd.bin", "", "x").status, 400);
    EXPECT_EQ(Ask(kOurs + " -H 'Content-Type: multipart/form-data' --data-binary x",
                  At("upload", "/odd.bin"))
                  .status,
              400);
    EXPECT_FALSE(IsThere("odd.bin"));
}

TEST(WebFaults, ABoundaryInTheFilesOwnTailCutsItOnlyWhereNobodyToldItsSize) {
    const std::string bytes = Noise(150000) + "\r\n--B\r\nmore of the file";
    const std::string body = Opening("B") + bytes + Closing("B");
    const Answer refused = Send("cut.bin", "B", body, std::to_string(bytes.size()));
    EXPECT_GE(refused.status, 400) << "it would not be the whole file";
    const Answer cut = Send("cut.bin", "B", body);
    EXPECT_EQ(cut.status, 200) << cut.body;
    EXPECT_TRUE(machine::Read(kRemote + "cut.bin") == bytes.substr(0, 150000));
    fs::remove(kRemote + "cut.bin");
}

TEST(WebFaults, ABoundaryInFrontOfTheTailIsContent) {
    const std::string bytes = Noise(1000) + "\r\n--B--\r\n" + Noise(200000);
    const Answer answer =
        Send("early.bin", "B", Opening("B") + bytes + Closing("B"), std::to_string(bytes.size()));
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_TRUE(machine::Read(kRemote + "early.bin") == bytes);
    fs::remove(kRemote + "early.bin");
}

TEST(WebFaults, FurtherFieldsBehindTheFileStayOutOfItAsFarAsTheTailReaches) {
    constexpr size_t kTail = 131072;
    const std::string bytes = Noise(300000);
    const std::string field = "\r\n--B\r\nContent-Disposition: form-data; name=\"n\"\r\n\r\n";
    const auto body = [&](size_t behind) {
        const std::string end = Closing("B");
        return Opening("B") + bytes + field + std::string(behind - field.size() - end.size(), 'f') +
               end;
    };
    for (const size_t behind : {size_t{200}, kTail}) {
        const Answer answer = Send("fields.bin", "B", body(behind), "300000");
        EXPECT_EQ(answer.status, 200) << behind << answer.body;
        EXPECT_TRUE(machine::Read(kRemote + "fields.bin") == bytes) << behind;
        fs::remove(kRemote + "fields.bin");
    }
    // Across the border of the tail, and before it, the end of the file is not seen.
    for (const size_t behind : {kTail + 1, kTail + 3, kTail + 5000}) {
        EXPECT_GE(Send("fields.bin", "B", body(behind), "300000").status, 400) << behind;
        EXPECT_FALSE(IsThere("fields.bin")) << behind;
    }
}

/** A connection to the web server that says what it likes. */
class Raw {
  public:
    Raw() : fd_(socket(AF_INET, SOCK_STREAM, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(8090);
        inet_pton(AF_INET, "127.0.0.1", &address.sin_addr);
        EXPECT_EQ(connect(fd_, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
        timeval patience{10, 0};
        setsockopt(fd_, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
    }
    Raw(const Raw&) = delete;
    Raw& operator=(const Raw&) = delete;
    ~Raw() { Close(); }

    void Say(const std::string& bytes) const {
        send(fd_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }
    /** The answer's status, 0 when the server has closed without. */
    int Status() const {
        std::string text(4096, '\0');
        const ssize_t n = recv(fd_, text.data(), text.size(), 0);
        return n < 12 ? 0 : std::stoi(text.substr(9, 3));
    }
    void Close() {
        if (fd_ >= 0) {
            close(fd_);
            fd_ = -1;
        }
    }

  private:
    int fd_;
};

std::string Head(const std::string& name, const std::string& length_line) {
    return "POST /files/api/upload?connection=" + Escaped(dav_id) + "&path=" + Escaped("/" + name) +
           " HTTP/1.1\r\nHost: 127.0.0.1:8090\r\nAuthorization: Basic YW15OmE=\r\n"
           "Origin: http://127.0.0.1:8090\r\nX-Zyrovfs-Request: 1\r\n"
           "Content-Type: multipart/form-data; boundary=B\r\n" +
           length_line + "\r\n";
}

std::string Length(size_t size) {
    return "Content-Length: " + std::to_string(size) + "\r\n";
}

bool NoProgramIsLeft() {
    return Eventually([] { return machine::Run("pgrep -x zyrovfs-web").status != 0; });
}

TEST(WebFaults, ALengthThatLiesStoresNothing) {
    const std::string body = Opening("B") + Noise(200000) + Closing("B");
    {
        Raw longer;
        longer.Say(Head("lie.bin", Length(body.size() + 1000)) + body);
    }
    EXPECT_TRUE(NoProgramIsLeft());
    EXPECT_FALSE(IsThere("lie.bin"));
    const Raw shorter;
    shorter.Say(Head("lie.bin", Length(body.size() - 100)) + body);
    EXPECT_GE(shorter.Status(), 400);
    for (const char* line : {"", "Content-Length: -1\r\n", "Content-Length: x\r\n",
                             "Content-Length: 9223372036854775808\r\n",
                             "Content-Length: 5\r\nContent-Length: 6\r\n"}) {
        const Raw none;
        none.Say(Head("lie.bin", line) + body);
        EXPECT_THAT(none.Status(), AnyOf(400, 411, 413)) << line;
    }
    EXPECT_TRUE(NoProgramIsLeft());
    EXPECT_FALSE(IsThere("lie.bin"));
}

TEST(WebFaults, ABrowserThatGoesAwayAtAnyStageLeavesNothing) {
    const std::string bytes = Noise(400000);
    const std::string body = Opening("B") + bytes + Closing("B");
    for (const size_t sent :
         {size_t{0}, size_t{3}, Opening("B").size(), Opening("B").size() + 1, size_t{131072},
          size_t{300000}, body.size() - Closing("B").size(), body.size() - 1}) {
        Raw browser;
        browser.Say(Head("gone.bin", Length(body.size())) + body.substr(0, sent));
        usleep(20000);
        browser.Close();
        EXPECT_TRUE(NoProgramIsLeft()) << sent;
        EXPECT_TRUE(Eventually([] { return !IsThere("gone.bin"); })) << sent;
    }
    for (const char* action : {"download?path=%2Fhello.txt&connection=",
                               "list?path=%2F&connection=", "zip?path=%2Fdocs&connection="}) {
        Raw browser;
        browser.Say(std::string("GET /files/api/") + action + Escaped(dav_id) +
                    " HTTP/1.1\r\nHost: x\r\nAuthorization: Basic YW15OmE=\r\n\r\n");
        browser.Close();
        EXPECT_TRUE(NoProgramIsLeft()) << action;
    }
}

TEST(WebFaults, ARefusalIsHeardByABrowserThatIsStillSending) {
    Must("truncate -s 300M /run/huge");
    const Answer answer = Ask(kOurs + " -F 'file=@/run/huge'", At("upload", "/docs"));
    EXPECT_EQ(answer.status, 409) << answer.body;
    EXPECT_EQ(answer.Json()["error"]["name"], "VFS_ERR_IS_DIRECTORY");
    fs::remove("/run/huge");
}

TEST(WebFaults, TwoUploadsOfOneNameAtOnceLeaveOneOfThemWhole) {
    const std::string one = Noise(3 << 20, 1);
    const std::string two = Noise(3 << 20, 2);
    std::ofstream("/run/one", std::ios::binary) << one;
    std::ofstream("/run/two", std::ios::binary) << two;
    const std::string address = "'" + At("upload", "/same.bin") + "&size=3145728'";
    machine::Run("for f in one two; do curl -s -o /dev/null " + kOurs + " -F file=@/run/$f " +
                 address + " & done; wait");
    const std::string left = machine::Read(kRemote + "same.bin");
    EXPECT_TRUE(left == one || left == two);
    fs::remove(kRemote + "same.bin");
}

TEST(WebFaults, NamesOfAnyCharactersGoUpAreListedAndComeDown) {
    std::string printable;
    for (char c = ' '; c < 127; ++c) {
        printable += c == '/' ? "" : std::string(1, c);
    }
    for (const std::string& name : std::vector<std::string>{
             printable, "\"quoted\" and 'quoted'", "grüße 😀 Ω.txt", "<script>alert(1)<script>",
             "100% & + # ? ; = .txt", std::string(127, 'x') + "😀"}) {
        std::ofstream("/run/source") << "named";
        const Answer up =
            Ask(kOurs + " -F 'file=@/run/source'", At("upload", "/" + name) + "&size=5");
        EXPECT_EQ(up.status, 200) << name << up.body;
        EXPECT_TRUE(Eventually([&] {
            const std::vector<std::string> names = NamesAt(dav_id, "/");
            return std::find(names.begin(), names.end(), name) != names.end();
        })) << name;
        const Answer down = Ask(kAmyIs, At("download", "/" + name));
        EXPECT_EQ(down.status, 200) << name << down.body;
        EXPECT_EQ(down.body, "named") << name;
        EXPECT_EQ(Post("delete", Item(dav_id, "/" + name)).status, 200) << name;
    }
    EXPECT_EQ(Ask(kOurs + " -F 'file=@/run/source'",
                  At("upload", "/" + std::string(256, 'n')) + "&size=5")
                  .status,
              422);
}

constexpr const char* kChanges[] = {"connect", "add",          "disconnect",  "forget", "upload",
                                    "mkdir",   "rename",       "move",        "delete", "cancel",
                                    "copy",    "tasks/cancel", "tasks/remove"};
constexpr const char* kReads[] = {"list", "download", "zip"};

Json::Value Everything() {
    Json::Value body = Item(dav_id, "/hello.txt");
    body["name"] = "x";
    body["folder"] = "/docs";
    body["recursive"] = true;
    body["id"] = "0123456789abcdef";
    body["profile"] = dav_id;
    body["from"]["connection"] = dav_id;
    body["from"]["paths"].append("/hello.txt");
    body["to"]["connection"] = dav_id;
    body["to"]["path"] = "/docs";
    return body;
}

TEST(WebFaults, NoOtherSiteChangesAnything) {
    for (const char* action : kChanges) {
        for (const char* headers :
             {"-u amy:a", "-u amy:a -H 'X-Zyrovfs-Request: 1'",
              "-u amy:a -H 'Origin: http://127.0.0.1:8090'",
              "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: http://evil.example'",
              "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: null'"}) {
            EXPECT_EQ(Post(action, Everything(), headers).status, 403) << action << headers;
        }
        EXPECT_EQ(Ask(kAmyIs, At(action, "/hello.txt")).status, 405) << action;
        EXPECT_EQ(Ask(std::string(kAmyIs) + " -X PUT -d x", At(action, "/hello.txt")).status, 405);
    }
    EXPECT_TRUE(IsThere("hello.txt"));
    EXPECT_THAT(Ask(kAmyIs, Api("connections")).body, HasSubstr(dav_id));
}

TEST(WebFaults, AnotherUserGetsNothingByAnyAction) {
    for (const char* action : kReads) {
        const Answer answer = Ask("-u ben:b", At(action, "/hello.txt"));
        EXPECT_EQ(answer.status, 404) << action;
        EXPECT_THAT(answer.body, Not(HasSubstr("hello from"))) << action;
    }
    for (const char* action : kChanges) {
        const Answer answer =
            std::string(action) == "upload"
                ? Ask(kBens + " -F file=@/etc/hostname", At(action, "/hello.txt") + "&size=1")
                : Post(action, Everything(), kBens);
        EXPECT_THAT(answer.status, AnyOf(400, 404, 500, 502)) << action << answer.body;
    }
    EXPECT_EQ(machine::Read("/srv/remote/hello.txt"), "hello from the remote side\n");
    EXPECT_THAT(Ask("-u ben:b", Api("connections")).Json()["connections"], testing::IsEmpty());
}

TEST(WebFaults, AnUploadOfAnySizeTakesLittleMemory) {
    constexpr long kMostKilobytes = 20 << 10;
    Must("truncate -s 200M /run/large");
    Must("curl -s -o /dev/null " + kOurs + " -F 'file=@/run/large' '" + At("upload", "/large.bin") +
         "&size=209715200&id=memory-0123456789' >/dev/null 2>&1 &");
    long peak = 0;
    ASSERT_TRUE(Eventually([&] {
        const std::string text = machine::Run(
                                     "cat /proc/$(pgrep -x zyrovfs-web)/status 2>/dev/null | "
                                     "sed -n 's/^VmHWM:[^0-9]*\\([0-9]*\\).*/\\1/p'")
                                     .output;
        peak = std::max(peak, text.empty() ? 0 : std::stol(text));
        return Ask(kAmyIs, Api("progress?id=memory-0123456789")).Json()["state"] == "done";
    }));
    EXPECT_GT(peak, 0);
    EXPECT_LE(peak, kMostKilobytes);
    fs::remove(kRemote + "large.bin");
    fs::remove("/run/large");
}

}  // namespace
