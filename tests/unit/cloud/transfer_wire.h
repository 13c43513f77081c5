/** A driver that speaks plain HTTP: GET and PUT of one URL, and nothing between it and the engine.
 */
#ifndef ZYROVFS_TESTS_TRANSFER_WIRE_H
#define ZYROVFS_TESTS_TRANSFER_WIRE_H

#include <string>

#include "cloud/attempt.h"
#include "support/wire_server.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {

class WireDriver : public bare::Driver<Cloud> {
  public:
    WireDriver() { SetAPIErrorHandler(api); }

    bool SetAPIErrorHandler(APIHandler* handler) override {
        return handler->SetErrorHandler(new DavErrorHandler);
    }
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override {
        ++requests;
        return api->Init() && InitXferData(xfer) && SetRange(*this, meta) && Send(meta);
    }
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override {
        ++requests;
        if (!api->Init() || !InitXferData(xfer) || !api->SetUploadOpt(true) ||
            !api->SetUploadSize(meta["total_bytes"].asInt64())) {
            return false;
        }
        if (expect_continue) {
            api->AddHeader("Expect", "100-continue");
        } else {
            Json::Value headers;
            headers["Expect"] = "";
            api->AddHeader(headers);
        }
        return Send(meta);
    }

    int requests = 0;
    bool expect_continue = false;

  private:
    bool Send(const Json::Value& meta) {
        if (api->SetURL(meta["url"].asString(), false) && api->Process(0)) {
            return true;
        }
        SetError(api->GetError());
        return false;
    }
};

inline std::string ContentRange(unsigned long long first, unsigned long long last) {
    return "Content-Range: bytes " + std::to_string(first) + "-" + std::to_string(last) +
           "/10485760\r\n";
}

/** An answer that announces `size` bytes of which only these come. */
inline std::string CutAnswer(int status, size_t size, const std::string& body,
                             const std::string& headers = "") {
    return "HTTP/1.1 " + std::to_string(status) + " Told\r\n" + headers +
           "Content-Length: " + std::to_string(size) + "\r\n\r\n" + body;
}

/** Body of the n-th request. */
inline std::string BodyOf(const wire::WireServer& server, size_t n = 0) {
    const std::vector<std::string> received = server.Received();
    return n < received.size() ? received[n].substr(received[n].find("\r\n\r\n") + 4) : "";
}

}  // namespace ZYROCloud

#endif
