/** Uploads of a Google Drive driver to the simulated service. */
#ifndef ZYROVFS_TESTS_GDRIVE_UPLOAD_FIXTURE_H
#define ZYROVFS_TESTS_GDRIVE_UPLOAD_FIXTURE_H

#include <string>
#include <vector>

#include "support/cloudsim/content.h"
#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {

inline constexpr const char* kUploadPath = "/upload/drive/v2/files";
/** Largest file that goes in one request. */
inline constexpr size_t kDirect = 33554432;

class GDriveUploadTest : public GDriveTest {
  protected:
    /** What GetMetaDataByURI and the engine tell of an upload of `size` bytes to this path. */
    Json::Value Meta(const std::string& path, size_t size) {
        Json::Value meta;
        EXPECT_TRUE(drive->GetMetaDataByURI(server_id + path, meta, "Upload")) << seams::LogDump();
        meta["total_bytes"] = static_cast<Json::UInt64>(size);
        meta["filesize"] = static_cast<Json::UInt64>(size);
        return meta;
    }
    /** Bytes no two parts of which are alike. */
    static std::string Content(size_t size) { return cloudsim::MakePattern(size, 7)->Bytes(); }
    std::string Stored(const std::string& path = "/a.bin") { return amy.Bytes(amy.Find(path)); }
};

}  // namespace ZYROCloud

#endif
