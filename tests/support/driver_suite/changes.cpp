/** What changes the tree: create, rename, move, copy, delete, and what stands in the way. */
#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

const Json::Value kNoParams(Json::objectValue);

__tag_vfs_err_ CodeOf(Meeting meeting) {
    return meeting == Meeting::kConflict    ? VFS_ERR_CONFLICT
           : meeting == Meeting::kDirectory ? VFS_ERR_IS_DIRECTORY
                                            : VFS_ERR_NONE;
}

bool Succeeds(Meeting meeting) {
    return CodeOf(meeting) == VFS_ERR_NONE;
}

}  // namespace

TEST_P(DriverChanges, AFolderIsMade) {
    EXPECT_TRUE(cloud->CreateFolder(Id("/docs"), "new one", kNoParams)) << seams::LogDump();
    ASSERT_TRUE(amy.Exists("/docs/new one"));
    EXPECT_TRUE(amy.Get(amy.Find("/docs/new one")).folder);
    EXPECT_TRUE(cloud->CreateFolder(Id("/"), "top", kNoParams)) << seams::LogDump();
    EXPECT_TRUE(amy.Exists("/top"));
}

TEST_P(DriverChanges, AFolderOfATakenNameIsAConflictWhereNamesAreUnique) {
    EXPECT_EQ(cloud->CreateFolder(Id("/"), "docs", kNoParams), !can.create_refuses_namesake);
    EXPECT_EQ(Code(), can.create_refuses_namesake ? VFS_ERR_CONFLICT : VFS_ERR_NONE)
        << seams::LogDump();
    EXPECT_TRUE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(amy.List(amy.Root()).size(), can.create_refuses_namesake ? 2U : 3U);
}

TEST_P(DriverChanges, AnItemIsRenamed) {
    EXPECT_TRUE(cloud->Rename(Id("/docs/a.txt"), "b.txt")) << seams::LogDump();
    EXPECT_EQ(TextOf("/docs/b.txt"), kDigits);
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    EXPECT_TRUE(cloud->Rename(Id("/docs"), "papers")) << seams::LogDump();
    EXPECT_EQ(TextOf("/papers/b.txt"), kDigits);
}

TEST_P(DriverChanges, ARenameNeverTakesAnotherItemsPlace) {
    amy.AddPath("/docs/b.txt", "other");
    EXPECT_EQ(cloud->Rename(Id("/docs/a.txt"), "b.txt"), Succeeds(can.rename_onto_file));
    EXPECT_EQ(Code(), CodeOf(can.rename_onto_file)) << seams::LogDump();
    EXPECT_EQ(amy.List(amy.Find("/docs")).size(), 2U);
}

TEST_P(DriverChanges, AnItemMoves) {
    const std::string id = amy.Find("/docs/a.txt");
    EXPECT_TRUE(Run(Op::kMove)) << seams::LogDump();
    EXPECT_EQ(amy.Find("/target/a.txt"), id);
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(TextOf("/target/a.txt"), kDigits);
}

TEST_P(DriverChanges, AFolderMovesWithItsContent) {
    EXPECT_TRUE(rig->MoveInto(*cloud, "/docs", "/target")) << seams::LogDump();
    EXPECT_EQ(TextOf("/target/docs/a.txt"), kDigits);
    EXPECT_FALSE(amy.Exists("/docs"));
}

TEST_P(DriverChanges, AMoveOntoAFile) {
    amy.AddPath("/target/a.txt", "other");
    EXPECT_EQ(Run(Op::kMove), Succeeds(can.move_onto_file)) << seams::LogDump();
    EXPECT_EQ(Code() == CodeOf(can.move_onto_file) || Succeeds(can.move_onto_file), true)
        << seams::LogDump();
    const size_t there = amy.List(amy.Find("/target")).size();
    EXPECT_EQ(there, can.move_onto_file == Meeting::kBeside ? 2U : 1U);
    EXPECT_EQ(amy.Exists("/docs/a.txt"), !Succeeds(can.move_onto_file));
    if (can.move_onto_file != Meeting::kBeside) {
        EXPECT_EQ(TextOf("/target/a.txt"),
                  can.move_onto_file == Meeting::kReplaces ? kDigits : "other");
    }
}

