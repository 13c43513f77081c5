/** One upload to Box: the attributes, then the file, both in one multipart body. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_BOX_UPLOAD_H
#define ZYROVFS_TESTS_CLOUDSIM_BOX_UPLOAD_H

#include "support/cloudsim/box.h"
#include "support/cloudsim/multipart.h"

namespace cloudsim {

class BoxUpload : public Handler {
  public:
    /** `id` is the file that gets a new version, or empty for a new file. */
    BoxUpload(BoxService& box, const Request& request, Account& account, std::string id);
    void Data(const char* data, size_t size) override { body_.Feed(data, size); }
    Reply Finish() override;

  private:
    void Begin(const Multipart::Part& part);
    void Take(const Multipart::Part& part, const char* data, size_t size);
    void CheckBody() const;
    Node& Store(const BoxCall& call);
    Node& StoreNew(const BoxCall& call, ContentPtr content);
    Node& StoreVersion(const BoxCall& call, ContentPtr content);

    BoxService& box_;
    const Request& request_;
    Account& account_;
    const std::string id_;
    Multipart body_;
    std::string attributes_;
    std::unique_ptr<Sink> sink_;
    bool has_attributes_ = false, late_attributes_ = false, failed_ = false;
};

}  // namespace cloudsim

#endif
