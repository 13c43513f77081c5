// Moves over a file, at the two services that refuse them.
#include "bridge/gvfs_flow_move.h"

#include "support/backend.h"

namespace backend {
namespace {

class FlowMove : public EachBackend {
  protected:
    void SetUp() override {
        EachBackend::SetUp();
        amy.AddPath("/docs/a.txt", "new");
        amy.AddFolder(amy.Root(), "target");
    }
    /** The driver's name for what the account has at a path. */
    std::string Id(const std::string& path) const {
        const cloudsim::Item item = amy.Get(amy.Find(path));
        return rig->Protocol() == "box" ? (item.folder ? "folders/" : "files/") + item.id : item.id;
    }
    int Call(const char* id, ZYROCloud_Cache* with, const char* from, const char* to,
             const char* to_path, int* error) const {
        const auto move =
            rig->Protocol() == "box" ? ZYROCloud_Cloud_Box_Move : ZYROCloud_Cloud_OneDrive_Move;
        return move(id, with, from, to, to_path, error);
    }
    int Move(const std::string& path, const std::string& folder) {
        const std::string to_path = folder + path.substr(path.rfind('/'));
        return Call(server_id.c_str(), cache, Id(path).c_str(), Id(folder).c_str(), to_path.c_str(),
                    &err);
    }
    /** Makes the service find the name taken when an item is moved. */
    Fault Conflict() const {
        const bool box = rig->Protocol() == "box";
        return Fault::On(box ? "PUT" : "MOVE", "/")
            .Answer(box ? 409 : 400, R"({"error":{"code":"resource_already_exists"}})");
    }
    std::string BytesAt(const std::string& path) const { return amy.Bytes(amy.Find(path)); }
    size_t Deletes() const {
        size_t deletes = 0;
        for (const std::string& request : Requests()) {
            deletes += request.rfind("DELETE ", 0) == 0 ? 1 : 0;
        }
        return deletes;
    }
};

TEST_P(FlowMove, PutsAnItemIntoAFolder) {
    EXPECT_EQ(Move("/docs/a.txt", "/target"), 1) << seams::LogDump();
    EXPECT_EQ(BytesAt("/target/a.txt"), "new");
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(Requests().size(), 1U);
    EXPECT_EQ(err, kUntouched);
}

TEST_P(FlowMove, OverwritesAFileThatIsInTheWay) {
    amy.AddPath("/target/a.txt", "old");
    EXPECT_EQ(Move("/docs/a.txt", "/target"), 1) << seams::LogDump();
    EXPECT_EQ(BytesAt("/target/a.txt"), "new");
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(Deletes(), 1U);
}

TEST_P(FlowMove, OntoAFolderFailsAndDeletesNothing) {
    amy.AddPath("/target/a.txt/inner", "kept");
    EXPECT_EQ(Move("/docs/a.txt", "/target"), 0);
    EXPECT_EQ(err, G_IO_ERROR_IS_DIRECTORY);
    EXPECT_EQ(Deletes(), 0U);
    EXPECT_EQ(BytesAt("/target/a.txt/inner"), "kept");
    EXPECT_EQ(BytesAt("/docs/a.txt"), "new");
}

TEST_P(FlowMove, OfAnItemToWhereItIsDoesNotDeleteIt) {
    sim.AddFault(Conflict());
    EXPECT_EQ(Move("/docs/a.txt", "/docs"), 0);
    EXPECT_EQ(err, G_IO_ERROR_EXISTS);
    EXPECT_EQ(Deletes(), 0U);
    EXPECT_EQ(BytesAt("/docs/a.txt"), "new");
}

TEST_P(FlowMove, DeletesNothingThatHasAnotherNameThanTheItem) {
    amy.AddPath("/docs/a.txt - Amy Doe", "new");
    amy.AddPath("/target/a.txt", "kept");
    sim.AddFault(Conflict());
    // Box's paths may have an owner in them, and then lead to an item without it.
    EXPECT_EQ(Move("/docs/a.txt - Amy Doe", "/target"), 0);
    EXPECT_EQ(err, rig->Protocol() == "box" ? G_IO_ERROR_EXISTS : G_IO_ERROR_NOT_FOUND);
    EXPECT_EQ(Deletes(), 0U);
    EXPECT_EQ(BytesAt("/target/a.txt"), "kept");
}

TEST_P(FlowMove, ThatCannotFindWhatIsInTheWayFails) {
    amy.AddPath("/target/a.txt", "old");
    const std::string from = Id("/docs/a.txt");
    EXPECT_EQ(
        Call(server_id.c_str(), cache, from.c_str(), Id("/target").c_str(), "/target/none", &err),
        0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_TRUE(seams::Logged("Failed to find the path, /target/none")) << seams::LogDump();
    EXPECT_EQ(Deletes(), 0U);
}

TEST_P(FlowMove, ThatCannotDeleteWhatIsInTheWayFails) {
    amy.AddPath("/target/a.txt", "old");
    sim.AddFault(Fault::On("DELETE", "/").Answer(403, "{}"));
    EXPECT_EQ(Move("/docs/a.txt", "/target"), 0);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
    EXPECT_TRUE(seams::Logged("Failed to delete path /target/a.txt")) << seams::LogDump();
    EXPECT_EQ(BytesAt("/target/a.txt"), "old");
}

TEST_P(FlowMove, ThatMeetsASecondConflictFailsAfterOneRepeat) {
    amy.AddPath("/target/a.txt", "old");
    const std::string method = rig->Protocol() == "box" ? "PUT" : "MOVE";
    sim.AddFault(Fault::On(method, "/")
                     .Times(2)
                     .Answer(rig->Protocol() == "box" ? 409 : 400,
                             R"({"error":{"code":"resource_already_exists"}})"));
    EXPECT_EQ(Move("/docs/a.txt", "/target"), 0);
    EXPECT_EQ(err, G_IO_ERROR_EXISTS);
    EXPECT_EQ(Deletes(), 1U);
    EXPECT_TRUE(seams::LoggedPart("Failed to move a file form ")) << seams::LogDump();
}

TEST_P(FlowMove, ThatTheServiceRefusesFails) {
    sim.AddFault(Fault::On(rig->Protocol() == "box" ? "PUT" : "MOVE", "/").Answer(403, "{}"));
    const std::string from = Id("/docs/a.txt");
    const std::string to = Id("/target");
    EXPECT_EQ(Move("/docs/a.txt", "/target"), 0);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
    EXPECT_TRUE(seams::LoggedPart("Failed to move a file form " + from + " to " + to + ", err: {"))
        << seams::LogDump();
    EXPECT_EQ(Deletes(), 0U);
}

TEST_P(FlowMove, OfOrToNothingIsNotFound) {
    EXPECT_EQ(Call(server_id.c_str(), cache, "", Id("/target").c_str(), "/target/a.txt", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_EQ(Call(server_id.c_str(), cache, Id("/docs").c_str(), "", "/a.txt", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_P(FlowMove, WithoutAnArgumentThatItNeedsIsRefused) {
    const char* const id = server_id.c_str();
    EXPECT_EQ(Call(nullptr, cache, "a", "b", "/c", &err), 0);
    EXPECT_EQ(Call(id, nullptr, "a", "b", "/c", &err), 0);
    EXPECT_EQ(Call(id, cache, nullptr, "b", "/c", &err), 0);
    EXPECT_EQ(Call(id, cache, "a", nullptr, "/c", &err), 0);
    EXPECT_EQ(Call(id, cache, "a", "b", nullptr, &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
    EXPECT_EQ(Call(id, cache, "", "b", "/c", nullptr), 0);
    EXPECT_THAT(Requests(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(, FlowMove, testing::Values(Make<BoxRig>, Make<OneDriveRig>), NameOf);

}  // namespace
}  // namespace backend
