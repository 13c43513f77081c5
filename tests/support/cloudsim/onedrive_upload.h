/** One upload to OneDrive by PUT: the body is the file. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_UPLOAD_H
#define ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_UPLOAD_H

#include "support/cloudsim/onedrive.h"

namespace cloudsim {

class OneDriveUpload : public Handler {
  public:
    /** `id` is the folder that `name` goes to or, without a name, the file that is replaced. */
    OneDriveUpload(OneDrive& drive, const Request& request, Account& account, std::string id,
                   std::string name);
    void Data(const char* data, size_t size) override;
    Reply Finish() override;

  private:
    Node& Store(int& status);
    Node& Replace(Node& file);
    std::string FreeName(const Node& parent) const;

    OneDrive& drive_;
    const Request& request_;
    Account& account_;
    const std::string id_, name_;
    std::unique_ptr<Sink> sink_;
    uint64_t size_ = 0;
    bool failed_ = false;
};

}  // namespace cloudsim

#endif
