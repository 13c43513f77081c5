/** Answers as gzip: a folder's names and sizes become a fraction of their length. */
#ifndef ZYROVFS_WEB_GZIP_H
#define ZYROVFS_WEB_GZIP_H

#include <string>

namespace web {

/** Whether a header "Accept-Encoding", null without one, names gzip and does not refuse it. */
bool TakesGzip(const char* accept_encoding);

/** `text` as one member of gzip; "" when it cannot be made. */
std::string Gzip(const std::string& text);

}  // namespace web

#endif
