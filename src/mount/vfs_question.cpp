#include "mount/vfs_question.h"

#include <strings.h>
#include <zosplatform/device.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <string>

#include "core/error_cell.h"
#include "core/log.h"
#include "core/paths.h"
#include "mount/server_trust.h"
#include "mount/vfs_private.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

/** One password question. An answer function tells whether it is handled; else it is aborted. */
struct PasswordQuestion {
    GMountOperation* operation;
    const char* message;
    const char* default_user;
    GAskPasswordFlags flags;
    VFSMountOperaion& mount;

    bool Needs(int flag) const { return (flags & flag) != 0; }
};

constexpr int kUserOrPassword = G_ASK_PASSWORD_NEED_USERNAME | G_ASK_PASSWORD_NEED_PASSWORD;

bool TakeMountPath(const PasswordQuestion& question) {
    const char* path = question.default_user;
    if (path == nullptr) {
        return true;
    }
    if (*path == '\0') {
        // A backend that reports a mount without a place has lost its state: nothing that it says
        // from here on can be used, and the parent is to see a mount that died.
        std::abort();
    }
    question.mount.session->SetPath(*path == '/' ? path + 1 : path, nullptr);
    return true;
}

bool GiveCodePage(const PasswordQuestion& question) {
    g_mount_operation_set_domain(question.operation, question.mount.session->GetCodePage().c_str());
    return true;
}

bool GiveCaFile(const PasswordQuestion& question) {
    constexpr size_t kUriAt = sizeof "ca file path:" - 1;
    const bool has_uri = strlen(question.message) > kUriAt;
    std::string name;
    const bool by_bundle = ServerFileName(has_uri ? question.message + kUriAt : "", name) &&
                           TrustOfServer(GetActorUID(), name).kind == ServerTrust::kBundle;
    g_mount_operation_set_domain(question.operation, by_bundle ? paths::kCaBundle : "");
    return true;
}

bool SpeaksThroughProxy(const std::string& url) {
    for (const char* scheme : {"http://", "dav://", "https://", "davs://"}) {
        if (strncasecmp(url.c_str(), scheme, strlen(scheme)) == 0) {
            return true;
        }
    }
    return false;
}

bool GiveProxy(const PasswordQuestion& question) {
    const char* colon = strchr(question.message, ':');
    const char* url = colon == nullptr ? "" : colon + 1;
    std::string base;
    if (!Utils::GetBaseURI(url, base, false)) {
        LOG_ERROR("Failed to parse %s", url);
        return true;
    }
    char address[2048] = "";
    if (ZYROProxyGetAddrByUrl(base.c_str(), address, sizeof address) != 1 || *address == '\0') {
        return true;
    }
    char auth[2048] = "";
    if (ZYROProxyGetAuth(auth, sizeof auth) != 1) {
        *auth = '\0';
    }
    if (!SpeaksThroughProxy(base)) {
        LOG_ERROR("Unknow protocol %s", base.c_str());
        return true;
    }
    const std::string proxy = *auth == '\0' ? address : std::string(auth) + "@" + address;
    g_mount_operation_set_domain(question.operation, proxy.c_str());
    return true;
}

bool GiveProxyPassword(const PasswordQuestion& question) {
    ++question.mount.proxy_asked;
    char auth[4096] = "";
    if (ZYROProxyGetAuth(auth, sizeof auth) != 1) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    char user[2048] = "";
    char password[2048] = "";
    // The first conversion takes everything up to a blank, colons included: "a:b" is a user name.
    // Backends know the text in that form, so the format stays.
    sscanf(auth, "%2047s:%2047s", user, password);
    if (*user != '\0' && question.Needs(G_ASK_PASSWORD_NEED_USERNAME)) {
        g_mount_operation_set_username(question.operation, user);
    }
    if (*password != '\0' && question.Needs(G_ASK_PASSWORD_NEED_PASSWORD)) {
        g_mount_operation_set_password(question.operation, password);
    }
    return true;
}

/** A repeated question means that the first answer was refused. */
bool RefuseRepeated(const PasswordQuestion& question) {
    if (question.Needs(G_ASK_PASSWORD_NEED_USERNAME)) {
        return Fail(VFS_ERR_WRONG_USERNAME);
    }
    if (question.Needs(G_ASK_PASSWORD_NEED_PASSWORD)) {
        return Fail(VFS_ERR_WRONG_PASSWORD);
    }
    return false;
}

