#include <fcntl.h>
#include <sys/mman.h>
#include <sys/sendfile.h>
#include <unistd.h>

#include <array>

#include "action.h"
#include "connection.h"
#include "descriptor.h"
#include "failure.h"
#include "media.h"
#include "name.h"
#include "range.h"
#include "response.h"
#include "stop.h"
#include "transfer_note.h"

namespace web {

using ZYROCloud::Cloud;

namespace {

/** Services export no more than 10 MiB. */
constexpr long long kLargestExport = 12LL << 20;

/** A file of a connection, and how it is to be given. */
struct Source {
    Source(const User& user, const Request& request)
        : connection(user, request.Parameter("connection")),
          path(request.Parameter("path")),
          name(SplitPath(path).name),
          uri(connection.Uri(path)),
          cloud(connection.Driver()),
          head_only(request.method == "HEAD"),
          type(request.Parameter("view", "") == "1" ? ViewableType(name) : "") {}

    /** What the driver left, or that there is no such file. */
    Failure Missing() const {
        const ZYROVFS::__tag_vfs_err_ code = cloud->GetErrorCode();
        return FailureOf("\"" + name + "\"",
                         code == ZYROVFS::VFS_ERR_NONE ? ZYROVFS::VFS_ERR_NOT_FOUND : code);
    }
    std::string Headers(const std::string& shown, long long length) const {
        return "Accept-Ranges: bytes\r\nContent-Length: " + std::to_string(length) +
               "\r\nContent-Disposition: " + (type.empty() ? Attachment(shown) : Inline(shown)) +
               "\r\n";
    }
    std::string Type() const { return type.empty() ? "application/octet-stream" : type; }

    Connection connection;
    std::string path;
    std::string name;
    std::string uri;
    std::unique_ptr<Cloud> cloud;
    bool head_only;
    std::string type;  ///< empty: an attachment of no type that a browser would look into
};

/** Services cannot be asked for one byte alone, but give it together with the next one. */
void SendByte(const Source& source, long long at) {
    std::array<char, 2> byte{};
    long long got = 0;
    Json::Value meta;
    source.cloud->GetMetaDataByURI(source.uri, meta, "Download");
    const bool by_url = source.cloud->GetCloudType() != ZYROCloud::CLOUD_TYPE_DROPBOX &&
                        meta.isObject() && meta["url"].isString();
    if (Cloud::DownloadFileToBuffer(source.cloud.get(),
                                    by_url ? meta["url"].asString() : source.uri, byte.data(), at,
                                    1, &got, nullptr, nullptr, nullptr) &&
        got >= 1) {
        Write(byte.data(), 1);
    }
}

/** Behind the head a failure shows as an answer that is shorter than it says. */
void SendPart(const Source& source, const Range& range, long long size) {
    const std::string content_range = "Content-Range: bytes " + std::to_string(range.from) + "-" +
                                      std::to_string(range.to) + "/" + std::to_string(size) +
                                      "\r\n";
    if (!Write(
            Head(206, source.Type(), source.Headers(source.name, range.Size()) + content_range)) ||
        source.head_only) {
        return;
    }
    if (range.Size() == 1) {
        SendByte(source, range.from);
    } else {
        Cloud::RelayDownloadFile(STDOUT_FILENO, range.from, range.to);
    }
}

void SendWhole(const Source& source, long long size) {
    if (Write(Head(200, source.Type(), source.Headers(source.name, size))) && !source.head_only &&
        size > 0) {
        Cloud::RelayDownloadFile(STDOUT_FILENO, 0, size);
    }
}

void SendFile(const Source& source, const std::string& range_header) {
    long long size = 0;
    std::string mime;
    if (!Cloud::RelayDownloadInit(source.cloud.get(), source.uri.c_str(), StopWatch::NoLimit, "") ||
        !Cloud::RelayDownloadGetFileSizeAndMimeType(&size, mime) || size < 0) {
        throw source.Missing();
    }
    if (const std::optional<Range> range = ReadRange(range_header, size)) {
        SendPart(source, *range, size);
    } else {
        SendWhole(source, size);
    }
}

/** Room in memory that takes no more than an export may have. */
Descriptor ExportRoom() {
    Descriptor room(memfd_create("export", MFD_CLOEXEC | MFD_ALLOW_SEALING));
    if (room.Get() < 0 || ftruncate(room.Get(), kLargestExport) != 0 ||
        fcntl(room.Get(), F_ADD_SEALS, F_SEAL_GROW | F_SEAL_SHRINK) != 0) {
        throw Failure(500, "Memory ran out.");
    }
    return room;
}

/** The format as the item's listing offers it; Failure with status 422 for another one. */
Export FindExport(const Source& source, const std::string& format) {
    const Entry entry = source.connection.Files()->Look(source.path);
    for (const Export& offered : entry.exports) {
        if (offered.format == format) {
            return offered;
        }
    }
    throw Failure(422, "\"" + source.name + "\" is not offered in this format.");
}

/** "Plan.gdoc" as "Plan.pdf". */
std::string ExportName(const std::string& name, const Export& format) {
    return name.substr(0, name.rfind('.')) + format.extension;
}

/**
 * A service does not tell the size of an export beforehand. It is fetched whole before anything is
 * sent, so that the answer has its length and a broken one is not taken for whole.
 */
void SendExport(const Source& source, const std::string& format) {
    const Export chosen = FindExport(source, format);
    const Descriptor room = ExportRoom();
    if (!Cloud::RelayDownloadInit(source.cloud.get(), source.uri.c_str(), StopWatch::NoLimit,
                                  format) ||
        !Cloud::RelayDownloadFile(room.Get(), 0, 0)) {
        throw source.Missing();
    }
    const off_t size = lseek(room.Get(), 0, SEEK_CUR);
    if (!Write(Head(200, source.Type(), source.Headers(ExportName(source.name, chosen), size))) ||
        source.head_only) {
        return;
    }
    off_t at = 0;
    while (at < size &&
           sendfile(STDOUT_FILENO, room.Get(), &at, static_cast<size_t>(size - at)) > 0) {
    }
}

}  // namespace

void Download(const User& user, const Request& request) {
    const Source source(user, request);
    const StopWatch watch(nullptr);
    const TransferNote note(user, {source.connection.Id()});
    const std::string format = request.Parameter("export", "");
    if (format.empty()) {
        SendFile(source, request.range);
    } else {
        SendExport(source, format);
    }
}

}  // namespace web
