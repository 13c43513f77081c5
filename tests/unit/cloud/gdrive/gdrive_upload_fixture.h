/** Uploads of a Google Drive driver to the simulated service. */
#ifndef ZYROVFS_TESTS_GDRIVE_UPLOAD_FIXTURE_H
#define ZYROVFS_TESTS_GDRIVE_UPLOAD_FIXTURE_H

#include <string>
#include <vector>

#include "support/cloudsim/content.h"
#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {

using cloudsim::JournalEntry;

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

/** What the service keeps of a piece that broke off is a multiple of this. */
inline constexpr uint64_t kUnit = 262144;
inline constexpr int kAllBytes = 1000000;

inline const std::string kOpen = std::string("POST ") + kUploadPath;
inline const std::string kPiece = std::string("PUT ") + kUploadPath;

/** Uploads through a session, of kAllBytes. */
class GDriveResumable : public GDriveUploadTest {
  protected:
    bool Upload(Bytes& bytes, const std::string& path = "/a.bin") {
        return drive->ResumableUpload(&bytes.xfer, Meta(path, kAllBytes));
    }
    bool Upload(const std::string& path = "/a.bin") {
        Bytes bytes(1, content);
        return Upload(bytes, path);
    }
    /** The n-th request to the session: 0 and 2 ask how much has arrived, 1 and 3 send. */
    static Fault OnPut(int number) { return Fault::On("PUT", kUploadPath).After(number); }
    /** The service says that this has arrived when it is asked. */
    static Fault Arrived(int number, const std::string& range) {
        return OnPut(number).Answer(308, "", {{"Range", range}});
    }
    JournalEntry Put(size_t number) {
        return service.Journal().Find("PUT", kUploadPath).at(number);
    }
    size_t Puts() { return service.Journal().Count("PUT", kUploadPath); }
    std::string Host() { return service.ApiHost(); }
    static std::string Sha1(const std::string& bytes) { return cloudsim::MakeBytes(bytes)->Sha1(); }

    const std::string content = Content(kAllBytes);
};

}  // namespace ZYROCloud

#endif
