#include "core/file_memo.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <filesystem>

#include "core/identity.h"
#include "support/scratch.h"

namespace ZYROVFS {
namespace {

/** Until a change of the file would show in its times: their clock stands for some milliseconds. */
void Settle(const std::string& path) {
    FileIdentity file;
    while (Identify(path, file) && !file.IsSettled()) {
    }
}

class Memo : public scratch::ScratchTest {
  protected:
    Memo() { PutSettled(path_, "old"); }

    static void PutSettled(const std::string& path, const std::string& text) {
        scratch::PutText(path, text);
        Settle(path);
    }
    /** What the memo has of the file, "none" for nothing. */
    std::string Get(const std::string& name = "") {
        const std::string* value = memo_.Get(path_, name, [this](std::string& text) {
            ++read_;
            text = scratch::Text(path_);
            return text != "bad";
        });
        return value == nullptr ? "none" : *value;
    }

    const std::string path_ = Path("file");
    FileMemo<std::string> memo_;
    int read_ = 0;
};

TEST_F(Memo, AFileThatStaysAsItIsIsReadOnce) {
    EXPECT_EQ(Get(), "old");
    EXPECT_EQ(Get(), "old");
    EXPECT_EQ(read_, 1);
}

TEST_F(Memo, AFileThatAnotherOneOfTheSameSizeReplacesIsReadAgain) {
    Get();
    PutSettled(Path("other"), "new");
    std::filesystem::rename(Path("other"), path_);
    EXPECT_EQ(Get(), "new");
}

TEST_F(Memo, AFileThatIsWrittenInItsPlaceIsReadAgain) {
    Get();
    PutSettled(path_, "new");
    EXPECT_EQ(Get(), "new");
}

TEST_F(Memo, AFileThatOnlyChangesItsModeIsReadAgain) {
    Get();
    chmod(path_.c_str(), 0600);
    EXPECT_EQ(Get(), "old");
    EXPECT_EQ(read_, 2);
}

TEST_F(Memo, AFileThatChangesWhileItIsReadIsReadAgain) {
    const auto read = [this](std::string& text) {
        text = scratch::Text(path_);
        PutSettled(path_, "new");
        return true;
    };
    EXPECT_EQ(*memo_.Get(path_, "", read), "old");
    EXPECT_EQ(Get(), "new");
}

// The next change might have the same time.
TEST(FileIdentity, IsSettledWhenItsLastChangeIsBehindTheClockOfFiles) {
    FileIdentity file;
    clock_gettime(CLOCK_REALTIME_COARSE, &file.changed);
    file.changed.tv_sec -= 1;
    EXPECT_TRUE(file.IsSettled());
    file.changed.tv_sec += 3600;
    EXPECT_FALSE(file.IsSettled());
}

TEST_F(Memo, OfAFileThatIsGoneNothingIsKept) {
    Get();
    std::filesystem::remove(path_);
    EXPECT_EQ(Get(), "");
    EXPECT_EQ(Get(), "");
    EXPECT_EQ(read_, 3);
}

TEST_F(Memo, AFileThatCannotBeUsedGivesNothing) {
    Get();
    PutSettled(path_, "bad");
    EXPECT_EQ(Get(), "none");
    EXPECT_EQ(Get(), "none");
    EXPECT_EQ(read_, 3);
}

TEST_F(Memo, EachNameHasAValueOfItsOwnAlsoWhenThereAreMany) {
    for (int i = 0; i < 20; ++i) {
        EXPECT_EQ(Get(std::to_string(i)), "old");
    }
    EXPECT_EQ(read_, 20);
    EXPECT_EQ(Get("19"), "old");
    EXPECT_EQ(read_, 20) << "the last one is kept";
}

TEST_F(Memo, WhatOneUserReadServesNoOther) {
    Get();
    std::filesystem::permissions(directory_, std::filesystem::perms(0755));
    const EffectiveUid user(4001);
    EXPECT_EQ(Get(), "old");
    EXPECT_EQ(read_, 2);
}

}  // namespace
}  // namespace ZYROVFS
