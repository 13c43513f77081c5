#include "mount/vfs_result.h"

#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "mount/vfs_private.h"
#include "support/scripted_location.h"
#include "support/seams.h"
#include "zyrovfs/error.h"

namespace ZYROVFS {
namespace {

class Result : public testing::Test {
  protected:
    Result() {
        ResetError();
        IdentityText().clear();
        session_.SetURI("ftp://nas");
        mount_.session = &session_;
        mount_.file = scripted::NewFile(nullptr, "ftp://nas", nullptr);
        mount_.loop = g_main_loop_new(nullptr, TRUE);
    }

    __tag_vfs_err_ MountEnds(const scripted::End& end) {
        Deliver(MountFinished, G_OBJECT(mount_.file), end, &mount_);
        EXPECT_FALSE(g_main_loop_is_running(mount_.loop));
        return GetError();
    }

    __tag_vfs_err_ UnmountEnds(const scripted::End& end) {
        GMount* mounted = scripted::NewMount();
        Deliver(UnmountFinished, G_OBJECT(mounted), end, &mount_);
        g_object_unref(mounted);
        EXPECT_FALSE(g_main_loop_is_running(mount_.loop));
        return GetError();
    }

    static void Deliver(GAsyncReadyCallback callback, GObject* source, const scripted::End& end,
                        gpointer data) {
        GTask* task = g_task_new(source, nullptr, nullptr, nullptr);
        g_object_ref(task);
        scripted::Finish(task, end);
        callback(source, G_ASYNC_RESULT(task), data);
        g_object_unref(task);
    }

    VFS session_;
    VFSMountOperaion mount_;
};

struct Row {
    int gio;
    const char* uri;
    __tag_vfs_err_ code;
};
std::ostream& operator<<(std::ostream& out, const Row& row) {
    return out << "GIO error " << row.gio << " of " << row.uri;
}

class GioCodes : public Result, public testing::WithParamInterface<Row> {};

TEST_P(GioCodes, BecomeFailureCodes) {
    session_.SetURI(GetParam().uri);
    EXPECT_EQ(MountEnds(scripted::Failure(GetParam().gio)), GetParam().code);
    EXPECT_TRUE(seams::Logged("Unable to access " + std::string(GetParam().uri)))
        << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Error: [" + std::to_string(G_IO_ERROR) + ", " +
                              std::to_string(GetParam().gio) + "], no"))
        << seams::LogDump();
}

TEST_P(GioCodes, DoNotDependOnTheDomain) {
    session_.SetURI(GetParam().uri);
    EXPECT_EQ(MountEnds(scripted::Failure(GetParam().gio, "no", G_FILE_ERROR)), GetParam().code);
}

INSTANTIATE_TEST_SUITE_P(
    All, GioCodes,
    testing::Values(Row{G_IO_ERROR_FAILED, "ftp://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_NOT_SUPPORTED, "ftp://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_BROKEN_PIPE, "ftp://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_PERMISSION_DENIED, "ftp://nas", VFS_ERR_WRONG_USERNAME},
                    Row{G_IO_ERROR_CLOSED, "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
                    Row{G_IO_ERROR_TIMED_OUT, "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
                    Row{G_IO_ERROR_HOST_NOT_FOUND, "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
                    Row{G_IO_ERROR_HOST_UNREACHABLE, "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
                    Row{G_IO_ERROR_NETWORK_UNREACHABLE, "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
                    Row{G_IO_ERROR_PENDING, "ftp://nas", VFS_ERR_MOUNT_PENDING},
                    Row{G_IO_ERROR_CONNECTION_REFUSED, "ftp://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_CONNECTION_REFUSED, "sftp://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_CONNECTION_REFUSED, "dav://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_CONNECTION_REFUSED, "davs://nas", VFS_ERR_ACCESS_DENIED},
                    Row{G_IO_ERROR_CONNECTION_REFUSED, "box://amy@x.org", VFS_ERR_UNAUTHORIZED},
                    Row{G_IO_ERROR_CONNECTION_REFUSED, "smb://nas", VFS_ERR_UNAUTHORIZED},
                    Row{G_IO_ERROR_BUSY, "ftp://nas", VFS_ERR_FAILED},
                    Row{G_IO_ERROR_NOT_FOUND, "ftp://nas", VFS_ERR_FAILED},
                    Row{G_IO_ERROR_NOT_MOUNTED, "ftp://nas", VFS_ERR_FAILED},
                    Row{9999, "ftp://nas", VFS_ERR_FAILED}));

TEST_F(Result, ASuccessfulMountClearsTheCell) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    EXPECT_EQ(MountEnds({}), VFS_ERR_NONE);
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(Result, AlreadyMountedCountsAsSuccess) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_ALREADY_MOUNTED)), VFS_ERR_NONE);
}

TEST_F(Result, TheNumberOfAlreadyMountedInAnotherDomainIsAFailure) {
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_ALREADY_MOUNTED, "no", G_FILE_ERROR)),
              VFS_ERR_FAILED);
}

TEST_F(Result, AnAbortedMountKeepsTheCodeOfItsHandler) {
    for (const int gio : {G_IO_ERROR_FAILED_HANDLED, G_IO_ERROR_CANCELLED}) {
        VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
        EXPECT_EQ(MountEnds(scripted::Failure(gio)), VFS_ERR_WRONG_PASSWORD);
        ResetError();
        EXPECT_EQ(MountEnds(scripted::Failure(gio)), VFS_ERR_FAILED);
    }
    EXPECT_TRUE(seams::Logged("Unable to access ftp://nas")) << seams::LogDump();
}

TEST_F(Result, TheMessageOfAnAbortedMountOverridesNothing) {
    VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_CANCELLED, "Identification is wrong")),
              VFS_ERR_WRONG_PASSWORD);
}

