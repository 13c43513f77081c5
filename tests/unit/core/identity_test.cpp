#include "core/identity.h"

#include <gmock/gmock.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "support/other_process.h"
#include "support/seams.h"

namespace ZYROVFS {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr uid_t kAmy = 1001;
constexpr uid_t kBob = 1002;
constexpr gid_t kUsers = 100;
constexpr uid_t kNone = static_cast<uid_t>(-1);

/** Runs a step under an effective identity, and is root again after it. */
template <typename Step>
void As(uid_t uid, gid_t gid, Step step) {
    ASSERT_EQ(setegid(gid), 0);
    ASSERT_EQ(seteuid(uid), 0);
    seams::Reset();
    step();
    seams::Reset();  // and every planned failure with it
    ASSERT_EQ(seteuid(0), 0);
    ASSERT_EQ(setegid(0), 0);
}

/** Texts of the log with their priority in front, without the place. */
std::vector<std::string> Lines() {
    std::vector<std::string> lines;
    for (const seams::LogLine& line : seams::LogLines()) {
        char priority[8];
        snprintf(priority, sizeof priority, "0x%x ", static_cast<unsigned>(line.priority));
        lines.push_back(priority + line.text.substr(line.text.find(' ') + 1));
    }
    return lines;
}

std::vector<std::string> calls_inside;

void NoteCalls() {
    calls_inside = seams::IdentityCalls();
}

// --- becoming a user -----------------------------------------------------------------------

TEST(RunAs, RootBecomesTheUserAndIsRootAgain) {
    bool ran = false;
    IF_RUN_AS(kAmy, kUsers) {
        ran = true;
        EXPECT_EQ(geteuid(), kAmy);
        EXPECT_EQ(getegid(), kUsers);
        EXPECT_EQ(getuid(), 0U);
        NoteCalls();
    }
    else {
        ADD_FAILURE();
    }
    EXPECT_TRUE(ran);
    EXPECT_THAT(calls_inside, ElementsAre("setresgid(-1, 100, -1)", "setresuid(-1, 1001, -1)"));
    EXPECT_THAT(seams::IdentityCalls(),
                ElementsAre("setresgid(-1, 100, -1)", "setresuid(-1, 1001, -1)",
                            "setresuid(-1, 0, -1)", "setresgid(-1, 0, -1)"));
    EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(getegid(), 0U);
    EXPECT_THAT(Lines(), IsEmpty());
}

TEST(RunAs, TargetThatIsThePresentIdentityMakesNoSystemCallAndOpensItsBlock) {
    As(kAmy, kUsers, [] {
        bool ran = false;
        IF_RUN_AS(kAmy, kUsers) {
            ran = true;
        }
        EXPECT_TRUE(ran);
        EXPECT_THAT(seams::IdentityCalls(), IsEmpty());
    });
}

TEST(RunAs, OnlyTheGroupDiffers) {
    IF_RUN_AS(0, kUsers) {
        EXPECT_EQ(getegid(), kUsers);
    }
    EXPECT_THAT(seams::IdentityCalls(),
                ElementsAre("setresgid(-1, 100, -1)", "setresgid(-1, 0, -1)"));
}

TEST(RunAs, OneUserBecomesAnotherByWayOfRoot) {
    As(kAmy, kUsers, [] {
        IF_RUN_AS(kBob, 0) {
            EXPECT_EQ(geteuid(), kBob);
            EXPECT_EQ(getegid(), 0U);
            NoteCalls();
        }
        EXPECT_EQ(geteuid(), kAmy);
        EXPECT_EQ(getegid(), kUsers);
        EXPECT_THAT(calls_inside, ElementsAre("setresuid(-1, 0, -1)", "setresgid(-1, 0, -1)",
                                              "setresuid(-1, 1002, -1)"));
        EXPECT_THAT(seams::IdentityCalls(),
                    ElementsAre("setresuid(-1, 0, -1)", "setresgid(-1, 0, -1)",
                                "setresuid(-1, 1002, -1)", "setresuid(-1, 0, -1)",
                                "setresgid(-1, 100, -1)", "setresuid(-1, 1001, -1)"));
    });
}

TEST(RunAs, UserOfMinusOneStays) {
    IF_RUN_AS(kNone, kUsers) {
        EXPECT_EQ(geteuid(), 0U);
        EXPECT_EQ(getegid(), kUsers);
    }
    EXPECT_THAT(seams::IdentityCalls(),
                ElementsAre("setresgid(-1, 100, -1)", "setresgid(-1, 0, -1)"));
}

TEST(RunAs, FailedGroupSkipsTheBlockAndIsLogged) {
    seams::FailIdentity("setresgid", EPERM);
    bool ran = false;
    bool skipped = false;
    IF_RUN_AS(kAmy, kUsers) {
        ran = true;
    }
    else {
        skipped = true;
    }
    EXPECT_FALSE(ran);
    EXPECT_TRUE(skipped);
    EXPECT_THAT(seams::IdentityCalls(), ElementsAre("setresgid(-1, 100, -1)"));
    EXPECT_THAT(Lines(), ElementsAre("0x23 ERROR: IF_RUN_AS(1001, 100)"));
    EXPECT_EQ(seams::LogLines().at(0).text.rfind("identity_test.cpp:", 0), 0U)
        << "in the name of the block's own unit";
}

TEST(RunAs, FailedUserGivesTheGroupBack) {
    seams::FailIdentity("setresuid", EPERM);
    IF_RUN_AS(kAmy, kUsers) {
        ADD_FAILURE();
    }
    EXPECT_THAT(
        seams::IdentityCalls(),
        ElementsAre("setresgid(-1, 100, -1)", "setresuid(-1, 1001, -1)", "setresgid(-1, 0, -1)"));
    EXPECT_EQ(getegid(), 0U);
    EXPECT_THAT(Lines(), ElementsAre("0x23 ERROR: IF_RUN_AS(1001, 100)"));
}

TEST(RunAs, FailedWayToRootEndsTheEntering) {
    As(kAmy, kUsers, [] {
        seams::FailIdentity("setresuid", EPERM);
        IF_RUN_AS(kBob, 0) {
            ADD_FAILURE();
        }
        EXPECT_THAT(seams::IdentityCalls(), ElementsAre("setresuid(-1, 0, -1)"));
        EXPECT_THAT(Lines(), ElementsAre("0x23 ERROR: IF_RUN_AS(1002, 0)"));
        EXPECT_EQ(geteuid(), kAmy);
    });
}

TEST(RunAs, FailedWayBackIsCriticalAndTheProcessGoesOn) {
    As(kAmy, kUsers, [] {
        IF_RUN_AS(kBob, 0) {
            seams::FailIdentity("setresgid", EPERM);
        }
        EXPECT_THAT(Lines(), ElementsAre("0x22 ERROR: ~IF_RUN_AS(1001, 100)"));
        EXPECT_EQ(geteuid(), 0U) << "root for the group, then no further";
    });
}

TEST(RunAs, FailedReturnToRootIsCritical) {
    IF_RUN_AS(kAmy, kUsers) {
        seams::FailIdentity("setresuid", EPERM);
    }
    EXPECT_THAT(Lines(), ElementsAre("0x22 ERROR: ~IF_RUN_AS(0, 0)"));
    seams::Reset();
    ASSERT_EQ(seteuid(0), 0);
    ASSERT_EQ(setegid(0), 0);
}

TEST(RunAs, BlockThatLeftTheIdentityAsItWasNeedsNoWayBack) {
    IF_RUN_AS(kAmy, 0) {
        ASSERT_EQ(seteuid(0), 0);
        seams::Reset();
    }
    EXPECT_THAT(seams::IdentityCalls(), IsEmpty());
}

uid_t WhoBobIs() {
    IF_RUN_AS(kBob, 0) {
        return geteuid();
    }
    return 0;
}

TEST(RunAs, BlocksNest) {
    IF_RUN_AS(kAmy, 0) {
        EXPECT_EQ(WhoBobIs(), kBob);
        EXPECT_EQ(geteuid(), kAmy);
    }
    EXPECT_EQ(geteuid(), 0U);
}

TEST(RunAs, CallerWithoutSavedRootIdentityStaysWhoItIs) {
    const int status = support::ExitOf([] {
        if (setresgid(kUsers, kUsers, kUsers) != 0 || setresuid(kAmy, kAmy, kAmy) != 0) {
            return 10;
        }
        seams::Reset();
        IF_RUN_AS(kBob, 0) {
            return 11;
        }
        if (Lines() != std::vector<std::string>{"0x23 ERROR: IF_RUN_AS(1002, 0)"}) {
            return 12;
        }
        bool own = false;
        IF_RUN_AS(kAmy, kUsers) {
            own = true;
        }
        return own && geteuid() == kAmy && getegid() == kUsers ? 0 : 13;
    });
    EXPECT_EQ(status, 0);
}

// --- becoming root -------------------------------------------------------------------------

TEST(CriticalSection, UserIsRootInsideAndHimselfAfterwards) {
    As(kAmy, kUsers, [] {
        ENTERCriticalSection EXPECT_EQ(errno, 0);
        EXPECT_EQ(geteuid(), 0U);
        EXPECT_EQ(getegid(), 0U);
        NoteCalls();
        errno = ENOENT;
        LEAVECriticalSection EXPECT_EQ(errno, 0) << "whatever the block left";
        EXPECT_EQ(geteuid(), kAmy);
        EXPECT_EQ(getegid(), kUsers);
        EXPECT_THAT(calls_inside, ElementsAre("setresgid(-1, 0, -1)", "setresuid(-1, 0, -1)"));
        EXPECT_THAT(
            seams::IdentityCalls(),
            ElementsAre("setresgid(-1, 0, -1)", "setresuid(-1, 0, -1)", "setresuid(-1, 0, -1)",
                        "setresgid(-1, 100, -1)", "setresuid(-1, 1001, -1)"));
        EXPECT_THAT(Lines(), ElementsAre("0x26 WARNING: setresgid(-1, 0, -1)",
                                         "0x26 WARNING: setresuid(-1, 0, -1)",
                                         "0x26 WARNING: setresuid(-1, 0, -1)"));
    });
}

TEST(CriticalSection, RootNeedsNoCall) {
    errno = ENOENT;
    ENTERCriticalSection EXPECT_EQ(errno, 0);
    errno = EBUSY;
    LEAVECriticalSection EXPECT_EQ(errno, 0);
    EXPECT_THAT(seams::IdentityCalls(), IsEmpty());
    EXPECT_THAT(Lines(), IsEmpty());
}

TEST(CriticalSection, GroupThatIsRootStaysOutOfIt) {
    As(kAmy, 0, [] {
        ENTERCriticalSection EXPECT_EQ(geteuid(), 0U);
        LEAVECriticalSection EXPECT_THAT(
            seams::IdentityCalls(),
            ElementsAre("setresuid(-1, 0, -1)", "setresuid(-1, 0, -1)", "setresuid(-1, 1001, -1)"));
    });
}

bool BlockRuns(bool& ran) {
    bool result = false;
    ENTERCriticalSection ran = true;
    result = true;
    LEAVECriticalSection return result;
}

TEST(CriticalSection, FailedEntryStillRunsTheBlockAndReturnsItsResult) {
    As(kAmy, kUsers, [] {
        seams::FailIdentity("setresgid", EPERM);
        bool ran = false;
        EXPECT_TRUE(BlockRuns(ran));
        EXPECT_TRUE(ran);
        EXPECT_THAT(seams::IdentityCalls(), ElementsAre("setresgid(-1, 0, -1)"))
            << "what remains of the entry is left out, and there is nothing to go back from";
        EXPECT_THAT(Lines(),
                    ElementsAre("0x23 ERROR: setresgid(-1, 0, -1) [Operation not permitted]",
                                "0x23 ERROR: ENTERCriticalSection"));
    });
}

TEST(CriticalSection, FailedEntrySetsErrnoToOneForTheBlock) {
    As(kAmy, kUsers, [] {
        seams::FailIdentity("setresuid", EAGAIN);
        ENTERCriticalSection EXPECT_EQ(errno, 1);
        EXPECT_EQ(geteuid(), kAmy);
        EXPECT_EQ(getegid(), 0U);
        EXPECT_THAT(
            Lines(),
            ElementsAre("0x26 WARNING: setresgid(-1, 0, -1)",
                        "0x23 ERROR: setresuid(-1, 0, -1) [Resource temporarily unavailable]",
                        "0x23 ERROR: ENTERCriticalSection"));
        seams::Reset();
        LEAVECriticalSection EXPECT_THAT(seams::IdentityCalls(),
                                         ElementsAre("setresgid(-1, 100, -1)"))
            << "half an entry is undone";
        EXPECT_EQ(errno, 1) << "or tried to be: a user may not take a group that is only effective";
        EXPECT_EQ(Lines().back(), "0x23 ERROR: LEAVECriticalSection");
    });
}

TEST(CriticalSection, FailedLeaveSetsErrnoToOneAndIsLogged) {
    As(kAmy, kUsers, [] {
        ENTERCriticalSection seams::Reset();
        seams::FailIdentity("setresgid", EPERM);
        LEAVECriticalSection EXPECT_EQ(errno, 1);
        EXPECT_THAT(seams::IdentityCalls(),
                    ElementsAre("setresuid(-1, 0, -1)", "setresgid(-1, 100, -1)"))
            << "the step behind the failed one is left out";
        EXPECT_THAT(Lines(),
                    ElementsAre("0x26 WARNING: setresuid(-1, 0, -1)",
                                "0x23 ERROR: setresgid(-1, 100, -1) [Operation not permitted]",
                                "0x23 ERROR: LEAVECriticalSection"));
    });
}

TEST(CriticalSection, EachStepOfTheLeaveMayFail) {
    for (const int good_calls : {0, 1}) {
        As(kAmy, kUsers, [good_calls] {
            ENTERCriticalSection seams::Reset();
            seams::FailIdentity("setresuid", EPERM, good_calls);
            LEAVECriticalSection EXPECT_EQ(errno, 1);
            EXPECT_EQ(Lines().back(), "0x23 ERROR: LEAVECriticalSection");
            EXPECT_EQ(seams::IdentityCalls().size(), good_calls == 0 ? 1U : 3U);
        });
    }
}

TEST(CriticalSection, RootThatBecameAUserInsideIsRootAgain) {
    ENTERCriticalSection ASSERT_EQ(setegid(kUsers), 0);
    ASSERT_EQ(seteuid(kAmy), 0);
    seams::Reset();
    LEAVECriticalSection EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(getegid(), 0U);
    EXPECT_THAT(seams::IdentityCalls(),
                ElementsAre("setresuid(-1, 0, -1)", "setresgid(-1, 0, -1)"));
    EXPECT_THAT(Lines(), ElementsAre("0x26 WARNING: setresuid(-1, 0, -1)",
                                     "0x26 WARNING: setresgid(-1, 0, -1)"));
}

TEST(CriticalSection, SpeaksInTheNameOfItsSite) {
    As(kAmy, 0, [] {
        ENTERCriticalSection LEAVECriticalSection for (const seams::LogLine& line :
                                                       seams::LogLines()) {
            EXPECT_EQ(line.text.rfind("identity_test.cpp:", 0), 0U) << line.text;
        }
        EXPECT_FALSE(seams::LogLines().empty());
    });
}

TEST(CriticalSection, ReturnFromTheBlockLeavesIt) {
    As(kAmy, kUsers, [] {
        const auto leave_early = [] {
            ENTERCriticalSection return geteuid() == 0;
            LEAVECriticalSection
        };
        EXPECT_TRUE(leave_early());
        EXPECT_EQ(geteuid(), kAmy);
        EXPECT_EQ(getegid(), kUsers);
    });
}

TEST(CriticalSection, CallerWithoutSavedRootIdentityRunsTheBlockAsHimself) {
    const int status = support::ExitOf([] {
        if (setresgid(kUsers, kUsers, kUsers) != 0 || setresuid(kAmy, kAmy, kAmy) != 0) {
            return 10;
        }
        seams::Reset();
        uid_t inside = 0;
        ENTERCriticalSection inside = geteuid();
        LEAVECriticalSection if (inside != kAmy || geteuid() != kAmy || getegid() != kUsers) {
            return 11;
        }
        const std::vector<std::string> expected{
            "0x23 ERROR: setresgid(-1, 0, -1) [Operation not permitted]",
            "0x23 ERROR: ENTERCriticalSection"};
        return Lines() == expected && errno == 0 ? 0 : 12;
    });
    EXPECT_EQ(status, 0);
}

// --- effective uid alone -------------------------------------------------------------------

TEST(EffectiveUid, ChangesNothingElse) {
    As(kAmy, kUsers, [] {
        {
            const EffectiveUid root(0);
            EXPECT_TRUE(static_cast<bool>(root));
            EXPECT_EQ(geteuid(), 0U);
            EXPECT_EQ(getegid(), kUsers);
        }
        EXPECT_EQ(geteuid(), kAmy);
        EXPECT_THAT(seams::IdentityCalls(), ElementsAre("seteuid(0)", "seteuid(1001)"));
        EXPECT_THAT(Lines(), IsEmpty());
    });
}

TEST(EffectiveUid, FailureIsTold) {
    As(kAmy, kUsers, [] {
        seams::FailIdentity("seteuid", EPERM);
        const EffectiveUid root(0);
        EXPECT_FALSE(static_cast<bool>(root));
        EXPECT_EQ(geteuid(), kAmy);
    });
}

TEST(EffectiveUid, CallerWithoutSavedRootIdentityIsTold) {
    const int status = support::ExitOf([] {
        if (setresuid(kAmy, kAmy, kAmy) != 0) {
            return 10;
        }
        const EffectiveUid root(0);
        return !root && geteuid() == kAmy ? 0 : 11;
    });
    EXPECT_EQ(status, 0);
}

// --- user with root's group ----------------------------------------------------------------

TEST(UserWithRootGroup, IsTheUserInsideAndTheOldPairAfterwards) {
    As(kBob, kUsers, [] {
        {
            seams::Reset();
            ASSERT_EQ(seteuid(0), 0);
        }
        {
            const UserWithRootGroup user(kAmy);
            EXPECT_EQ(geteuid(), kAmy);
            EXPECT_EQ(getegid(), 0U);
        }
        EXPECT_EQ(geteuid(), 0U);
        EXPECT_EQ(getegid(), kUsers);
        EXPECT_THAT(Lines(), IsEmpty());
    });
}

TEST(UserWithRootGroup, FailedSwitchesAreLoggedInTheNameOfTheCaller) {
    seams::FailIdentity("seteuid", EPERM);
    seams::FailIdentity("setegid", EPERM);
    { const UserWithRootGroup user(kAmy, {"caller.cpp", 7}); }
    EXPECT_TRUE(seams::LoggedPart("caller.cpp:7 Failed to set uid 1001, Operation not permitted"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("caller.cpp:7 Failed to set gid 0, ")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("caller.cpp:7 Faile to setegid, ")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("caller.cpp:7 Faile to seteuid, ")) << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS
