#include "report.h"

#include <json/writer.h>
#include <zyrovfs/error.h>

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

void PrintDetail(const Json::Value& detail) {
    if (!detail.isObject()) {
        return;
    }
    for (const std::string& key : detail.getMemberNames()) {
        if (detail[key].isConvertibleTo(Json::stringValue)) {
            std::cerr << "  " << Printable(key) << ": " << Printable(detail[key].asString())
                      << "\n";
        }
    }
}

int PrintErrorObject(const Json::Value& error) {
    Json::Value document;
    document["error"] = error;
    PrintJson(document);
    return kFailure;
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
        Json::Value error;
        error["what"] = what;
        error["name"] = GetErrorName(code);
        error["code"] = static_cast<int>(code);
        error["meaning"] = GetErrorMeaning(code);
        if (!detail.isNull()) {
            error["detail"] = detail;
        }
        return PrintErrorObject(error);
    }
    std::cerr << "zyrovfs: " << Printable(what) << " failed: " << GetErrorName(code) << " ("
              << static_cast<int>(code) << "): " << GetErrorMeaning(code) << "\n";
    PrintDetail(detail);
    if (CanBeAccepted(code)) {
        std::cerr << "If this is the right server, repeat the command with --accept.\n";
    }
    return kFailure;
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
