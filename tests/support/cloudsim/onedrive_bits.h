/** One packet of an upload by BITS. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_BITS_H
#define ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_BITS_H

#include "support/cloudsim/onedrive.h"

namespace cloudsim {

/** A fragment is kept whole until all of it came: one that was interrupted leaves nothing. */
class OneDriveBits : public Handler {
  public:
    /** `path` is that of the file, below the folder whose id is "CID!NNN" or, if "", the top one.
     */
    OneDriveBits(OneDrive& drive, const Request& request, Account& account, std::string folder,
                 std::vector<std::string> path);
    void Data(const char* data, size_t size) override;
    Reply Finish() override;

  private:
    using Session = OneDrive::Session;
    using Packet = Reply (OneDriveBits::*)();
    struct Range {
        uint64_t first, last, total;
    };

    Reply Create();
    Reply Fragment();
    Reply Close();
    Reply Cancel();
    Reply Ping();

    bool SpeaksOurProtocol() const;
    Range ParseRange() const;
    void CheckRange(const Session& session, const Range& range) const;
    Reply Take(Session& session, const Range& range);
    Node& Parent();
    /** What stands at the path now, or null. */
    Node* Target(const Node& parent);
    Session& Known();
    std::string SessionId() const { return request_.Header("BITS-Session-Id"); }
    Reply Acknowledge(int status = 200) const;

    OneDrive& drive_;
    const Request& request_;
    Account& account_;
    const std::string folder_;
    const std::vector<std::string> path_;
    std::string fragment_;
    uint64_t received_ = 0;
};

}  // namespace cloudsim

#endif
