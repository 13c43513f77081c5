// Connections made, taken down and forgotten through the web layer, by a user who begins with none.
#include <gmock/gmock.h>

#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace web_site;
using remote_side::kAmy;
using remote_side::kPassword;
using testing::AllOf;
using testing::Contains;
using testing::HasSubstr;
using testing::IsSupersetOf;
using testing::Not;
namespace fs = std::filesystem;

class Site : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote(std::string("start ") + kPassword);
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        StartWebServer();
    }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

Json::Value Form(const std::string& protocol, const std::string& host, int port) {
    Json::Value form;
    form["protocol"] = protocol;
    form["host"] = host;
    form["port"] = port;
    form["user"] = "remo";
    form["password"] = kPassword;
    form["path"] = protocol == "sftp" ? "/srv/remote" : "";
    form["alias"] = "My " + protocol;
    return form;
}

Json::Value Dav() {
    return Form("dav", "127.0.0.1", 8080);
}

Json::Value Named(const std::string& id) {
    Json::Value body;
    body["connection"] = id;
    return body;
}

Json::Value Connections(const char* who = kAmyIs) {
    return Ask(who, Api("connections")).Json()["connections"];
}

std::string StateOf(const std::string& id) {
    const Json::Value connections = Connections();
    for (const Json::Value& connection : connections) {
        if (connection["id"] == id) {
            return connection["state"].asString();
        }
    }
    return "none";
}

class WebConnect : public testing::Test {
  protected:
    void TearDown() override {
        const Json::Value connections = Connections();
        for (const Json::Value& connection : connections) {
            Post("forget", Named(connection["id"].asString()));
        }
    }
};

TEST_F(WebConnect, TheCatalogueComesWithAFormForEachProtocol) {
    const Answer answer = Ask(kAmyIs, Api("protocols"));
    ASSERT_EQ(answer.status, 200) << answer.body;
    std::vector<std::string> names;
    const Json::Value protocols = answer.Json()["protocols"];
    for (const Json::Value& protocol : protocols) {
        names.push_back(protocol["protocol"].asString());
        EXPECT_FALSE(protocol["title"].asString().empty());
        EXPECT_EQ(protocol["cloud"].asBool(), protocol["fields"].empty()) << protocol;
        const Json::Value& fields = protocol["fields"];
        for (const Json::Value& field : fields) {
            EXPECT_FALSE(field["label"].asString().empty()) << field;
            EXPECT_TRUE(field["required"].isBool());
            EXPECT_EQ(field["type"] == "password", field["name"] == "password");
        }
    }
    EXPECT_THAT(names, IsSupersetOf({"ftp", "sftp", "dav", "davs", "smb", "box", "google"}));
}

TEST_F(WebConnect, ServersOfEachProtocolAreAddedByTheFormAndBrowsed) {
    for (const Json::Value& form :
         {Dav(), Form("sftp", "127.0.0.1", 2222), Form("ftp", "127.0.0.1", 2121)}) {
        const Answer added = Post("add", form);
        ASSERT_EQ(added.status, 200) << added.body << form;
        const std::string id = added.Json()["connection"].asString();
        EXPECT_TRUE(Eventually([&] { return StateOf(id) == "connected"; }));
        EXPECT_THAT(NamesAt(id, "/"), AllOf(Contains("hello.txt"), Contains("docs"))) << form;
        EXPECT_EQ(Ask(kAmyIs, At("download", id, "/hello.txt")).body,
                  "hello from the remote side\n");
    }
    EXPECT_EQ(Connections().size(), 3U);
    EXPECT_EQ(Connections("-u ben:b").size(), 0U);
}

TEST_F(WebConnect, AConnectionIsTakenDownMountedAgainAndForgotten) {
    const std::string id = Post("add", Dav()).Json()["connection"].asString();
    EXPECT_EQ(Post("disconnect", Named(id)).status, 200);
    EXPECT_EQ(StateOf(id), "disconnected");
    const Answer gone = Ask(kAmyIs, At("list", id, "/"));
    EXPECT_EQ(gone.status, 502);
    EXPECT_EQ(gone.Json()["error"]["advice"], "Connect it again.");
    const Answer again = Post("connect", Named(id));
    EXPECT_EQ(again.status, 200) << again.body;
    EXPECT_TRUE(Eventually([&] { return StateOf(id) == "connected"; }));
    EXPECT_THAT(NamesAt(id, "/"), Contains("hello.txt"));
    EXPECT_EQ(Post("forget", Named(id)).status, 200);
    EXPECT_EQ(StateOf(id), "none");
    EXPECT_EQ(Post("forget", Named(id)).status, 404);
}

TEST_F(WebConnect, AChangedPasswordIsAskedForAndTaken) {
    const std::string id = Post("add", Dav()).Json()["connection"].asString();
    Post("disconnect", Named(id));
    machine::Remote("password second-secret");
    const Answer refused = Post("connect", Named(id));
    EXPECT_EQ(refused.status, 403) << refused.body;
    EXPECT_FALSE(refused.Json()["error"]["advice"].asString().empty());
    Json::Value body = Named(id);
    body["password"] = "second-secret";
    const Answer taken = Post("connect", body);
    EXPECT_EQ(taken.status, 200) << taken.body;
    EXPECT_TRUE(Eventually([&] { return StateOf(id) == "connected"; }));
    machine::Remote(std::string("password ") + kPassword);
}