TEST_F(Result, TheNumberOfAnAbortInAnotherDomainIsAPlainFailure) {
    VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_CANCELLED, "no", G_FILE_ERROR)),
              VFS_ERR_FAILED);
}

TEST_F(Result, AnIdentityMessageAsksTheUser) {
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_TIMED_OUT, "identity:nas\tSHA256:x")),
              VFS_ERR_IDENTITY_QUESTION);
    EXPECT_EQ(IdentityText(), "nas\tSHA256:x");
}

TEST_F(Result, MessagesOverrideTheCodeAsWholeTexts) {
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_TIMED_OUT, "Login dialog cancelled")),
              VFS_ERR_IDENTITY_QUESTION);
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_TIMED_OUT, "Identification is wrong")),
              VFS_ERR_IDENTITY_WRONG);
    EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_TIMED_OUT, "Not a WebDAV enabled share")),
              VFS_ERR_ACCESS_DENIED);
    EXPECT_EQ(IdentityText(), "");
}

TEST_F(Result, PartsOfTheMessagesOverrideNothing) {
    for (const char* message :
         {"Login dialog cancelled.", "login dialog cancelled", "Login dialog",
          "Sorry: Identification is wrong", "identity", "no identity:nas", ""}) {
        EXPECT_EQ(MountEnds(scripted::Failure(G_IO_ERROR_TIMED_OUT, message)),
                  VFS_ERR_HOST_UNREACHABLE)
            << message;
    }
}

TEST_F(Result, AMountWithoutUserDataIsABadParameterAndQuitsNothing) {
    Deliver(MountFinished, G_OBJECT(mount_.file), {}, nullptr);
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(g_main_loop_is_running(mount_.loop));
}

TEST_F(Result, AnUnmountWithoutUserDataIsABadParameterAndQuitsNothing) {
    GMount* mounted = scripted::NewMount();
    Deliver(UnmountFinished, G_OBJECT(mounted), {}, nullptr);
    g_object_unref(mounted);
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(g_main_loop_is_running(mount_.loop));
}

TEST_F(Result, ASuccessfulUnmountClearsTheCell) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    EXPECT_EQ(UnmountEnds({}), VFS_ERR_NONE);
}

TEST_F(Result, AnUnmountOfWhatIsNotMountedOrWasAnsweredClearsTheCell) {
    for (const int gio : {G_IO_ERROR_FAILED_HANDLED, G_IO_ERROR_NOT_MOUNTED}) {
        VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
        EXPECT_EQ(UnmountEnds(scripted::Failure(gio)), VFS_ERR_NONE);
    }
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(Result, AnyOtherFailureOfAnUnmountIsLoggedAndSetsNoCode) {
    EXPECT_EQ(UnmountEnds(scripted::Failure(G_IO_ERROR_BUSY, "in use")), VFS_ERR_NONE);
    EXPECT_TRUE(seams::Logged("Unable to unmount location uri ftp://nas, [" +
                              std::to_string(G_IO_ERROR_BUSY) + "], in use"))
        << seams::LogDump();
    VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
    EXPECT_EQ(UnmountEnds(scripted::Failure(G_IO_ERROR_BUSY)), VFS_ERR_WRONG_PASSWORD);
}

}  // namespace
}  // namespace ZYROVFS
