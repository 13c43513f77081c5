/** Box: REST API 2.0, its upload and download hosts and its token endpoint. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_BOX_H
#define ZYROVFS_TESTS_CLOUDSIM_BOX_H

#include <string>

#include "support/cloudsim/service.h"

namespace cloudsim {

struct BoxOptions : ServerOptions {
    /**
     * With names, API, upload and download are told apart by host, and what belongs to one is not
     * found at another: "localhost", "upload.localhost", "dl.localhost", or names beginning with
     * "api.", "upload.", "dl.", "app.". At a bare address (127.0.0.1) everything is answered.
     */
    std::string api_name = "localhost";
    std::string upload_name = "upload.localhost";
    std::string download_name = "dl.localhost";
    /** Offsets of listings beyond this are refused, as documented today. */
    int64_t max_offset = 10000;
};

class BoxService : public Service {
  public:
    explicit BoxService(BoxOptions options = {});
    ~BoxService() override;

    /** "https://localhost:PORT" and so on, without a slash at the end. */
    std::string ApiHost() const;
    std::string UploadHost() const;
    std::string DownloadHost() const;
    std::string TokenUrl() const { return ApiHost() + "/oauth2/token"; }
};

}  // namespace cloudsim

#endif
