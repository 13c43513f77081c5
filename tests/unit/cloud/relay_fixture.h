/** Relayed uploads to a driver that a test writes down. */
#ifndef ZYROVFS_TESTS_RELAY_FIXTURE_H
#define ZYROVFS_TESTS_RELAY_FIXTURE_H

#include <climits>
#include <string>
#include <utility>
#include <vector>

#include "cloud/relay.h"
#include "support/relay_input.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {

using relay_input::Closing;
using relay_input::Input;
using relay_input::kBoundary;

/** What the callbacks of the web layer are told. */
struct Browser {
    static inline std::vector<std::pair<unsigned long long, unsigned long long>> progress;
    static inline int asked = 0;            ///< how often the user was asked for a cancel
    static inline int cancel_at = INT_MAX;  ///< number of the question that is answered with yes

    static void Progress(unsigned long long current, unsigned long long total) {
        progress.emplace_back(current, total);
    }
    static int Cancel() { return ++asked >= cancel_at ? 1 : 0; }
    static void Reset() {
        progress.clear();
        asked = 0;
        cancel_at = INT_MAX;
    }
};

class RelayTest : public testing::Test {
  protected:
    static constexpr size_t kTail = RelayTail::kSize;

    void SetUp() override {
        seams::Reset();
        Browser::Reset();
        YLIBCErrSetEx(0, "test", 1);
        driver_.Keep(kTail);
    }

    bool Init(unsigned long long total, long long size, const char* boundary = kBoundary) {
        progress_.total = total;
        return Cloud::RelayUploadInit(&driver_, "srv/up.bin", &progress_, boundary,
                                      Browser::Progress, Browser::Cancel, speed_, &transferred_,
                                      size);
    }
    /** All of a request, from the file's first byte on. */
    bool Relay(const std::string& request, long long size = -1, const char* boundary = kBoundary) {
        const Input input(request);
        progress_.current = 0;
        return Init(request.size(), size, boundary) && Cloud::RelayUploadFile();
    }

    FakeDriver driver_;
    _tag_cgi_upload_progress_ progress_{0, 0, 0};
    unsigned long long transferred_ = 0;
    RelaySpeedCallback speed_ = nullptr;
};

}  // namespace ZYROCloud

#endif
