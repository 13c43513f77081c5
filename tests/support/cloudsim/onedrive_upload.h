/** One upload to OneDrive: by PUT the body is the file, by POST a form with one part is. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_UPLOAD_H
#define ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_UPLOAD_H

#include "support/cloudsim/multipart.h"
#include "support/cloudsim/onedrive.h"

namespace cloudsim {

class OneDriveUpload : public Handler {
  public:
    /**
     * `id` is the folder that `name` goes to or, without a name, the file that is replaced. What
     * comes by POST has its name in the form.
     */
    OneDriveUpload(OneDrive& drive, const Request& request, Account& account, std::string id,
                   std::string name);
    void Data(const char* data, size_t size) override;
    Reply Finish() override;

  private:
    void Begin(const Multipart::Part& part);
    void Take(const char* data, size_t size);
    void CheckForm() const;
    void DownsizePhoto();
    Node& Store(int& status);
    Node& Replace(Node& file);
    std::string FreeName(const Node& parent) const;

    OneDrive& drive_;
    const Request& request_;
    Account& account_;
    const std::string id_;
    const bool form_;
    std::string name_;
    Multipart body_;
    int parts_ = 0;
    std::string head_;  ///< the file's first bytes
    std::unique_ptr<Sink> sink_;
    uint64_t size_ = 0;
    bool failed_ = false;
};

}  // namespace cloudsim

#endif
