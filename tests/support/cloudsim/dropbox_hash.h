/** The sum by which Dropbox tells contents apart. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_HASH_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_HASH_H

#include <string>

#include "support/cloudsim/content.h"

namespace cloudsim::dropbox {

/** SHA-256, in hex, of the SHA-256 sums of 4 MiB each. Empty when the content can't be read. */
std::string ContentHash(const Content& content);

}  // namespace cloudsim::dropbox

#endif
