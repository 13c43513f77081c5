#include "report.h"

#include <json/writer.h>
#include <zyrovfs/error.h>

#include <ctime>
#include <iostream>

#include "text.h"

namespace tool {
namespace {

using namespace ZYROVFS;

/** Failures that the user can overrule after looking at what the server showed. */
bool CanBeAccepted(__tag_vfs_err_ code) {
    return code == VFS_ERR_IDENTITY_QUESTION || code == VFS_ERR_IDENTITY_WRONG ||
           code == VFS_ERR_CERT_UNTRUSTED;
}

std::string Date(const Json::Value& seconds) {
    const auto time = static_cast<time_t>(seconds.asInt64());
    tm parts{};
    char text[64] = "";
    if (localtime_r(&time, &parts) != nullptr) {
        strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S %Z", &parts);
    }
    return text;
}

/** What the server showed: the known members in this order. */
void PrintDetail(const Json::Value& detail) {
    constexpr struct {
        const char* key;
        const char* label;
    } kRows[] = {
        {"host", "Host"},        {"fingerprint", "Fingerprint"}, {"subject", "Issued to"},
        {"issuer", "Issued by"}, {"availDate", "Valid from"},    {"expDate", "Valid until"}};
    for (const auto& row : kRows) {
        const Json::Value& value = detail[row.key];
        if (value.isInt64()) {
            std::cerr << "  " << row.label << ": " << Date(value) << "\n";
        } else if (value.isString()) {
            std::cerr << "  " << row.label << ": " << Printable(value.asString()) << "\n";
        }
    }
}

int PrintErrorObject(const Json::Value& error) {
    Json::Value document;
    document["error"] = error;
    PrintJson(document);
    return kFailure;
}

Json::Value ErrorObject(const std::string& what, __tag_vfs_err_ code, const Json::Value& detail) {
    Json::Value error;
    error["what"] = what;
    error["name"] = GetErrorName(code);
    error["code"] = static_cast<int>(code);
    error["meaning"] = GetErrorMeaning(code);
    if (!detail.isNull()) {
        error["detail"] = detail;
    }
    return error;
}

void PrintCode(const std::string& what, __tag_vfs_err_ code) {
    std::cerr << "zyrovfs: " << Printable(what) << " failed: " << GetErrorName(code) << " ("
              << static_cast<int>(code) << "): "
              << (code == VFS_ERR_NONE ? "No cause was given; the system log may tell."
                                       : GetErrorMeaning(code))
              << "\n";
}

/** What the owner of an account can do, where the account is what stands in the way. */
void PrintAdvice(__tag_vfs_err_ code) {
    if (code == VFS_ERR_TOKEN_REVOKED) {
        std::cerr << "The service has taken back what it granted: the owner withdrew it, changed "
                     "the password, or did not use it for long. Sign in again with "
                     "`zyrovfs login SERVICE --again ID`.\n";
    } else if (code == VFS_ERR_UNAUTHORIZED) {
        std::cerr << "The account no longer lets this connection in. Sign in again with `zyrovfs "
                     "login SERVICE --again ID`, or give it a new password with `zyrovfs profile "
                     "set`.\n";
    }
}

}  // namespace

void PrintJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    std::cout << Json::writeString(builder, value) << "\n";
}

void Say(const std::string& sentence) {
    std::cout << sentence << "\n";
}

int ReportFailure(const std::string& what, bool json) {
    const __tag_vfs_err_ code = GetError();
    Json::Value detail;
    if (CanBeAccepted(code)) {
        VFSGetJson(detail);
    }
    if (json) {
        return PrintErrorObject(ErrorObject(what, code, detail));
    }
    PrintCode(what, code);
    if (detail.isObject()) {
        PrintDetail(detail);
    }
    if (CanBeAccepted(code)) {
        std::cerr << "If this is the right server, repeat the command with --accept.\n";
    }
    return kFailure;
}

int ReportCode(const std::string& what, __tag_vfs_err_ code, int status, bool json) {
    if (json) {
        PrintErrorObject(ErrorObject(what, code, Json::nullValue));
        return status;
    }
    PrintCode(what, code);
    PrintAdvice(code);
    return status;
}

int ReportProblem(const std::string& sentence, bool json) {
    if (json) {
        Json::Value error;
        error["what"] = sentence;
        return PrintErrorObject(error);
    }
    std::cerr << "zyrovfs: " << Printable(sentence) << "\n";
    return kFailure;
}

}  // namespace tool