TEST_F(WebConnect, WhatCannotBeConnectedIsToldInWordsAndNotKept) {
    Json::Value wrong = Dav();
    wrong["password"] = "wrong";
    const Answer refused = Post("add", wrong);
    EXPECT_EQ(refused.status, 403) << refused.body;
    Json::Value closed = Dav();
    closed["port"] = 9;
    const Answer nobody = Post("add", closed);
    EXPECT_EQ(nobody.status, 502) << nobody.body;
    EXPECT_THAT(nobody.Json()["error"]["advice"].asString(), HasSubstr("the port"));
    EXPECT_EQ(Connections().size(), 0U);
}

TEST_F(WebConnect, AFormThatIsNotFilledInIsRefused) {
    Json::Value no_host = Dav();
    no_host["host"] = "";
    EXPECT_EQ(Post("add", no_host).status, 422);
    for (const char* port : {"x", "65536", "-1", "1e3", "80 "}) {
        Json::Value form = Dav();
        form["port"] = port;
        EXPECT_EQ(Post("add", form).status, 422) << port;
    }
    for (const char* protocol : {"gopher", "../dav", "box", "", "dav\n"}) {
        EXPECT_EQ(Post("add", Form(protocol, "127.0.0.1", 1)).status, 422) << protocol;
    }
    Json::Value odd = Dav();
    odd["host"] = "127.0.0.1/x@y";
    EXPECT_GE(Post("add", odd).status, 400);
    EXPECT_EQ(Post("add", Json::Value(Json::objectValue)).status, 400);
    EXPECT_EQ(Connections().size(), 0U);
}

TEST_F(WebConnect, ACertificateThatNobodyKnowsIsForThePersonToDecide) {
    Must(
        "openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes -days 2 -subj "
        "/CN=stranger -addext subjectAltName=DNS:localhost -keyout /srv/tls/x.key "
        "-out /srv/tls/x.crt 2>/dev/null; cat /srv/tls/x.key /srv/tls/x.crt >/srv/tls/server.pem");
    machine::Remote("restart dav");
    const Answer asked = Post("add", Form("davs", "localhost", 8443));
    EXPECT_EQ(asked.status, 409) << asked.body;
    const Json::Value trust = asked.Json()["error"]["trust"];
    EXPECT_EQ(trust["kind"], "certificate");
    EXPECT_EQ(trust["host"], "localhost");
    EXPECT_EQ(trust["subject"], "stranger");
    EXPECT_EQ(trust["issuer"], "stranger");
    EXPECT_GT(trust["valid_to"].asInt64(), trust["valid_from"].asInt64());
    const std::string kept = "/usr/zyro/etc/zyrovfs/4001/ssl/localhost:8443";

    Json::Value accepted = Form("davs", "localhost", 8443);
    accepted["accept"] = "something else";
    EXPECT_EQ(Post("add", accepted).status, 409);
    EXPECT_FALSE(fs::exists(kept)) << "only what was shown is accepted";
    // The stock backend has a question of its own about the certificate, which ends the mount; the
    // library trusts it from here on.
    accepted["accept"] = trust["token"];
    Post("add", accepted);
    EXPECT_TRUE(fs::exists(kept));
    EXPECT_NE(Post("add", Form("davs", "localhost", 8443)).status, 409);
    machine::Remote("certificate /srv/tls/server localhost");
    machine::Remote("restart dav");
}

TEST_F(WebConnect, SavedProfilesAreOfferedAndConnectedByTheirId) {
    std::ofstream("/run/secret") << kPassword << '\n';
    Must(BuildDir() +
         "/tools/zyrovfs/zyrovfs profile add --user amy --protocol dav --hostname "
         "127.0.0.1 --port 8080 --account remo --alias Saved --password-file "
         "/run/secret");
    const Json::Value offered = Ask(kAmyIs, Api("profiles")).Json()["profiles"];
    ASSERT_EQ(offered.size(), 1U) << offered;
    EXPECT_EQ(offered[0]["service"], "dav");
    EXPECT_EQ(offered[0]["alias"], "Saved");
    EXPECT_EQ(offered[0]["account"], "remo");
    EXPECT_EQ(Ask("-u ben:b", Api("profiles")).Json()["profiles"].size(), 0U);
    Json::Value body;
    body["profile"] = offered[0]["id"];
    EXPECT_GE(Post("add", body, kBens).status, 400) << "it is amy's";
    EXPECT_EQ(Connections("-u ben:b").size(), 0U);
    const Answer added = Post("add", body);
    EXPECT_EQ(added.status, 200) << added.body;
    EXPECT_EQ(added.Json()["connection"], offered[0]["id"]);
    EXPECT_EQ(Ask(kAmyIs, Api("profiles")).Json()["profiles"].size(), 0U);
    EXPECT_THAT(Ask(kAmyIs, Api("connections")).body, Not(HasSubstr(kPassword)));
}

TEST_F(WebConnect, AnotherUsersConnectionsAreNobodysToChange) {
    const std::string id = Post("add", Dav()).Json()["connection"].asString();
    for (const char* action : {"connect", "disconnect", "forget"}) {
        EXPECT_EQ(Post(action, Named(id), kBens).status, 404) << action;
        EXPECT_EQ(Post(action, Named(id), "-u amy:a").status, 403) << action;
    }
    EXPECT_EQ(Post("add", Dav(), "-u amy:a").status, 403);
    // The tree learns of a mount a moment after it.
    EXPECT_TRUE(Eventually([&] { return StateOf(id) == "connected"; }));
}

}  // namespace
