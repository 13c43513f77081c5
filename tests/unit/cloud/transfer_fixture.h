/** Drivers whose two transfers a test writes down, and what libcurl would do with their callbacks.
 */
#ifndef ZYROVFS_TESTS_TRANSFER_FIXTURE_H
#define ZYROVFS_TESTS_TRANSFER_FIXTURE_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <algorithm>
#include <functional>
#include <string>
#include <vector>

#include "cloud/transfer.h"
#include "support/bare_driver.h"
#include "support/seams.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)

/** Gives the callback what a service sends, in pieces; a piece that is not taken ends it. */
inline bool Feed(Cloud& cloud, XferData* xfer, const std::string& bytes, size_t piece = 16384) {
    for (size_t at = 0; at < bytes.size(); at += piece) {
        std::string part = bytes.substr(at, piece);
        if (xfer->callback(part.data(), 1, part.size(), xfer->context) != part.size()) {
            const bool wanted = YLIBCErrGet() == 0xa600;
            cloud.SetError(wanted ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED, "");
            return false;
        }
    }
    return true;
}

/** Takes what the callback has, until it has no more. */
inline bool Drain(Cloud& cloud, XferData* xfer, std::string& bytes, size_t want = 65536) {
    std::string room(want, '\0');
    for (;;) {
        const size_t n = xfer->callback(room.data(), 1, room.size(), xfer->context);
        if (n > want) {
            const bool wanted = YLIBCErrGet() == 0xa600;
            cloud.SetError(wanted ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED, "");
            return false;
        }
        if (n == 0) {
            return true;
        }
        bytes.append(room, 0, n);
    }
}

class FakeDriver : public bare::Driver<Cloud> {
  public:
    using Step = std::function<bool(XferData*, const Json::Value&)>;

    bool GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                          const std::string& action) override {
        actions.push_back(action);
        meta["url"] = uri;
        return metadata_known;
    }
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override {
        metas.push_back(meta);
        return upload && upload(xfer, meta);
    }
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override {
        metas.push_back(meta);
        return download && download(xfer, meta);
    }

    /** Downloads give these bytes. */
    void Serve(const std::string& bytes, size_t piece = 16384) {
        download = [=](XferData* xfer, const Json::Value&) {
            return Feed(*this, xfer, bytes, piece);
        };
    }
    /** Uploads are kept. */
    void Keep(size_t want = 65536) {
        upload = [=](XferData* xfer, const Json::Value&) {
            kept.clear();
            return Drain(*this, xfer, kept, want);
        };
    }

    Step upload, download;
    std::vector<Json::Value> metas;
    std::vector<std::string> actions;
    bool metadata_known = true;
    std::string kept;
};

/** Bytes of which each place can be told. */
inline std::string Pattern(size_t size) {
    std::string bytes(size, '\0');
    for (size_t i = 0; i < size; ++i) {
        bytes[i] = static_cast<char>((i * 2654435761U) >> 24);
    }
    return bytes;
}

}  // namespace ZYROCloud

#endif
