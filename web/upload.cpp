#include <zyrovfs/error.h>

#include <charconv>
#include <csignal>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "form.h"
#include "name.h"
#include "response.h"

namespace web {

using namespace ZYROVFS;
using ZYROCloud::Cloud;

namespace {

volatile sig_atomic_t stop_asked = 0;

/** The web server ends its programs with this when the browser has gone. */
void StopLater(int) {
    stop_asked = 1;
}

int IsStopAsked() {
    return stop_asked;
}

long long ReadSize(const std::string& text) {
    long long size = -1;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, size);
    if (error != std::errc() || stop != end || size < -1) {
        throw Failure(400, "The request tells no size that can be.");
    }
    return size;
}

std::string Sentence(int error, __tag_vfs_err_ code) {
    constexpr int kSilent = -7;
    return error == kSilent            ? "Nothing came from the browser for too long"
           : code == VFS_ERR_CANCELLED ? "The upload was stopped"
                                       : "The file was not uploaded";
}

}  // namespace

void Upload(const User& user, const Request& request) {
    const Connection connection(user, request.Parameter("connection"));
    const std::string& path = request.Parameter("path");
    SplitPath(path);
    const long long size = ReadSize(request.Parameter("size", "-1"));
    if (request.length < 0) {
        throw Failure(411, "The request has no length.");
    }
    const std::unique_ptr<Cloud> cloud = connection.Driver();
    if (!cloud->CanFileUpload(static_cast<unsigned long long>(size))) {
        throw FailureOf("The file was not uploaded", cloud->GetErrorCode());
    }
    struct sigaction action {};
    action.sa_handler = StopLater;
    sigaction(SIGTERM, &action, nullptr);
    const Form form = ReadForm(request.content_type);
    ZYROCloud::_tag_cgi_upload_progress_ progress{
        form.read, static_cast<unsigned long long>(request.length), 0};
    const std::string uri = connection.Uri(path);
    if (!Cloud::RelayUploadInit(cloud.get(), uri.c_str(), &progress, form.boundary.c_str(), nullptr,
                                IsStopAsked, nullptr, nullptr, size) ||
        !Cloud::RelayUploadFile()) {
        throw FailureOf(Sentence(progress.error, cloud->GetErrorCode()), cloud->GetErrorCode());
    }
    AnswerJson(200, Json::Value(Json::objectValue));
}

}  // namespace web
