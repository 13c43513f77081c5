/** Uploads to Google Drive: in one request, with or without metadata, and in pieces. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_UPLOAD_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_UPLOAD_H

#include "support/cloudsim/gdrive.h"
#include "support/cloudsim/multipart.h"

namespace cloudsim {

/** One request with all of a file: "media", or "multipart" with metadata in the first part. */
class GDriveUpload : public Handler {
  public:
    /** `id` is the file that gets a new content, or empty for a new file. */
    GDriveUpload(GDrive& drive, const Request& request, Account& account, std::string id);
    void Data(const char* data, size_t size) override;
    Reply Finish() override;

  private:
    void Begin(const Multipart::Part& part);
    void Take(const char* data, size_t size);

    GDrive& drive_;
    const Request& request_;
    Account& account_;
    const std::string id_;
    const bool multipart_;
    Multipart body_;
    int parts_ = 0;  ///< begun; their order tells them apart, whatever they are called
    std::string metadata_, type_;
    std::unique_ptr<Sink> sink_;
    bool failed_ = false;
};

/** One request to the address of an upload session: a piece, the whole, or a question. */
class GDriveResume : public Handler {
  public:
    GDriveResume(GDrive& drive, const Request& request);
    void Data(const char* data, size_t size) override;
    Reply Finish() override;

  private:
    using Guard = std::lock_guard<std::mutex>;

    void ReadRange(const std::string& text);
    void CheckPiece();
    bool IsLast() const;
    void Keep(bool all);
    Reply Answer();
    Reply Incomplete() const;
    Reply Complete();
    void Refuse(Reply reply);

    GDrive& drive_;
    const Request& request_;
    GDrive::SessionPtr session_;
    std::string key_;
    std::optional<Reply> refused_;
    bool asks_ = false;              ///< for what has arrived
    bool ranged_ = false;            ///< the piece tells its place
    uint64_t first_ = 0, size_ = 0;  ///< of the piece, as announced
    std::optional<uint64_t> total_;  ///< of the file, as announced
    uint64_t came_ = 0;              ///< of this request's body
    uint64_t turn_ = 0;
    std::string tail_;  ///< what isn't yet enough to be kept
};

}  // namespace cloudsim

#endif