TEST_P(DriverChanges, AMoveOntoAFolderLeavesThatFolder) {
    amy.AddPath("/target/a.txt/inside", "kept");
    EXPECT_EQ(Run(Op::kMove), Succeeds(can.move_onto_folder)) << seams::LogDump();
    if (!Succeeds(can.move_onto_folder)) {
        EXPECT_EQ(Code(), CodeOf(can.move_onto_folder)) << seams::LogDump();
        EXPECT_EQ(TextOf("/docs/a.txt"), kDigits);
    }
    EXPECT_EQ(Count(Op::kDelete), 0U);
    EXPECT_EQ(amy.List(amy.Find("/target")).size(), Succeeds(can.move_onto_folder) ? 2U : 1U);
}

TEST_P(DriverChanges, ACopyIsAnotherItem) {
    EXPECT_TRUE(Run(Op::kCopy)) << seams::LogDump();
    EXPECT_EQ(TextOf("/target/a.txt"), kDigits);
    EXPECT_EQ(TextOf("/docs/a.txt"), kDigits);
    EXPECT_NE(amy.Find("/target/a.txt"), amy.Find("/docs/a.txt"));
}

TEST_P(DriverChanges, ACopyUnderAnotherNameHasItWhereTheServiceCanDoThat) {
    EXPECT_TRUE(cloud->Copy("/docs/a.txt", "/target/b.txt")) << seams::LogDump();
    EXPECT_EQ(amy.Exists("/target/b.txt"), can.copy_renames);
    EXPECT_EQ(amy.Exists("/target/a.txt"), !can.copy_renames);
}

TEST_P(DriverChanges, ACopyWithOneConflict) {
    amy.AddPath("/target/a.txt", "other");
    Show("/target/a.txt");
    EXPECT_EQ(Run(Op::kCopy), Succeeds(can.copy_onto_file)) << seams::LogDump();
    const bool beside = can.copy_onto_file == Meeting::kBeside;
    EXPECT_EQ(amy.List(amy.Find("/target")).size(), beside ? 2U : 1U);
    EXPECT_EQ(Count(Op::kCopy), beside ? 1U : 2U) << sim.Journal().Text();
    if (!beside) {
        EXPECT_EQ(TextOf("/target/a.txt"), kDigits);
    }
}

TEST_P(DriverChanges, ACopyWithTwoConflictsFails) {
    if (can.copy_onto_file != Meeting::kReplaces) {
        GTEST_SKIP() << "nothing stands in the way of a copy";
    }
    amy.AddPath("/target/a.txt", "other");
    Add(rig->Conflict(On(Op::kCopy)).After(1));
    EXPECT_FALSE(Run(Op::kCopy));
    EXPECT_EQ(Code(), VFS_ERR_CONFLICT) << seams::LogDump();
    EXPECT_EQ(Count(Op::kCopy), 2U);
    EXPECT_EQ(TextOf("/docs/a.txt"), kDigits);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_P(DriverChanges, ACopyNeverReplacesAFolder) {
    amy.AddPath("/target/a.txt/inside", "kept");
    EXPECT_EQ(Run(Op::kCopy), Succeeds(can.copy_onto_folder)) << seams::LogDump();
    if (!Succeeds(can.copy_onto_folder)) {
        EXPECT_EQ(Code(), CodeOf(can.copy_onto_folder)) << seams::LogDump();
        EXPECT_EQ(TextOf("/target/a.txt/inside"), "kept");
    }
    EXPECT_EQ(amy.List(amy.Find("/target")).size(), Succeeds(can.copy_onto_folder) ? 2U : 1U);
}

TEST_P(DriverChanges, ACopyOfWhatIsNotThereFails) {
    EXPECT_FALSE(cloud->Copy("/docs/none.txt", "/target/none.txt"));
    EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND) << seams::LogDump();
    EXPECT_TRUE(amy.List(amy.Find("/target")).empty());
}

TEST_P(DriverChanges, AFolderIsDeletedWithItsContent) {
    EXPECT_TRUE(cloud->Delete(Id("/docs"))) << seams::LogDump();
    EXPECT_FALSE(amy.Exists("/docs"));
    EXPECT_TRUE(amy.Exists("/target"));
}

TEST_P(DriverChanges, WhatIsDeletedTwice) {
    const std::string id = Id("/docs/a.txt");
    EXPECT_TRUE(cloud->Delete(id)) << seams::LogDump();
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(cloud->Delete(id), can.deletes_twice) << seams::LogDump();
    if (!can.deletes_twice) {
        EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND);
    }
    EXPECT_TRUE(amy.Exists("/docs"));
}

}  // namespace driver_suite
