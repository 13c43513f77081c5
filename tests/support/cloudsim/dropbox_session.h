/** A file of Dropbox on its way. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_SESSION_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_SESSION_H

#include <cstdint>
#include <vector>

#include "support/cloudsim/content.h"

namespace cloudsim {

class Account;

namespace dropbox {

struct Session {
    const Account* account = nullptr;
    std::vector<ContentPtr> pieces;
    uint64_t size = 0;
    bool closed = false;
    int64_t expires = 0;

    void Add(ContentPtr piece) {
        size += piece->Size();
        pieces.push_back(std::move(piece));
    }
};

}  // namespace dropbox
}  // namespace cloudsim

#endif
