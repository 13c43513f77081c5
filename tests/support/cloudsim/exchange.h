/** One request on its way through the front, with the fault that was declared for it. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_EXCHANGE_H
#define ZYROVFS_TESTS_CLOUDSIM_EXCHANGE_H

#include <microhttpd.h>

#include <memory>
#include <string>

#include "support/cloudsim/server.h"
#include "support/cloudsim/sha1.h"

namespace cloudsim {

/** What is remembered of a kept connection. */
struct Connection {
    uint64_t number = 0;
    bool dead = false;  ///< closed by a fault; what still comes on it was never received
};

class Exchange : public std::enable_shared_from_this<Exchange> {
  public:
    Exchange(Server& server, std::string target) : server_(server) {
        request_.target = std::move(target);
    }

    bool Started() const { return entry_ != nullptr; }
    // Each is false when the connection has to be closed.
    bool Start(MHD_Connection* connection, const char* method, const char* version);
    bool Data(const char* data, size_t size);
    bool Answer();
    /** The server is done with the request. */
    void End();

  private:
    using Effect = FaultPlan::Use::Effect;

    void ReadRequest(const char* method, const char* version);
    bool ApplyBeginning();
    bool Break(Effect effect);
    /** To the handler, as far as no fault keeps it back. */
    void Pass(const char* data, size_t size);
    void Reset();
    void Happens(Effect effect);
    /** Waits once, when `done` has reached the place of a declared pause. */
    void PauseAt(const std::optional<uint64_t>& place, uint64_t done, Effect effect);
    void SumBody();

    Reply MakeReply();
    void ApplyToReply();
    void ApplyRange();
    bool NeedsRawAnswer() const;
    bool Queue();
    bool WriteRaw();
    std::string RawHead() const;
    /** Next bytes of the answer's body, 0 at the end, -1 when the connection has to be cut. */
    ssize_t Read(uint64_t position, char* to, size_t size);
    static ssize_t ReadForServer(void* self, uint64_t position, char* to, size_t size);

    Server& server_;
    MHD_Connection* connection_ = nullptr;
    Connection* kept_ = nullptr;
    Request request_;
    std::unique_ptr<FaultPlan::Use> fault_;
    std::unique_ptr<Handler> handler_;
    std::shared_ptr<JournalEntry> entry_;
    std::string body_;  ///< beginning of the request's
    bool summed_ = false, paused_ = false;
    uint64_t received_ = 0, sent_ = 0;
    Sha1 sum_;
    Server::Time began_, answer_began_;
    Reply reply_;
    uint64_t cut_at_;
    Effect cut_effect_ = Effect::kCut;
};

/** Writes straight to a connection, past the server, over TLS or not. */
bool WriteTo(MHD_Connection* connection, const char* data, size_t size);

}  // namespace cloudsim

#endif
