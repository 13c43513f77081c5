#include "trust.h"

#include <glib.h>
#include <json/writer.h>

#include <memory>

#include "failure.h"

namespace web {

using namespace ZYROVFS;

namespace {

std::string TokenOf(const Json::Value& question) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    const std::unique_ptr<char, void (*)(void*)> digest(
        g_compute_checksum_for_string(G_CHECKSUM_SHA256,
                                      Json::writeString(builder, question).c_str(), -1),
        g_free);
    return digest.get();
}

void CopyText(const Json::Value& detail, const char* from, Json::Value& question, const char* to) {
    if (detail.isObject() && detail[from].isString()) {
        question[to] = detail[from];
    }
}

void CopyDate(const Json::Value& detail, const char* from, Json::Value& question, const char* to) {
    if (detail.isObject() && detail[from].isInt64()) {
        question[to] = detail[from];
    }
}

}  // namespace

Json::Value DescribeTrust(__tag_vfs_err_ code, const std::string& host, const Json::Value& detail) {
    Json::Value question;
    if (code == VFS_ERR_CERT_UNTRUSTED) {
        question["kind"] = "certificate";
        question["host"] = host;
        CopyText(detail, "subject", question, "subject");
        CopyText(detail, "issuer", question, "issuer");
        CopyDate(detail, "availDate", question, "valid_from");
        CopyDate(detail, "expDate", question, "valid_to");
    } else if (code == VFS_ERR_IDENTITY_QUESTION || code == VFS_ERR_IDENTITY_WRONG) {
        question["kind"] = "host_key";
        question["host"] = host;
        CopyText(detail, "host", question, "host");
        CopyText(detail, "fingerprint", question, "fingerprint");
    } else {
        return question;
    }
    question["changed"] = code == VFS_ERR_IDENTITY_WRONG;
    question["token"] = TokenOf(question);
    return question;
}

void WithTrust(const std::string& what, const std::string& host, const std::string& accept,
               const std::function<bool(bool force)>& operation) {
    ResetError();
    VFSSetJson(Json::Value());
    if (operation(false)) {
        return;
    }
    Json::Value detail;
    VFSGetJson(detail);
    Json::Value question = DescribeTrust(GetError(), host, detail);
    if (question.isNull()) {
        throw FailureOf(what, GetError());
    }
    if (accept != question["token"].asString()) {
        throw FailureOf(what, GetError()).Ask(std::move(question));
    }
    ResetError();
    if (!operation(true)) {
        throw FailureOf(what, GetError());
    }
}

}  // namespace web
