#include "mount/mount_child.h"

#include <unistd.h>

#include <cerrno>
#include <clocale>
#include <new>

#include "core/error_cell.h"
#include "core/json.h"
#include "core/log.h"
#include "mount/glib_handle.h"
#include "mount/helper.h"
#include "mount/server_uri.h"
#include "mount/vfs_question.h"
#include "mount/vfs_result.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

/** The loop's context is its own: GIO's threads may have given the default one sources. */
GMainLoop* NewLoop() {
    GMainContext* context = g_main_context_new();
    g_main_context_push_thread_default(context);
    GMainLoop* loop = g_main_loop_new(context, FALSE);
    g_main_context_unref(context);
    return loop;
}

void MountLocation(VFS& session) {
    const std::unique_ptr<VFSMountOperaion> mount = NewMountOperaion(session);
    if (mount == nullptr) {
        return;
    }
    GFile* file =
        NewLocation(ReadableFullUri(session), session.GetUser(), "", VFS_ERR_HOST_UNREACHABLE);
    if (file == nullptr) {
        return;
    }
    const UniqueObject<GMountOperation> operation = NewOperation(*mount, file);
    g_signal_connect(operation.get(), "ask-question", G_CALLBACK(AskQuestion), mount.get());
    SetErr(VFS_ERR_NONE);
    g_file_mount_enclosing_volume(file, G_MOUNT_MOUNT_NONE, operation.get(), nullptr, MountFinished,
                                  mount.get());
    g_main_loop_run(mount->loop);
}

/** The identity that a user has to confirm, or the place of the mount inside the location. */
std::string ReportText(const VFS& session) {
    if (GetError() != VFS_ERR_NONE && !IdentityText().empty()) {
        return IdentityText();
    }
    Json::Value report(Json::objectValue);
    report["uri_path"] = session.GetPath();
    return json::toString(report);
}

/** One write: the parent reads once, and may have closed its end before a long text is through. */
void WriteReport(const std::string& text) {
    while (write(STDOUT_FILENO, text.data(), text.size()) < 0 && errno == EINTR) {
    }
    close(STDOUT_FILENO);
}

/** The report goes to standard output; the failure code is the status. */
void Run(const Json::Value& request) {
    VFS session;
    RestoreSession(request, session);
    if (BecomeUserInHelper(UserOf(request))) {
        MountLocation(session);
    } else {
        FailIfNoneSet();
    }
    const std::string text = ReportText(session);
    if (GetError() != VFS_ERR_NONE) {
        LOG_ERROR("Fail to mount, error = %d", GetError());
    }
    WriteReport(text);
    EndHelper(GetError());
}

}  // namespace

void FailIfNoneSet(SourceLine at) {
    if (GetError() == VFS_ERR_NONE) {
        SetErr(VFS_ERR_FAILED, at);
    }
}

std::unique_ptr<VFSMountOperaion> NewMountOperaion(VFS& session, SourceLine at) {
    std::unique_ptr<VFSMountOperaion> mount(new (std::nothrow) VFSMountOperaion);
    if (mount == nullptr) {
        LOG_ERROR_AT(at, "No memory");
        FailIfNoneSet(at);
        return nullptr;
    }
    setlocale(LC_ALL, "");
    mount->session = &session;
    return mount;
}

std::string ReadableFullUri(const VFS& session) {
    const std::string uri = session.GetURI();
    return ReadableUri(uri) + session.GetFullURI().substr(uri.size());
}

GFile* NewLocation(const std::string& uri, const std::string& user, const std::string& path,
                   __tag_vfs_err_ bad_uri, SourceLine at) {
    const UniqueSoupUri parsed(soup_uri_new(ReadableUri(uri).c_str()));
    if (parsed == nullptr) {
        LOG_ERROR_AT(at, "Wrong uri, %s", uri.c_str());
        SetErr(bad_uri, at);
        return nullptr;
    }
    if (!user.empty()) {
        soup_uri_set_user(parsed.get(), user.c_str());
    }
    if (!path.empty()) {
        soup_uri_set_path(parsed.get(), (path[0] == '/' ? path : "/" + path).c_str());
    }
    const std::string location = GioUri(parsed.get());
    GFile* file = g_file_new_for_commandline_arg(location.c_str());
    if (file == nullptr) {
        SetErr(VFS_ERR_INVALID_SERVER, at);
        LOG_ERROR_AT(at, "Wrong input %s, %s", location.c_str(), uri.c_str());
    }
    return file;
}

UniqueObject<GMountOperation> NewOperation(VFSMountOperaion& mount, GFile* file) {
    mount.file = file;
    mount.loop = NewLoop();
    UniqueObject<GMountOperation> operation(g_mount_operation_new());
    g_signal_connect(operation.get(), "ask-password", G_CALLBACK(AskPassword), &mount);
    return operation;
}

Json::Value DescribeSession(const VFS& session) {
    Json::Value request(Json::objectValue);
    request["user"] = session.GetUser();
    request["password"] = session.GetPass();
    request["uri"] = session.GetURI();
    request["path"] = session.GetPath();
    request["codepage"] = session.GetCodePage();
    request["full_path"] = session.GetFullPath();
    request["force"] = session.GetForce();
    return request;
}

void RestoreSession(const Json::Value& request, VFS& session) {
    const std::string path = request["path"].asString();
    session.Init(request["user"].asCString(), request["password"].asCString(),
                 request["uri"].asCString(), path.c_str(), request["codepage"].asCString(),
                 Json::Value(Json::objectValue), request["force"].asBool());
    session.SetPath(path.c_str(), nullptr);  // it was converted before
    session.SetFullPath(request["full_path"].asCString());
}

const HelperJob kMountJob = {"mount", Run};

}  // namespace ZYROVFS
