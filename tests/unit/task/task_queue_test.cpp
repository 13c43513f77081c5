// What stands in the queues, as those see it who show it.
#include <gmock/gmock.h>

#include "support/stranger.h"
#include "unit/task/task_fixture.h"

namespace {

using namespace ZYROVFS;
using namespace task_fixture;
using testing::ElementsAre;
using testing::IsEmpty;

MATCHER_P2(IsEntry, id, pid, "") {
    return arg.id == id && arg.pid == static_cast<int>(pid);
}

class TaskQueue : public TaskTest {
  protected:
    std::vector<TaskQueueEntry> Entries() {
        std::vector<TaskQueueEntry> entries{{"stale", 1}};
        EXPECT_TRUE(ReadTaskQueue("copy", entries)) << seams::LogDump();
        return entries;
    }
    static std::vector<std::string> Names() {
        std::vector<std::string> names{"stale"};
        EXPECT_TRUE(ListTaskQueues(names)) << seams::LogDump();
        return names;
    }
};

TEST_F(TaskQueue, TypesAreListedSortedAndNoneWhereNothingWasQueued) {
    EXPECT_THAT(Names(), IsEmpty());
    TaskMgr tasks(3);
    for (const char* name : {"move", "copy"}) {
        ASSERT_TRUE(tasks.Add(name, "a", getpid()));
    }
    scratch::PutText(kUser + "/zyrovfs/task/file", "no queue");
    EXPECT_THAT(Names(), ElementsAre("copy", "move"));
}

TEST_F(TaskQueue, EntriesComeInTheirOrderAndADamagedLineIsPassedOver) {
    EXPECT_THAT(Entries(), IsEmpty());
    TaskMgr tasks(3);
    ASSERT_TRUE(tasks.Add("copy", "a b", 12));
    ASSERT_TRUE(tasks.Add("copy", "c", 13));
    scratch::PutText(kQueue, scratch::Text(kQueue) + "half\n" + Line("d", 14));
    EXPECT_THAT(Entries(), ElementsAre(IsEntry("a b", 12), IsEntry("c", 13), IsEntry("d", 14)));
}

TEST_F(TaskQueue, OneEntryIsTakenOutAtOnceAndTheOthersStay) {
    TaskMgr tasks(3);
    for (const char* id : {"long a", "a", "b"}) {
        ASSERT_TRUE(tasks.Add("copy", id, 12));
    }
    EXPECT_TRUE(RemoveFromTaskQueue("copy", "a", 12));
    EXPECT_THAT(Entries(), ElementsAre(IsEntry("long a", 12), IsEntry("b", 12)));
    EXPECT_TRUE(RemoveFromTaskQueue("copy", "a", 12)) << "what is not there";
    EXPECT_TRUE(RemoveFromTaskQueue("copy", "b", 13));
    EXPECT_TRUE(RemoveFromTaskQueue("copy", "b", 12));
    EXPECT_TRUE(RemoveFromTaskQueue("copy", "long a", 12));
    EXPECT_EQ(scratch::Text(kQueue), "");
    EXPECT_TRUE(seams::Sleeps().empty());
}

TEST_F(TaskQueue, TypeThatNamesAPathIsRefused) {
    std::vector<TaskQueueEntry> entries;
    for (const char* name : {"", ".", "..", "a/b", static_cast<const char*>(nullptr)}) {
        EXPECT_FALSE(ReadTaskQueue(name, entries));
        EXPECT_FALSE(RemoveFromTaskQueue(name, "a", 1));
    }
    EXPECT_FALSE(RemoveFromTaskQueue("copy", nullptr, 1));
}

TEST_F(TaskQueue, LinkOfAStrangersInPlaceOfAFolderLeadsNowhere) {
    const std::string elsewhere = "/etc/elsewhere";
    stranger::fs::create_directories(elsewhere);
    scratch::PutText(elsewhere + "/copy", Line("theirs", 1));
    stranger::MakeOpenToAll(kUser + "/zyrovfs/task");
    ASSERT_TRUE(stranger::Link(elsewhere, kFolder));
    std::vector<TaskQueueEntry> entries;
    ReadTaskQueue("copy", entries);
    EXPECT_THAT(entries, IsEmpty());
    RemoveFromTaskQueue("copy", "theirs", 1);
    EXPECT_EQ(scratch::Text(elsewhere + "/copy"), Line("theirs", 1));
    EXPECT_THAT(Names(), IsEmpty());
}

TEST_F(TaskQueue, FifoOrHugeFileInPlaceOfTheQueueIsNotRead) {
    const stranger::Patience patience;
    TaskMgr tasks(3);
    ASSERT_TRUE(tasks.Add("copy", "a", 12));
    std::vector<TaskQueueEntry> entries;
    stranger::fs::remove(kQueue);
    ASSERT_EQ(mkfifo(kQueue.c_str(), 0666), 0);
    EXPECT_FALSE(ReadTaskQueue("copy", entries));
    EXPECT_FALSE(RemoveFromTaskQueue("copy", "a", 12));
    stranger::fs::remove(kQueue);
    scratch::PutText(kQueue, "");
    ASSERT_EQ(truncate(kQueue.c_str(), off_t{1} << 40), 0);
    EXPECT_FALSE(ReadTaskQueue("copy", entries));
    EXPECT_FALSE(RemoveFromTaskQueue("copy", "a", 12));
}

}  // namespace
