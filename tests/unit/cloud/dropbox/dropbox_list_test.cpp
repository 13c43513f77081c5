#include "unit/cloud/dropbox/dropbox_fixture.h"

namespace ZYROCloud {
namespace {

constexpr const char* kFirst = "POST api /2/files/list_folder";
constexpr const char* kNext = "POST api /2/files/list_folder/continue";

/** A page with files of these names, and a cursor when more follows. */
std::string Page(const std::vector<std::string>& names, const std::string& cursor = "") {
    Json::Value page;
    page["entries"] = Json::Value(Json::arrayValue);
    for (const std::string& name : names) {
        Json::Value item;
        item["name"] = name;
        page["entries"].append(item);
    }
    page["has_more"] = !cursor.empty();
    page["cursor"] = cursor.empty() ? "end" : cursor;
    return Answer(200, json::toString(page));
}

class DropboxListing : public DropboxTest {
  protected:
    bool List(const std::string& path = "/docs", const Json::Value& params = Json::Value()) {
        return drive->ListFolder(path, params, out_);
    }
    std::vector<std::string> Names() const {
        std::vector<std::string> names;
        for (const Json::Value& item : out_) {
            names.push_back(item["name"].asString());
        }
        return names;
    }
    Json::Value out_;
};

TEST_F(DropboxListing, SlashAndEmptyBothListTheRootWithAnEmptyPath) {
    for (const char* path : {"/", ""}) {
        Give({Page({"a"})});
        EXPECT_TRUE(List(path)) << seams::LogDump();
        EXPECT_THAT(Requests(), ElementsAre(kFirst));
        EXPECT_EQ(Object(Last().body), Object(R"({"path":""})"));
    }
}

TEST_F(DropboxListing, SendsTheParametersAndThePath) {
    Give({Page({})});
    EXPECT_TRUE(List("/docs", Object(R"({"recursive":false,"path":"other"})")));
    EXPECT_EQ(Object(Last().body), Object(R"({"recursive":false,"path":"/docs"})"));
    EXPECT_TRUE(out_.isArray());
    EXPECT_TRUE(out_.empty());
}

TEST_F(DropboxListing, ThreePagesMakeOneFirstAndTwoFurtherRequestsInOrder) {
    out_ = Object(R"([{"name":"of an earlier listing"}])");
    Give({Page({"a", "b"}, "one"), Page({"c"}, "two"), Page({"d"})});
    EXPECT_TRUE(List()) << seams::LogDump();
    EXPECT_THAT(Names(), ElementsAre("a", "b", "c", "d"));
    EXPECT_THAT(Requests(), ElementsAre(kFirst, kNext, kNext));
    EXPECT_EQ(Object(All()[1].body), Object(R"({"cursor":"one"})"));
    EXPECT_EQ(Object(All()[2].body), Object(R"({"cursor":"two"})"));
}

TEST_F(DropboxListing, ShowsNamesThatTheFileTreeHides) {
    const std::vector<std::string> names = {
        "\"", "'", "a/b", std::string(256, 'x'), ".ZyrotechWorkingDirectory", ""};
    Give({Page(names)});
    EXPECT_TRUE(List());
    EXPECT_EQ(Names(), names);
}

TEST_F(DropboxListing, WithoutEntriesIsAnEmptyArray) {
    for (const char* body : {"{}", R"({"entries":null})", "null"}) {
        Give({Answer(200, body)});
        out_ = Json::Value();
        EXPECT_TRUE(List()) << body;
        EXPECT_TRUE(out_.isArray()) << body;
        EXPECT_TRUE(out_.empty()) << body;
    }
}

TEST_F(DropboxListing, OfAPageThatCannotBeHadFailsWithItsError) {
    Give({Page({"a"}, "one"), Answer(401)});
    EXPECT_FALSE(List());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    Give({kNotFound});
    EXPECT_FALSE(List());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(DropboxListing, ThatRepeatsItsOwnCursorEndsWithALine) {
    Give({Page({"a"}, "same"), Page({"b"}, "same"), Page({"c"}, "same")});
    EXPECT_FALSE(List());
    EXPECT_THAT(Requests(), ElementsAre(kFirst, kNext));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Listing goes in a circle, same")) << seams::LogDump();
}

TEST_F(DropboxListing, ThatComesBackToAnEarlierCursorEndsWithALine) {
    Give({Page({"a"}, "one"), Page({"b"}, "two"), Page({"c"}, "one"), Page({"d"}, "two")});
    EXPECT_FALSE(List());
    EXPECT_THAT(Requests(), ElementsAre(kFirst, kNext, kNext));
    EXPECT_TRUE(seams::Logged("Listing goes in a circle, one"));
}

TEST_F(DropboxListing, WithMoreToComeAndNoCursorAsksOnceMore) {
    Give({Answer(200, R"({"entries":[],"has_more":true})"),
          Answer(200, R"({"entries":[],"has_more":true})")});
    EXPECT_FALSE(List());
    EXPECT_THAT(Requests(), ElementsAre(kFirst, kNext));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(DropboxListing, ValuesOfTheWrongTypeAreAFailureOfTheCloud) {
    for (const char* body :
         {"[]", "7", R"("text")", R"({"entries":"text"})", R"({"entries":{"a":1}})",
          R"({"entries":[],"has_more":"yes"})", R"({"entries":[],"has_more":{}})",
          R"({"entries":[],"has_more":true,"cursor":{}})",
          R"({"entries":[],"has_more":true,"cursor":[]})"}) {
        Give({Answer(200, body)});
        drive->SetError(VFS_ERR_NONE, "");
        seams::Reset();
        EXPECT_FALSE(List()) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
        EXPECT_NE(seams::LogDump(), "") << body;
        EXPECT_THAT(Requests(), SizeIs(1)) << body;
    }
    Give({});
    EXPECT_FALSE(List("/", Object("[1]")));
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxListing, NumbersAndTextMayStandForEachOther) {
    Give({Answer(200, R"({"entries":[{"name":7,"size":"12"}],"has_more":1,"cursor":99})"),
          Answer(200, R"({"entries":[{"name":"b"}],"has_more":0})")});
    EXPECT_TRUE(List()) << seams::LogDump();
    EXPECT_THAT(Names(), ElementsAre("7", "b"));
    EXPECT_EQ(Object(Last().body), Object(R"({"cursor":"99"})"));
}

TEST_F(DropboxListing, AFurtherPageWhoseEntriesAreNoArrayHasNone) {
    Give({Page({"a"}, "one"), Answer(200, R"({"entries":"x","has_more":true,"cursor":"two"})"),
          Page({"b"})});
    EXPECT_TRUE(List()) << seams::LogDump();
    EXPECT_THAT(Names(), ElementsAre("a", "b"));
}

TEST_F(DropboxListing, ItemsOfAnyKindComeThroughAsTheyAre) {
    // What an item must have is for those who read it to say.
    const std::string entries = R"([{},7,null,"text",[1],{"name":{"x":1}},{"name":"","size":-1},)"
                                "{\"name\":\"\xff\xfe\\u0000\\u202e\xf0\x9f\x98\x80\\\\\\\"\"},"
                                R"({"name":")" +
                                std::string(4096, 'n') + R"(","size":"much"}])";
    Give({Answer(200, R"({"entries":)" + entries + R"(,"has_more":true,"cursor":"c"})"),
          Answer(200, R"({"entries":)" + entries + "}")});
    EXPECT_TRUE(List()) << seams::LogDump();
    const Json::Value wanted = Object(entries);
    ASSERT_EQ(out_.size(), 2 * wanted.size());
    for (Json::ArrayIndex i = 0; i < out_.size(); ++i) {
        EXPECT_EQ(out_[i], wanted[i % wanted.size()]) << i;
    }
}

