// A selection and whole folders as one ZIP, made while it is sent.
#include <zyrovfs/error.h>

#include <set>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "name.h"
#include "response.h"
#include "stop.h"
#include "transfer_note.h"
#include "walk.h"
#include "zip.h"

namespace web {

using ZYROCloud::Cloud;
using ZYROCloud::XferContext;

namespace {

/** The engine's context with a place for what comes. */
struct IntoZip : XferContext {
    explicit IntoZip(Zip& archive) : zip(archive) {}
    Zip& zip;
};

/** As libcurl calls it: any answer but the number of bytes ends the transfer. */
size_t Receive(char* data, size_t size, size_t count, void* opaque) {
    auto& into = static_cast<IntoZip&>(*static_cast<XferContext*>(opaque));
    into.can_retry = false;
    const size_t bytes = size * count;
    return StopWatch::IsAsked() == 0 && into.zip.Write(data, bytes) ? bytes : bytes == 0 ? 1 : 0;
}

bool SendContent(Cloud& cloud, const std::string& uri, Zip& zip) {
    Json::Value meta(Json::objectValue);
    cloud.SetError(ZYROVFS::VFS_ERR_NONE, "");
    if (!cloud.GetMetaDataByURI(uri, meta, "Download")) {
        return false;
    }
    IntoZip context(zip);
    ZYROCloud::XferData transfer{Receive, 0, &context};
    return cloud.Download(&transfer, meta);
}

/** What is chosen, without repetitions: one name stands for one entry. */
std::vector<std::string> Chosen(const Request& request) {
    const std::vector<std::string> given = request.Parameters("path");
    if (given.empty()) {
        throw Failure(400, "The request lacks \"path\".");
    }
    std::vector<std::string> paths;
    std::set<std::string> names;
    for (const std::string& path : given) {
        const std::string name = CheckPath(path) == "/" ? "" : SplitPath(path).name;
        if (names.insert(name).second) {
            paths.push_back(path);
        } else {
            throw Failure(422, "Two of what is chosen have the same name.")
                .Advise("Choose items of one folder.");
        }
    }
    return paths;
}

std::string ArchiveName(const Connection& connection, const std::vector<std::string>& paths) {
    const std::string only = paths.size() == 1 ? paths[0] : SplitPath(paths[0]).folder;
    return (only == "/" ? connection.Title() : SplitPath(only).name) + ".zip";
}

/** The archive's entries; the connection's own root has none. */
std::vector<ZipEntry> EntriesOf(std::vector<Item>& items) {
    if (!items.empty() && items.front().below.empty()) {
        items.erase(items.begin());
    }
    std::vector<ZipEntry> entries;
    entries.reserve(items.size());
    for (const Item& item : items) {
        if (item.size < 0) {
            throw Failure(502, "The size of \"" + item.below + "\" is not known.");
        }
        entries.push_back({item.below + (item.folder ? "/" : ""),
                           static_cast<uint64_t>(item.folder ? 0 : item.size), item.modified});
    }
    return entries;
}

}  // namespace

void SendArchive(const User& user, const Request& request) {
    const Connection connection(user, request.Parameter("connection"));
    const std::vector<std::string> paths = Chosen(request);
    const StopWatch watch(nullptr);
    const TransferNote note(user, {connection.Id()});
    const std::unique_ptr<Cloud> cloud = connection.Driver();
    std::vector<Item> items = Walk(*connection.Files(), paths, kMostItems, [](const Item&) {
        if (StopWatch::IsAsked() != 0) {
            throw FailureOf("The archive was stopped", ZYROVFS::VFS_ERR_CANCELLED);
        }
    });
    const std::vector<ZipEntry> entries = EntriesOf(items);
    const std::string headers =
        "Content-Length: " + std::to_string(ZipSize(entries)) +
        "\r\nContent-Disposition: " + Attachment(ArchiveName(connection, paths)) + "\r\n";
    if (!Write(Head(200, "application/zip", headers)) || request.method == "HEAD") {
        return;
    }
    // From here on a failure leaves the answer shorter than it says, which no browser takes for
    // whole.
    Zip zip([](const char* data, size_t size) { return Write(data, size); });
    for (size_t i = 0; i < items.size(); ++i) {
        const bool sent =
            zip.Begin(entries[i]) &&
            (entries[i].size == 0 || SendContent(*cloud, connection.Uri(items[i].path), zip)) &&
            zip.End();
        if (!sent) {
            return;
        }
    }
    zip.Finish();
}

}  // namespace web
