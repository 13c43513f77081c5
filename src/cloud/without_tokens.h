/** Credentials stay out of the log. */
#ifndef ZYROVFS_CLOUD_WITHOUT_TOKENS_H
#define ZYROVFS_CLOUD_WITHOUT_TOKENS_H

#include <string>

namespace ZYROCloud {

/** A JSON text that could not be read, for the log: what it breaks off in may be a token. */
inline std::string WithoutTokens(const std::string& text) {
    return text.substr(0, text.find("_token"));
}

}  // namespace ZYROCloud

#endif