TEST_F(DropboxListing, OfTenThousandItemsOfOneNameHasThemAll) {
    Give({Page(std::vector<std::string>(5000, "same"), "one"),
          Page(std::vector<std::string>(5000, "same"))});
    EXPECT_TRUE(List());
    EXPECT_THAT(Names(), testing::AllOf(SizeIs(10000), Each("same")));
}

TEST_F(DropboxListing, CutShortWithinItsJsonIsAskedForAgain) {
    Serve({{wire::ReadRequest(),
            wire::Send("HTTP/1.1 200 OK\r\nContent-Length: 900\r\n\r\n{\"entries\":[")},
           {wire::ReadRequest(), wire::Send(Page({"a"}))}});
    EXPECT_TRUE(List()) << seams::LogDump();
    EXPECT_THAT(Names(), ElementsAre("a"));
}

TEST_F(DropboxListing, MorePagesAreAddedToWhatIsThere) {
    out_ = Object(R"([{"name":"a"}])");
    Give({Page({"b"}, "two"), Page({"c"})});
    EXPECT_TRUE(drive->ListMoreFolder(out_, "one"));
    EXPECT_THAT(Names(), ElementsAre("a", "b", "c"));
    EXPECT_EQ(Object(All()[0].body), Object(R"({"cursor":"one"})"));
}

}  // namespace
}  // namespace ZYROCloud