void GiveSessionCredentials(const PasswordQuestion& question) {
    const std::string user = question.mount.session->GetUser();
    if (!user.empty() && question.Needs(G_ASK_PASSWORD_NEED_USERNAME)) {
        g_mount_operation_set_username(question.operation, user.c_str());
    }
    const std::string password = question.mount.session->GetPass();
    if (!password.empty() && question.Needs(G_ASK_PASSWORD_NEED_PASSWORD)) {
        g_mount_operation_set_password(question.operation, password.c_str());
    }
}

bool GiveCredentials(const PasswordQuestion& question) {
    VFSMountOperaion& mount = question.mount;
    if (mount.proxy_asked > 1) {
        return question.Needs(kUserOrPassword) && Fail(VFS_ERR_PROXY_AUTH);
    }
    if (g_str_has_prefix(question.message, "proxy password")) {
        return GiveProxyPassword(question);
    }
    ++mount.asked;
    if (mount.asked == 1 && question.Needs(G_ASK_PASSWORD_ANONYMOUS_SUPPORTED) &&
        mount.session->GetUser().empty()) {
        g_mount_operation_set_anonymous(question.operation, TRUE);
        return true;
    }
    if (mount.asked > 1) {
        return RefuseRepeated(question);
    }
    GiveSessionCredentials(question);
    return true;
}

struct PasswordAnswer {
    const char* prefix;  ///< of the message
    bool (*answer)(const PasswordQuestion&);
};

/** The first row that fits decides; what is no keyword is a true question for credentials. */
constexpr PasswordAnswer kPasswordAnswers[] = {
    {"mount_path", TakeMountPath}, {"Is UTF8", GiveCodePage}, {"ca file path", GiveCaFile},
    {"proxy url", GiveProxy},      {"", GiveCredentials},
};

bool AnswerPassword(const PasswordQuestion& question) {
    const PasswordAnswer* row = std::begin(kPasswordAnswers);
    while (!g_str_has_prefix(question.message, row->prefix)) {
        ++row;
    }
    return row->answer(question);
}

bool ConfirmIdentity(GMountOperation* operation, const char* message,
                     const VFSMountOperaion* mount) {
    if (mount != nullptr && mount->session->GetForce()) {
        g_mount_operation_set_choice(operation, 0);
        return true;
    }
    KeepIdentity(message);
    return false;
}

bool ConfirmAddressChange(GMountOperation* operation, const char*, const VFSMountOperaion*) {
    g_mount_operation_set_choice(operation, 0);
    return true;
}

bool RefuseQuestion(GMountOperation*, const char* message, const VFSMountOperaion*) {
    LOG_ERROR("%s", message);
    return Fail(VFS_ERR_UNKNOWN);
}

struct QuestionAnswer {
    const char* prefix;
    bool (*answer)(GMountOperation*, const char* message, const VFSMountOperaion*);
};

constexpr QuestionAnswer kQuestionAnswers[] = {
    {"identity", ConfirmIdentity},
    {"ip change", ConfirmAddressChange},
    {"", RefuseQuestion},
};

bool AnswerQuestion(GMountOperation* operation, const char* message,
                    const VFSMountOperaion* mount) {
    if (message == nullptr) {
        LOG_ERROR("No messages");
        return Fail(VFS_ERR_UNKNOWN);
    }
    const QuestionAnswer* row = std::begin(kQuestionAnswers);
    while (!g_str_has_prefix(message, row->prefix)) {
        ++row;
    }
    return row->answer(operation, message, mount);
}

void Reply(GMountOperation* operation, bool handled) {
    g_mount_operation_reply(operation,
                            handled ? G_MOUNT_OPERATION_HANDLED : G_MOUNT_OPERATION_ABORTED);
}

}  // namespace

void AskPassword(GMountOperation* operation, const char* message, const char* default_user,
                 const char*, GAskPasswordFlags flags, gpointer data) noexcept {
    if (data == nullptr) {
        LOG_ERROR("NO Mount Options");
        Reply(operation, Fail(VFS_ERR_BAD_PARAM));
        return;
    }
    auto& mount = *static_cast<VFSMountOperaion*>(data);
    Reply(operation, AnswerPassword({operation, message == nullptr ? "" : message, default_user,
                                     flags, mount}));
}

void AskQuestion(GMountOperation* operation, const char* message, const char* const*,
                 gpointer data) noexcept {
    Reply(operation, AnswerQuestion(operation, message, static_cast<VFSMountOperaion*>(data)));
}

}  // namespace ZYROVFS
